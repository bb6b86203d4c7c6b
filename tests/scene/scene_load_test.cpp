#include <gtest/gtest.h>

#include <memory>
#include <string>

#include "scene/KLGraphNode.h"
#include "scene/KLScene.h"
#include "scene/KLWire.h"
#include "scene/KLWireSource.h"
#include "scene/OrDagNode.h"
#include "scene/SceneDocument.h"
#include "scene/scene_util.h"
#include "toolkit/CueTime.h"

namespace {
using Node = std::unique_ptr<OrDagNode>;

std::string names_of(const KLDagList& list) {
    std::string out;
    for (OrDagNode* n : list.nodes) {
        out += std::string(out.empty() ? "" : " ") + KLWire::NodeName(n);
    }
    return out;
}

std::string format_name(const ::testing::TestParamInfo<TestScene::Format>& info) {
    return info.param == TestScene::kEmbedded
               ? "Embedded"
               : (info.param == TestScene::kSideCar ? "SideCar" : "Binary");
}
}  // namespace

class SceneLoad : public ::testing::TestWithParam<TestScene::Format> {
  protected:
    void SetUp() override {
        KLWire::Initialize();
        CueTime::default_fps = 30;
        dir_ = MakeTempDir();
        const char* ext = GetParam() == TestScene::kBinary ? ".glb" : ".gltf";
        path_ = dir_ + "/face" + ext;
        ASSERT_TRUE(MakeFaceScene().Write(path_, GetParam()));
        source_ = std::make_unique<KLWireSource>(path_.c_str());
        ASSERT_TRUE(source_->Valid()) << source_->ErrorText();
        root_.reset(source_->RootNode());
    }
    Node fetch(const char* name) { return Node(KLWire::FetchDagNode(root_.get(), name)); }

    std::string dir_, path_;
    std::unique_ptr<KLWireSource> source_;
    Node root_;
};

TEST_P(SceneLoad, WalksNodesWithUniqueNames) {
    EXPECT_EQ(KLWire::IsWireFile(path_.c_str()), 1);
    EXPECT_STREQ(KLWire::NodeName(root_.get()), "face");
    ASSERT_EQ(root_->asGroupNodePtr(), root_.get());
    Node head(root_->childNode());
    ASSERT_TRUE(head);
    EXPECT_STREQ(head->name(), "head");
    EXPECT_EQ(head->nextNode(), nullptr);
    std::unique_ptr<KLDagList> all(KLWire::BuildDagList(root_.get(), 1));
    EXPECT_EQ(names_of(*all), "face head jaw lip#2 brow node3 lip");
    std::unique_ptr<KLDagList> below(KLWire::BuildDagList(head.get(), 0));
    EXPECT_EQ(names_of(*below), "jaw lip#2 brow node3 lip");
    Node brow = fetch("brow");
    ASSERT_TRUE(brow);
    EXPECT_EQ(brow->asGroupNodePtr(), nullptr);
    EXPECT_EQ(brow->childNode(), nullptr);
}

TEST_P(SceneLoad, FetchAndUniqueWithDemangling) {
    EXPECT_EQ(fetch("nose"), nullptr);
    Node lip2 = fetch("lip#2");
    ASSERT_TRUE(lip2);
    EXPECT_FALSE(KLWire::UniqueDagName(root_.get(), "lip"));
    Node jaw = fetch("jaw");
    EXPECT_TRUE(KLWire::UniqueDagName(jaw.get(), "lip"));  // only lip#2 is below the jaw
    EXPECT_TRUE(KLWire::UniqueDagName(root_.get(), "jaw"));
    // Without demangling "lip" under the jaw is not found; with it, lip#2 is.
    EXPECT_EQ(Node(KLWire::FetchDagNode(jaw.get(), "lip")), nullptr);
    KLWire::DemangleNames(1);
    Node found(KLWire::FetchDagNode(jaw.get(), "lip"));
    ASSERT_TRUE(found);
    EXPECT_STREQ(found->name(), "lip#2");
    // An exact name still wins over a suffixed one.
    Node exact(KLWire::FetchDagNode(root_.get(), "lip"));
    EXPECT_STREQ(exact->name(), "lip");
    KLWire::DemangleNames(0);
}

