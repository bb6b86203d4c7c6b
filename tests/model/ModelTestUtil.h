#pragma once

#include <gtest/gtest.h>

#include <fstream>
#include <memory>
#include <sstream>
#include <string>
#include <vector>

#include "model/KLKeySet.h"
#include "scene/KLWire.h"
#include "scene/KLWireSource.h"
#include "scene/OrDagNode.h"
#include "testkit/CaptureStderr.h"
#include "testkit/TempDir.h"
#include "toolkit/CueTime.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLStdImp.h"

// A workspace recording modified marks and dialogs ("message|button..."); Confirm answers
// from `answers` in turn (nonzero: the first button), then yes.
class RecordingImp : public KLStdImp {
  public:
    const char* GetPixDirectory() override { return pixDir.empty() ? nullptr : pixDir.c_str(); }
    float DefaultKeyFrame() override { return restFrame; }
    void SetTrackModified() override { ++modified; }
    int KeyFramePreparation() override { return prepare; }
    void Inform(const char* message, const char* button) override {
        informs.push_back(std::string(message) + "|" + button);
    }
    int Confirm(const char* message, const char* yes, const char* no) override {
        confirms.push_back(std::string(message) + "|" + yes + "|" + no);
        return next < answers.size() ? answers[next++] : 1;
    }
    std::string pixDir;
    float restFrame = 0.0f;
    int modified = 0, prepare = 1;
    std::vector<std::string> informs, confirms;
    std::vector<int> answers;
    size_t next = 0;
};

// The toolkit's reports while it lives.
class ReportCapture : public KLErrHandler {
  public:
    void Handle(KLErr* e) override { messages.push_back(e->Message()); }
    std::vector<std::string> messages;
};

// A kind-1 channel of `set` with one value per key shape, after the channels already there
// (apply goes through them in that order).
inline void AddChannel(KLKeySet& set, const char* node, int channel, std::vector<float> values) {
    auto c = std::make_unique<KLKeyChannel>(node, channel, int(values.size()));
    for (size_t i = 0; i < values.size(); ++i)
        c->Set(int(i), values[i]);
    set.keyChannels.push_back(std::move(c));
}

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

// A fresh directory per test with face.gltf: "face" over "neck" over "jaw", and "brow", "lip",
// "lip#2" (also named "lip") below it; a top-level "other". The frame rate goes back to 30.
class ModelTest : public ::testing::Test {
  protected:
    ModelTest() {
        std::ofstream(File("face.gltf"))
            << R"({"asset":{"version":"2.0"},"scene":0,"scenes":[{"nodes":[0,6]}],"nodes":[)"
               R"({"name":"face","children":[1,3,4,5]},{"name":"neck","children":[2]},)"
               R"({"name":"jaw"},{"name":"brow"},{"name":"lip"},{"name":"lip"},{"name":"other"}]})";
    }
    ~ModelTest() override { CueTime::default_fps = 30; }
    static CueTime Ticks(int32_t t) { return CueTime::FromTicks(t); }
    static CueTime Frames(double f) { return CueTime(f, 0); }
    std::string File(const std::string& name) const { return dir + "/" + name; }
    void OpenFace() {
        wire = std::make_unique<KLWireSource>(File("face.gltf").c_str());
        ASSERT_TRUE(wire->Valid()) << wire->ErrorText();
        root = wire->RootNode();
    }
    OrDagNode* Node(const char* name) {
        nodes.emplace_back(KLWire::FetchDagNode(root.get(), name));
        return nodes.back().get();
    }
    RecordingImp imp;
    testkit::TempDir temp;
    const std::string dir = temp.path();
    std::unique_ptr<KLWireSource> wire;
    std::unique_ptr<OrDagNode> root;
    std::vector<std::unique_ptr<OrDagNode>> nodes;  // released before root and wire
};
