#pragma once

#include <iostream>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

#include "toolkit/KLStdImp.h"

// A workspace for the data model's tests: directories and the rest frame as set by the test,
// and a record of every modified mark, message and question. Confirm answers from `answers`
// in turn (nonzero: the first button), then yes.
class RecordingImp : public KLStdImp {
  public:
    struct Dialog {
        std::string message;
        std::string first;
        std::string second;  // empty for Inform
    };

    const char* GetPixDirectory() override { return pixDir.empty() ? nullptr : pixDir.c_str(); }
    const char* GetWireDirectory() override { return wireDir.empty() ? nullptr : wireDir.c_str(); }
    float DefaultKeyFrame() override { return restFrame; }
    void SetTrackModified() override { ++modified; }
    int KeyFramePreparation() override { return prepare; }
    void Inform(const char* message, const char* button) override {
        informs.push_back({message, button, ""});
    }
    int Confirm(const char* message, const char* yes, const char* no) override {
        confirms.push_back({message, yes, no});
        if (next < answers.size())
            return answers[next++];
        return 1;
    }

    std::string pixDir;
    std::string wireDir;
    float restFrame = 0.0f;
    int modified = 0;
    int prepare = 1;
    std::vector<Dialog> informs;
    std::vector<Dialog> confirms;
    std::vector<int> answers;
    size_t next = 0;
};

// Collects what is written on std::cerr while it lives.
class CerrCapture {
  public:
    CerrCapture() : old_(std::cerr.rdbuf(buffer_.rdbuf())) {}
    ~CerrCapture() { std::cerr.rdbuf(old_); }
    std::string Text() const { return buffer_.str(); }

  private:
    std::ostringstream buffer_;
    std::streambuf* old_;
};

// A fresh directory under the build tree for one test, removed with everything in it.
class TempDir {
  public:
    explicit TempDir(const std::string& name);
    ~TempDir();
    const std::string& Path() const { return path_; }
    std::string File(const std::string& name) const { return path_ + "/" + name; }

  private:
    std::string path_;
};

// Writes `text` to `path`; false on failure.
bool WriteTextFile(const std::string& path, const std::string& text);

// A small glTF scene put together in a test: named nodes in a hierarchy and LINEAR
// translation, rotation (Euler degrees about X) and scale animations, written as .gltf with
// embedded buffers through tinygltf's writer.
class SceneBuilder {
  public:
    SceneBuilder();
    ~SceneBuilder();
    // Adds a node under `parent` (-1: a top-level node) and returns its index.
    int AddNode(const std::string& name, int parent = -1);
    // Keys at `seconds`; `xyz` holds three values per key.
    void Translate(int node, const std::vector<float>& seconds, const std::vector<float>& xyz);
    void Scale(int node, const std::vector<float>& seconds, const std::vector<float>& xyz);
    // Rotation about X by `degrees` at each key.
    void RotateX(int node, const std::vector<float>& seconds, const std::vector<float>& degrees);
    bool Write(const std::string& path) const;

  private:
    struct Impl;
    Impl* impl_;
};

// Records every report of the toolkit's reporting functions while it lives.
class ReportLog;
class ReportCapture {
  public:
    ReportCapture();
    ~ReportCapture();
    const std::vector<std::string>& Messages() const;

  private:
    ReportLog* log_;
};
