#include <gtest/gtest.h>

#include <sstream>

#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "model/ModelTestUtil.h"
#include "scene/KLChannel.h"
#include "scene/KLGraphNode.h"
#include "scene/KLKeyFrameList.h"

namespace {

CueTime Frames(double f) {
    return CueTime(f, 0);
}

// The preview channels of a kind-1 track: key-shape numbers and values per event, registered
// with the keyset's key frame list.
class PreviewTest : public ::testing::Test {
  protected:
    PreviewTest() : list({0, 10, 20}, 0) {
        std::istringstream in("key rest 0\nkey open 10\nkey smile 20\n");
        set.Read(in);
        for (int i = 0; i < 3; ++i)
            set.keyShapes[i]->shapeValue = 7 + i;
        set.keyFrameList = &list;
        track.InsertKey(1, Frames(2), set.GetKeyShape(1), 1, 0.5f);
        track.InsertKey(2, Frames(6), set.GetKeyShape(2), 0, 1.5f);
    }

    RecordingImp imp;
    KLKeyFrameList list;
    KLKeySet set{"mouth", "face.gltf"};
    KLKeyTrack track{&set};
};

TEST_F(PreviewTest, KindOneMakesAndRegistersChannels) {
    track.PrepareKeyFrames(nullptr);
    ASSERT_NE(track.shapeChannel, nullptr);
    ASSERT_NE(track.weightChannel, nullptr);
    EXPECT_TRUE(track.shapeChannel->StorageKeyed());
    EXPECT_TRUE(track.weightChannel->StorageKeyed());
    ASSERT_EQ(list.KeyChannels().size(), 1u);
    EXPECT_EQ(list.KeyChannels()[0].first, track.shapeChannel);
    EXPECT_EQ(list.KeyChannels()[0].second, track.weightChannel);
    EXPECT_EQ(track.shapeChannel->KeyCount(), 2);
    EXPECT_FLOAT_EQ(track.shapeChannel->Evaluate(Frames(2)), 8.0f);
    EXPECT_FLOAT_EQ(track.shapeChannel->Evaluate(Frames(6)), 9.0f);
    EXPECT_FLOAT_EQ(track.weightChannel->Evaluate(Frames(2)), 0.5f);
    EXPECT_FLOAT_EQ(track.weightChannel->Evaluate(Frames(6)), 1.5f);

    // Prepared again: the same channels, refilled.
    KLChannel* shape = track.shapeChannel;
    track.RemoveKey(Frames(2));
    track.PrepareKeyFrames(nullptr);
    EXPECT_EQ(track.shapeChannel, shape);
    EXPECT_EQ(list.KeyChannels().size(), 1u);
    EXPECT_EQ(track.shapeChannel->KeyCount(), 1);
    EXPECT_EQ(track.weightChannel->KeyCount(), 1);

    track.Clear();
    EXPECT_EQ(track.shapeChannel, nullptr);
    EXPECT_EQ(track.weightChannel, nullptr);
    EXPECT_TRUE(list.KeyChannels().empty());
}

TEST_F(PreviewTest, KindOneNeedsListAndWorkspaceFlag) {
    imp.prepare = 0;
    track.PrepareKeyFrames(nullptr);
    EXPECT_EQ(track.shapeChannel, nullptr);
    imp.prepare = 1;
    set.keyFrameList = nullptr;
    track.PrepareKeyFrames(nullptr);
    EXPECT_EQ(track.shapeChannel, nullptr);
    KLKeyFrameList other({1}, 0);
    track.PrepareKeyFrames(&other);
    EXPECT_NE(track.shapeChannel, nullptr);
    EXPECT_EQ(other.KeyChannels().size(), 1u);
}

TEST_F(PreviewTest, StaticModeShowsRestPose) {
    track.SetStatic();  // no channels yet: nothing to do
    track.PrepareKeyFrames(nullptr);
    set.defaultIndex = 2;
    track.SetStatic();
    EXPECT_TRUE(track.shapeChannel->IsStatic());
    EXPECT_TRUE(track.weightChannel->IsStatic());
    EXPECT_FLOAT_EQ(track.shapeChannel->Evaluate(Frames(2)), 9.0f);
    EXPECT_FLOAT_EQ(track.weightChannel->Evaluate(Frames(2)), 1.0f);
    track.ClearStatic();
    EXPECT_FALSE(track.shapeChannel->IsStatic());
    EXPECT_FALSE(track.weightChannel->IsStatic());
    EXPECT_FLOAT_EQ(track.shapeChannel->Evaluate(Frames(2)), 8.0f);
}

TEST(PreviewKindTwo, ControlNodeChannelCarriesValues) {
    RecordingImp imp;
    KLKeySet set("brow", "browNode", 5, -0.5f, 2.0f);
    KLKeyTrack track(&set);
    track.InsertKey(0, Frames(1), nullptr, 1, 0.25f);
    track.InsertKey(0, Frames(3), nullptr, 1, 0.75f);
    track.PrepareKeyFrames(nullptr);  // no value channel yet: nothing
    EXPECT_EQ(track.weightChannel, nullptr);
    {
        CerrCapture err;
        track.SetControlGraphNode(nullptr);
        EXPECT_EQ(err.Text(), "NO GRAPH NODE\n");
    }
    KLGraphNode node("browNode");
    track.SetControlGraphNode(&node);
    ASSERT_NE(node.Transform()->Channel(5), nullptr);
    EXPECT_EQ(track.weightChannel, node.Transform()->Channel(5));
    EXPECT_EQ(track.graphNode, &node);
    track.PrepareKeyFrames(nullptr);
    EXPECT_EQ(track.shapeChannel, nullptr);
    EXPECT_EQ(track.weightChannel->KeyCount(), 2);
    EXPECT_FLOAT_EQ(track.weightChannel->Evaluate(Frames(3)), 0.75f);
    track.SetStatic();
    EXPECT_FLOAT_EQ(track.weightChannel->Evaluate(Frames(3)), -0.5f);
    track.ClearStatic();
    EXPECT_FLOAT_EQ(track.weightChannel->Evaluate(Frames(3)), 0.75f);
    track.Clear();  // releases the borrowed channel without destroying it
    EXPECT_EQ(track.weightChannel, nullptr);
    EXPECT_NE(node.Transform()->Channel(5), nullptr);
}

}  // namespace
