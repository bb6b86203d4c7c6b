#pragma once

#include <gtest/gtest.h>

#include <iostream>
#include <memory>
#include <sstream>
#include <string>
#include <vector>

#include "scene/KLWireSource.h"
#include "scene/OrDagNode.h"
#include "toolkit/CueTime.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLStdImp.h"

// A workspace recording every modified mark, message and question; directories and the rest
// frame as set by the test. Confirm answers from `answers` in turn (nonzero: the first
// button), then yes.
class RecordingImp : public KLStdImp {
  public:
    struct Dialog {
        std::string message, first, second;  // second empty for Inform
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
        return next < answers.size() ? answers[next++] : 1;
    }

    std::string pixDir, wireDir;
    float restFrame = 0.0f;
    int modified = 0, prepare = 1;
    std::vector<Dialog> informs, confirms;
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

// Records every report of the toolkit's reporting functions while it lives.
class ReportCapture : public KLErrHandler {
  public:
    void Handle(KLErr* e) override { messages.push_back(e->Message()); }
    std::vector<std::string> messages;
};

// A small glTF scene: named nodes in a hierarchy and LINEAR animations, written as .gltf with
// embedded buffers.
class SceneBuilder {
  public:
    SceneBuilder();
    ~SceneBuilder();
    // Adds a node under `parent` (-1: top level) and returns its index.
    int AddNode(const std::string& name, int parent = -1);
    // Keys at `seconds` of "translation" or "scale", three values per key.
    void Animate(int node, const std::string& path, const std::vector<float>& seconds,
                 const std::vector<float>& xyz);
    // Rotation about X by `degrees` at each key.
    void RotateX(int node, const std::vector<float>& seconds, const std::vector<float>& degrees);
    bool Write(const std::string& path) const;

  private:
    struct Impl;
    std::unique_ptr<Impl> impl_;
};

inline CueTime Ticks(int32_t t) {
    return CueTime::FromTicks(t);
}
inline CueTime Frames(double f) {
    return CueTime(f, 0);
}

// What `x.Write(out)` writes, and `x.Read(in, extra...)` from `text`.
template <class T>
std::string Written(T& x) {
    std::ostringstream out;
    x.Write(out);
    return out.str();
}
template <class T, class... Extra>
void ReadText(T& x, const std::string& text, Extra... extra) {
    std::istringstream in(text);
    x.Read(in, extra...);
}

// The workspace record, a fresh directory named after the test (removed afterwards) and
// optionally a scene opened from it; the frame rate goes back to 30 afterwards.
class ModelTest : public ::testing::Test {
  protected:
    ModelTest();
    ~ModelTest() override;
    std::string File(const std::string& name) const { return dir + "/" + name; }
    // Writes `scene` as File(name) and opens it as `wire` with its `root`.
    void Open(const SceneBuilder& scene, const std::string& name);

    RecordingImp imp;
    std::string dir;
    std::unique_ptr<KLWireSource> wire;
    std::unique_ptr<OrDagNode> root;
};
