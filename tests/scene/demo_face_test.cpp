#include <gtest/gtest.h>

#include <memory>
#include <string>

#include "scene/KLWire.h"
#include "scene/KLWireSource.h"
#include "scene/OrDagNode.h"
#include "scene/SceneDocument.h"
#include "scene/scene_util.h"
#include "toolkit/CueTime.h"

namespace {
using Node = std::unique_ptr<OrDagNode>;
const std::string kFace = std::string(CHIRRUP_SOURCE_DIR) + "/resources/demo/face.glb";
}  // namespace

class DemoFace : public ::testing::Test {
  protected:
    void SetUp() override {
        KLWire::Initialize();
        CueTime::default_fps = 30;
        source_ = std::make_unique<KLWireSource>(kFace.c_str());
        ASSERT_TRUE(source_->Valid()) << source_->ErrorText();
        root_.reset(source_->RootNode());
    }
    double at(const char* node, int channel, double frame) {
        Node n(KLWire::FetchDagNode(root_.get(), node));
        EXPECT_TRUE(n) << node;
        OrChannel* c = n ? KLWire::FindChannel(n.get(), channel) : nullptr;
        EXPECT_TRUE(c) << node << " channel " << channel;
        return c ? c->eval(frame) : 0.0;
    }
    std::unique_ptr<KLWireSource> source_;
    Node root_;
};

TEST_F(DemoFace, HasTheRigJointsUnderTheHead) {
    for (const char* name : {"head", "jaw", "upper_lip", "lower_lip", "mouth_corner_L",
                             "mouth_corner_R", "tongue", "brow_L", "brow_R"}) {
        Node n(KLWire::FetchDagNode(root_.get(), name));
        EXPECT_TRUE(n) << name;
        EXPECT_TRUE(KLWire::UniqueDagName(root_.get(), name)) << name;
    }
    Node jaw(KLWire::FetchDagNode(root_.get(), "jaw"));
    EXPECT_TRUE(Node(KLWire::FetchDagNode(jaw.get(), "tongue")));
    EXPECT_EQ(source_->document()->model().animations.at(0).name, "shapes");
}

TEST_F(DemoFace, EachFrameHoldsItsShape) {
    // Rest, then the jaw opens for AI and O and stays shut for MBP; keys hold between frames.
    EXPECT_NEAR(at("jaw", 3, 0), 0, 1e-3);
    EXPECT_NEAR(at("jaw", 3, 1), 14, 1e-3);
    EXPECT_NEAR(at("jaw", 3, 1.9), 14, 1e-3);
    EXPECT_NEAR(at("jaw", 3, 3), 12, 1e-3);
    EXPECT_NEAR(at("jaw", 3, 5), 0, 1e-3);
    // O and U push the corners in, E pulls them out.
    double rest = at("mouth_corner_L", 0, 0);
    EXPECT_LT(at("mouth_corner_L", 0, 3), rest);
    EXPECT_GT(at("mouth_corner_L", 0, 2), rest);
    EXPECT_GT(at("mouth_corner_R", 0, 3), at("mouth_corner_R", 0, 0));
    // L lifts the tongue; the brows rest at 20, rise at 21, drop at 22, rise most at 23.
    EXPECT_GT(at("tongue", 1, 7), at("tongue", 1, 0) + 0.01);
    double brow = at("brow_L", 1, 20);
    EXPECT_GT(at("brow_L", 1, 21), brow);
    EXPECT_LT(at("brow_L", 1, 22), brow);
    EXPECT_GT(at("brow_L", 1, 23), at("brow_L", 1, 21));
    EXPECT_NEAR(at("brow_L", 1, 5), brow, 1e-6);  // mouth shapes leave the brows alone
}

TEST_F(DemoFace, StoresAValidSceneAfterAnApply) {
    Node jaw(KLWire::FetchDagNode(root_.get(), "jaw"));
    CueTime times[3] = {CueTime::FromTicks(0), CueTime::FromTicks(1000), CueTime::FromTicks(2400)};
    float values[3] = {0, 14, 3};
    int in[3] = {2, 0, 1}, out[3] = {2, 2, 0};
    KLWire::alwaysClearChannel = 1;
    ASSERT_EQ(KLWire::StoreChannel(jaw.get(), 3, 3, times, values, in, nullptr, out, nullptr), 1);
    std::string path = MakeTempDir() + "/applied.glb";
    ASSERT_EQ(source_->Store(path.c_str()), 1);
    std::string error;
    auto back = SceneDocument::Load(path, &error);
    ASSERT_TRUE(back) << error;
    EXPECT_EQ(back->model().meshes.size(), 1u);
    EXPECT_EQ(back->model().skins.size(), 1u);
    std::string report;
    int status = RunValidator(path, &report);
    if (status == -1) {
        GTEST_SKIP() << "node is not installed";
    }
    EXPECT_EQ(status, 0) << report;
}
