#include <gtest/gtest.h>

#include <cmath>

#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "model/KLTrackPreview.h"
#include "model/ModelTestUtil.h"
#include "scene/ChannelCurve.h"
#include "scene/KLGraphNode.h"
#include "scene/KLKeyFrameList.h"
#include "scene/KLScene.h"
#include "scene/SceneDocument.h"

namespace {

// The preview of two keysets on the face scene (a kind-1 "mouth" keyset driving jaw and lip
// channels, a kind-2 "brow" keyset driving brow TY) against the same tracks applied to a
// second copy of the scene. The nodes have rest transforms of their own, so the world
// matrices compared are not identities.
class PreviewTest : public ModelTest {
  protected:
    void SetUp() override {
        std::ofstream(File("face.gltf"))
            << R"({"asset":{"version":"2.0"},"scene":0,"scenes":[{"nodes":[0,6]}],"nodes":[)"
               R"({"name":"face","children":[1,3,4,5],"translation":[0,1,0]},)"
               R"({"name":"neck","children":[2],"rotation":[0,0.3826834,0,0.9238795]},)"
               R"({"name":"jaw","translation":[0,-0.5,0.2],"scale":[1,2,1]},)"
               R"({"name":"brow","translation":[0,0.5,0]},{"name":"lip"},{"name":"lip"},)"
               R"({"name":"other","translation":[3,0,0]}]})";
        OpenFace();
        applied = std::make_unique<KLWireSource>(File("face.gltf").c_str());
        ReadText(mouth, "key rest 0\nkey open 10\nkey smile 20\nkey oo 30\n");
        for (int i = 0; i < mouth.keyShapeCount; ++i)
            mouth.keyShapes[size_t(i)]->shapeValue = 7 + i;  // as the workspace numbers them
        mouth.keyFrameList = &frames;
        AddChannel(mouth, "jaw", KLKeyChannel::kRX, {1, 11, -3, 4});
        AddChannel(mouth, "jaw", KLKeyChannel::kTY, {-0.5f, -0.9f, -0.4f, -0.6f});
        AddChannel(mouth, "lip#2", KLKeyChannel::kSX, {1, 1.2f, 1.6f, 0.7f});
        int smooth = 0;
        for (double f : {0.0, 4.0, 9.5, 15.0, 22.0, 30.0}) {
            const int shape = int(f) % 4;
            mouthTrack.InsertKey(shape, Frames(f), mouth.GetKeyShape(shape), smooth++ % 3,
                                 f == 15.0 ? 1.5f : 1.0f);
        }
        browTrack.InsertKey(0, Frames(2), nullptr, KLKeyEvent::kSmooth, 0.3f);
        browTrack.InsertKey(0, Frames(12), nullptr, KLKeyEvent::kEase, -0.2f);
        browTrack.InsertKey(0, Frames(18.5), nullptr, KLKeyEvent::kLinear, 0.45f);
        browTrack.InsertKey(0, Frames(26), nullptr, KLKeyEvent::kSmooth, 0.1f);

        scene.LoadGeometry(wire.get());
        scene.SetPoseSource(std::make_unique<KLTrackPreview>([this]() {
            return std::vector<KLKeyTrack*>{&mouthTrack, &browTrack};
        }));
        browTrack.SetControlGraphNode(scene.FetchNode("brow"));
    }
    int Index(const char* name) {
        std::unique_ptr<OrDagNode> n = KLWire::FetchDagNode(root.get(), name);
        return n ? n->index() : -1;
    }
    void ApplyBoth(double offset) {
        ASSERT_EQ(mouthTrack.Apply(applied.get(), "face", Frames(0), Frames(40), Frames(offset)),
                  1);
        ASSERT_EQ(browTrack.Apply(applied.get(), "face", Frames(0), Frames(40), Frames(offset)), 1);
    }
    // The world matrix of `node` in `doc` with its channels at `seconds` of its animation.
    static Mat4 StoredWorld(const SceneDocument& doc, int node, double seconds) {
        double c[9];
        for (int k = 0; k < 9; ++k) {
            const ChannelCurve* curve = doc.Curve(node, k);
            c[k] = curve ? curve->Evaluate(seconds) : doc.RestValue(node, k);
        }
        const Mat4 local = Mat4::FromChannels(c);
        const int parent = doc.Parent(node);
        return parent >= 0 ? StoredWorld(doc, parent, seconds) * local : local;
    }
    // The preview at `t` against `doc` at t + offset: every driven channel and the world
    // matrix of every node.
    // A stored file holds rotations sampled to within 1e-3 degrees; everything else exactly.
    void ExpectSame(const SceneDocument& doc, double frame, double offset, bool stored = false) {
        scene.Evaluate(Frames(frame));
        const double seconds = Frames(frame + offset).Seconds();
        const std::pair<const char*, int> driven[] = {{"jaw", KLKeyChannel::kRX},
                                                      {"jaw", KLKeyChannel::kTY},
                                                      {"lip#2", KLKeyChannel::kSX},
                                                      {"brow", KLKeyChannel::kTY}};
        for (auto [name, channel] : driven) {
            const ChannelCurve* curve = doc.Curve(Index(name), channel);
            ASSERT_TRUE(curve) << name;
            const bool rotation = channel >= KLKeyChannel::kRX && channel <= KLKeyChannel::kRZ;
            EXPECT_NEAR(scene.Pose().Get(Index(name), channel), curve->Evaluate(seconds),
                        stored && rotation ? 1e-3 : 1e-4)
                << name << " channel " << channel << " at frame " << frame;
        }
        for (int n = 0; n < doc.NodeCount(); ++n) {
            const Mat4 want = StoredWorld(doc, n, seconds);
            for (int k = 0; k < 16; ++k)
                ASSERT_NEAR(scene.WorldMatrix(n).m[k], want.m[k], 1e-4)
                    << doc.NodeName(n) << " at frame " << frame;
        }
    }
    std::unique_ptr<KLWireSource> applied;
    KLKeyFrameList frames{{}, 0};
    KLKeySet mouth{"mouth", "face.gltf"};
    KLKeySet brow{"brow", "brow", KLKeyChannel::kTY, 0.5f, 1.0f};
    KLKeyTrack mouthTrack{&mouth};
    KLKeyTrack browTrack{&brow};
    KLScene scene;
    const std::vector<double> times = {-3, 0, 1.25, 4, 7.5, 9.5, 13, 15, 21.1, 29.9, 30, 44};
};

class PreviewOffsetTest : public PreviewTest, public ::testing::WithParamInterface<double> {};

// At every time, with and without an offset, the preview shows what apply wrote: between
// keys of every smoothing, on keys, before the first and after the last.
TEST_P(PreviewOffsetTest, EqualsAppliedSceneInMemory) {
    ApplyBoth(GetParam());
    for (double t : times) {
        // A scene has no time before 0: there the stored curves hold their value at 0.
        if (t + GetParam() >= 0)
            ExpectSame(*applied->document(), t, GetParam());
    }
}

// The scene written to a file and read back holds the same values at its whole frames (the
// writer samples rotations per frame): preview time t shows destination frame t + offset.
TEST_P(PreviewOffsetTest, EqualsStoredSceneAtWholeFrames) {
    ApplyBoth(GetParam());
    ASSERT_EQ(applied->Store(File("out.glb").c_str()), 1);
    KLWireSource stored(File("out.glb").c_str());
    ASSERT_TRUE(stored.Valid()) << stored.ErrorText();
    for (double destination : {0.0, 3.0, 10.0, 17.0, 25.0, 30.0, 41.0})
        ExpectSame(*stored.document(), destination - GetParam(), GetParam(), true);
}

INSTANTIATE_TEST_SUITE_P(Offsets, PreviewOffsetTest, ::testing::Values(0.0, 12.5, -4.0));

// Static mode holds the default key shape (kind 1) and the rest value (kind 2) whatever the
// time; after it the tracks show what apply writes, and an edit shows at once without the
// unchanged preview being rebuilt at every time.
TEST_F(PreviewTest, StaticModeThenEditsShowAtOnce) {
    auto* preview = static_cast<KLTrackPreview*>(scene.PoseSource());
    mouth.defaultIndex = 1;
    mouthTrack.PrepareKeyFrames(nullptr);
    browTrack.PrepareKeyFrames(nullptr);
    mouthTrack.SetStatic();
    browTrack.SetStatic();
    for (double t : times) {
        scene.Evaluate(Frames(t));
        EXPECT_FLOAT_EQ(scene.Pose().Get(Index("jaw"), KLKeyChannel::kRX), 11);
        EXPECT_FLOAT_EQ(scene.Pose().Get(Index("lip#2"), KLKeyChannel::kSX), 1.2f);
        EXPECT_FLOAT_EQ(scene.Pose().Get(Index("brow"), KLKeyChannel::kTY), 0.5f);
    }
    mouthTrack.ClearStatic();
    browTrack.ClearStatic();
    mouth.defaultIndex = 0;
    mouthTrack.PrepareKeyFrames(nullptr);  // the channels follow the new rest shape
    ApplyBoth(0);
    scene.Evaluate(Frames(0));
    const int builds = preview->Builds();
    for (double t : times)
        ExpectSame(*applied->document(), t, 0);
    EXPECT_EQ(preview->Builds(), builds) << "nothing changed: no rebuild";
    mouthTrack.RemoveKey(Frames(15));
    mouthTrack.InsertKey(3, Frames(15), mouth.GetKeyShape(3), KLKeyEvent::kLinear, 0.25f);
    scene.Evaluate(Frames(15));
    EXPECT_FLOAT_EQ(scene.Pose().Get(Index("jaw"), KLKeyChannel::kRX), 1 + 0.25f * 3);
    EXPECT_EQ(preview->Builds(), builds + 1);
}

// Nodes no keyset drives keep the scene's own values at the rest frame; a scene without a
// pose source or without nodes is posed without failing.
TEST_F(PreviewTest, UndrivenNodesKeepTheirRestValues) {
    scene.Evaluate(Frames(9));
    EXPECT_FLOAT_EQ(scene.Pose().Get(Index("other"), KLKeyChannel::kTX), 3);
    EXPECT_FALSE(scene.Pose().Posed(Index("other")));
    KLScene empty;
    empty.Evaluate(Frames(3));
    empty.LoadGeometry(nullptr);
    empty.Evaluate(Frames(3));
    EXPECT_EQ(empty.NodeCount(), 0);
    EXPECT_TRUE(empty.DrawItems().empty());
}

}  // namespace
