#include <gtest/gtest.h>

#include <string>

#include "scene/KLWire.h"
#include "scene/SceneDocument.h"
#include "scene/scene_util.h"

// The committed demo rig, as the demo session uses it.
class DemoFace : public ::testing::Test {
  protected:
    void SetUp() override {
        ASSERT_TRUE(face_.Open(std::string(CHIRRUP_SOURCE_DIR) + "/resources/demo/face.glb"));
    }
    double at(const char* node, int channel, double frame) {
        return face_.Eval(node, channel, frame);
    }
    OpenScene face_;
};

TEST_F(DemoFace, HasTheRigJointsUnderTheHead) {
    for (const char* name : {"head", "jaw", "upper_lip", "lower_lip", "mouth_corner_L",
                             "mouth_corner_R", "tongue", "brow_L", "brow_R"}) {
        EXPECT_TRUE(face_.Fetch(name)) << name;
        EXPECT_TRUE(KLWire::UniqueDagName(face_.root.get(), name)) << name;
    }
    EXPECT_TRUE(face_.Fetch("tongue", face_.Fetch("jaw").get()));
    EXPECT_EQ(face_.source->document()->model().animations.at(0).name, "shapes");
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
    ASSERT_EQ(
        StoreKeys(face_.Fetch("jaw").get(), 3, {{0, 0, 2, 2}, {1000, 14, 0, 2}, {2400, 3, 1, 0}}),
        1);
    std::string path = MakeTempDir() + "/applied.glb";
    ASSERT_EQ(face_.source->Store(path.c_str()), 1);
    std::string error;
    auto back = SceneDocument::Load(path, &error);
    ASSERT_TRUE(back) << error;
    EXPECT_EQ(back->model().meshes.size(), 1u);
    EXPECT_EQ(back->model().skins.size(), 1u);
    ExpectValidGltf(path);
}