TEST_P(SceneLoad, EvaluatesEachInterpolation) {
    Node jaw = fetch("jaw");
    ASSERT_TRUE(jaw);
    EXPECT_EQ(KLWire::FindChannel(jaw.get(), 6), nullptr);  // scale not animated
    OrChannel* ty = KLWire::FindChannel(jaw.get(), 1);
    ASSERT_NE(ty, nullptr);
    EXPECT_NEAR(ty->eval(0), 0, 1e-6);
    EXPECT_NEAR(ty->eval(0.5), -0.5, 1e-5);  // LINEAR
    EXPECT_NEAR(ty->eval(2), -2, 1e-5);
    EXPECT_NEAR(ty->eval(10), -2, 1e-5);  // held after the last key
    OrChannel* rx = KLWire::FindChannel(jaw.get(), 3);
    ASSERT_NE(rx, nullptr);
    EXPECT_NEAR(rx->eval(2.9), 0, 1e-4);  // STEP holds until 0.1 s = frame 3
    EXPECT_NEAR(rx->eval(3), 90, 1e-3);   // quaternion to Euler degrees
    EXPECT_NEAR(KLWire::FindChannel(jaw.get(), 4)->eval(3), 0, 1e-3);
    Node brow = fetch("brow");
    OrChannel* sx = KLWire::FindChannel(brow.get(), 6);
    ASSERT_NE(sx, nullptr);
    // CUBICSPLINE 1 -> 3 over 1 s, out-tangent 2 at the start, in-tangent 0 at the end.
    double u = 0.5;
    double want = (2 * u * u * u - 3 * u * u + 1) * 1 + (u * u * u - 2 * u * u + u) * 2 +
                  (-2 * u * u * u + 3 * u * u) * 3;
    EXPECT_NEAR(sx->eval(15), want, 1e-5);
    EXPECT_NEAR(KLWire::FindChannel(brow.get(), 7)->eval(15), 1, 1e-6);
    // The second animation is used for nodes the first does not animate.
    Node lip = fetch("lip");
    EXPECT_NEAR(KLWire::FindChannel(lip.get(), 0)->eval(15), 2.5, 1e-5);
    EXPECT_EQ(KLWire::FindChannel(root_.get(), 0), nullptr);
}

TEST_P(SceneLoad, PreviewSceneHasAGraphNodePerName) {
    KLScene scene;
    scene.LoadGeometry(source_.get());
    EXPECT_EQ(scene.Source(), source_.get());
    ASSERT_NE(scene.FetchNode("lip#2"), nullptr);
    EXPECT_EQ(scene.FetchNode("lip#2")->Name(), "lip#2");
    EXPECT_NE(scene.FetchNode("node3"), nullptr);
    EXPECT_EQ(scene.FetchNode("face"), nullptr);
    scene.LoadGeometry(nullptr);
    EXPECT_EQ(scene.FetchNode("jaw"), nullptr);
}

INSTANTIATE_TEST_SUITE_P(Formats, SceneLoad,
                         ::testing::Values(TestScene::kEmbedded, TestScene::kSideCar,
                                           TestScene::kBinary),
                         format_name);

TEST(SceneNames, RepeatedAndEmptyNamesNeverCollide) {
    TestScene s;
    s.model.scenes[0].name.clear();
    s.AddNode("a");
    s.AddNode("a#2");  // a literal name that a suffix would also make
    s.AddNode("a");
    s.AddNode("");
    s.AddNode("node3");
    std::string dir = MakeTempDir();
    ASSERT_TRUE(s.Write(dir + "/n.glb", TestScene::kBinary));
    std::string error;
    auto doc = SceneDocument::Load(dir + "/n.glb", &error);
    ASSERT_TRUE(doc) << error;
    EXPECT_EQ(doc->NodeName(0), "a");
    EXPECT_EQ(doc->NodeName(1), "a#2");
    EXPECT_EQ(doc->NodeName(2), "a#3");
    EXPECT_EQ(doc->NodeName(3), "node3");
    EXPECT_EQ(doc->NodeName(4), "node3#2");
    EXPECT_EQ(doc->NodeName(-1), "root");  // the scene has no name
}

TEST(SceneNames, WithoutScenesEveryParentlessNodeIsARoot) {
    std::string dir = MakeTempDir();
    WriteFile(dir + "/s.gltf", R"({"asset":{"version":"2.0"},
        "nodes":[{"name":"b","children":[2]},{"name":"a"},{"name":"c"}]})");
    KLWireSource src((dir + "/s.gltf").c_str());
    ASSERT_TRUE(src.Valid()) << src.ErrorText();
    Node root(src.RootNode());
    std::unique_ptr<KLDagList> list(KLWire::BuildDagList(root.get(), 0));
    EXPECT_EQ(names_of(*list), "b c a");
}
