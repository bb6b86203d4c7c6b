#include <gtest/gtest.h>

#include <memory>
#include <sstream>

#include "model/KLKeySet.h"
#include "model/ModelTestUtil.h"
#include "scene/KLWire.h"
#include "scene/KLWireSource.h"
#include "scene/OrDagNode.h"

namespace {

// Key shapes at frames 0, 15 and 30 (0, 0.5 and 1 second at 30 fps). The scene:
//   head            translation constant
//     neck          (no animation)
//       jaw         translation x 0, 1, 2 (y, z constant); rotation about X 0, 10, 20
//     brow          scale constant
//   lip, lip        (two top-level nodes of one name) translation x differing
//   still           (no animation)
class ExtractTest : public ::testing::Test {
  protected:
    void SetUp() override {
        const auto* info = ::testing::UnitTest::GetInstance()->current_test_info();
        dir = std::make_unique<TempDir>(std::string("extract_") + info->name());
        SceneBuilder b;
        const std::vector<float> at = {0.0f, 0.5f, 1.0f};
        const int head = b.AddNode("head");
        b.Translate(head, at, {1, 2, 3, 1, 2, 3, 1, 2, 3});
        const int neck = b.AddNode("neck", head);
        const int jaw = b.AddNode("jaw", neck);
        b.Translate(jaw, at, {0, 7, 0, 1, 7, 0, 2, 7, 0});
        b.RotateX(jaw, at, {0, 10, 20});
        b.Scale(b.AddNode("brow", head), at, {1, 1, 1, 1, 1, 1, 1, 1, 1});
        b.Translate(b.AddNode("lip"), at, {0, 0, 0, 1, 0, 0, 0, 0, 0});
        b.Translate(b.AddNode("lip"), at, {5, 0, 0, 5, 0, 0, 6, 0, 0});
        b.AddNode("still");
        ASSERT_TRUE(b.Write(dir->File("face.gltf")));
        wire = std::make_unique<KLWireSource>(dir->File("face.gltf").c_str());
        ASSERT_TRUE(wire->Valid()) << wire->ErrorText();
        root.reset(wire->RootNode());
        std::istringstream in("key rest 0\nkey open 15\nkey wide 30\n");
        set.Read(in);
    }

    RecordingImp imp;
    std::unique_ptr<TempDir> dir;
    std::unique_ptr<KLWireSource> wire;
    std::unique_ptr<OrDagNode> root;
    KLKeySet set{"mouth", "face.gltf"};
};

TEST_F(ExtractTest, KeepsOnlyChannelsThatChange) {
    ReportCapture reports;
    set.ExtractKeys(root.get());

    std::vector<std::string> found;
    for (KLKeyChannel* c : set.keyChannels)
        found.push_back(*c->name + "." + c->GetChannelName());
    std::sort(found.begin(), found.end());
    EXPECT_EQ(found, (std::vector<std::string>{"jaw.RX", "jaw.TX", "lip#2.TX", "lip.TX"}));

    KLKeyChannel* tx = set.GetKeyChannel("jaw", KLKeyChannel::kTX);
    ASSERT_NE(tx, nullptr);
    EXPECT_EQ(tx->size, 3);
    EXPECT_EQ(tx->count, 3);
    EXPECT_FLOAT_EQ(tx->Get(0), 0.0f);
    EXPECT_FLOAT_EQ(tx->Get(1), 1.0f);
    EXPECT_FLOAT_EQ(tx->Get(2), 2.0f);
    KLKeyChannel* rx = set.GetKeyChannel("jaw", KLKeyChannel::kRX);
    ASSERT_NE(rx, nullptr);
    EXPECT_NEAR(rx->Get(1), 10.0f, 1e-3);
    EXPECT_NEAR(rx->Get(2), 20.0f, 1e-3);
    EXPECT_EQ(set.GetKeyChannel("jaw", KLKeyChannel::kTY), nullptr) << "constant: dropped";
    EXPECT_EQ(set.GetKeyChannel("brow", KLKeyChannel::kSX), nullptr);

    int keyChannelReports = 0;
    for (const std::string& m : reports.Messages()) {
        if (m.rfind("Key Channel [", 0) == 0)
            ++keyChannelReports;
    }
    EXPECT_EQ(keyChannelReports, 4);
    EXPECT_NE(
        std::find(reports.Messages().begin(), reports.Messages().end(), "Key Channel [jaw.TX].\n"),
        reports.Messages().end());
}

// Starting from a node rather than the root walks that node and the siblings after it.
TEST_F(ExtractTest, StartsAtGivenTopLevelNode) {
    std::unique_ptr<OrDagNode> head(root->childNode());
    std::unique_ptr<OrDagNode> lip(head->nextNode());
    ASSERT_STREQ(KLWire::NodeName(lip.get()), "lip");
    set.ExtractKeys(lip.get());
    EXPECT_EQ(set.keyChannels.size(), 2u);
    EXPECT_EQ(set.GetKeyChannel("jaw", KLKeyChannel::kTX), nullptr);
    EXPECT_NE(set.GetKeyChannel("lip#2", KLKeyChannel::kTX), nullptr);
}

TEST_F(ExtractTest, OneChannelNodeGivesOneChannelOrNone) {
    std::unique_ptr<OrDagNode> still(KLWire::FetchDagNode(root.get(), "still"));
    std::unique_ptr<OrDagNode> lip(KLWire::FetchDagNode(root.get(), "lip"));
    for (int i = 0; i < set.keyShapeCount; ++i) {
        set.extract_dag(CueTime(double(set.keyShapes[i]->frame), 0), i, lip.get());
    }
    EXPECT_EQ(set.keyChannels.size(), 3u) << "TX, TY, TZ sampled";
    set.ExtractKeys(still.get());  // samples nothing more, then drops the constant channels
    ASSERT_EQ(set.keyChannels.size(), 1u);
    EXPECT_EQ(set.keyChannels.front()->channel, KLKeyChannel::kTX);
}

// Two nodes sampled under one name share a channel; every slot is then set twice, so the
// channel counts as incompletely filled and is dropped.
TEST_F(ExtractTest, NodesSharingANameDropTheirChannel) {
    std::unique_ptr<OrDagNode> lip(KLWire::FetchDagNode(root.get(), "lip"));
    for (int i = 0; i < set.keyShapeCount; ++i) {
        const CueTime t(double(set.keyShapes[i]->frame), 0);
        set.extract_dag(t, i, lip.get());
        set.extract_dag(t, i, lip.get());
    }
    KLKeyChannel* tx = set.GetKeyChannel("lip", KLKeyChannel::kTX);
    ASSERT_NE(tx, nullptr);
    EXPECT_EQ(tx->count, 6);
    std::unique_ptr<OrDagNode> still(KLWire::FetchDagNode(root.get(), "still"));
    set.ExtractKeys(still.get());
    EXPECT_TRUE(set.keyChannels.empty());
}

TEST_F(ExtractTest, NullSceneAndEmptyKeysetExtractNothing) {
    set.ExtractKeys(nullptr);
    EXPECT_TRUE(set.keyChannels.empty());
    KLKeySet empty("none", nullptr);
    empty.ExtractKeys(root.get());
    EXPECT_TRUE(empty.keyChannels.empty());
}

}  // namespace
