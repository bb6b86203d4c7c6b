#include <gtest/gtest.h>

#include <memory>
#include <sstream>

#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "model/ModelTestUtil.h"
#include "scene/ChannelCurve.h"
#include "scene/KLWire.h"
#include "scene/KLWireSource.h"
#include "scene/OrDagNode.h"

namespace {

CueTime Frames(double f) {
    return CueTime(f, 0);
}

// A scene with a top-level "face" holding "jaw", two nodes named "lip" (the second is
// "lip#2") and "brow", and a top-level "other"; no animation.
class ApplyTest : public ::testing::Test {
  protected:
    void SetUp() override {
        const auto* info = ::testing::UnitTest::GetInstance()->current_test_info();
        dir = std::make_unique<TempDir>(std::string("apply_") + info->name());
        SceneBuilder b;
        const int face = b.AddNode("face");
        b.AddNode("jaw", face);
        b.AddNode("lip", face);
        b.AddNode("lip", face);
        b.AddNode("brow", face);
        b.AddNode("other");
        ASSERT_TRUE(b.Write(dir->File("target.gltf")));
        Open(dir->File("target.gltf"));

        std::istringstream in("key rest 0\nkey open 10\nkey smile 20\n");
        set.Read(in);
    }
    void TearDown() override { CueTime::default_fps = 30; }
    void Open(const std::string& path) {
        root.reset();
        wire = std::make_unique<KLWireSource>(path.c_str());
        ASSERT_TRUE(wire->Valid()) << wire->ErrorText();
        root.reset(wire->RootNode());
    }
    // A kind-1 channel with one value per key shape; channels are applied in the order added.
    KLKeyChannel* AddChannel(const char* node, int channel, std::vector<float> values) {
        auto* c = new KLKeyChannel(node, channel, int(values.size()));
        for (size_t i = 0; i < values.size(); ++i)
            c->Set(int(i), values[i]);
        set.keyChannels.push_back(c);
        return c;
    }
    const ChannelCurve* Curve(const char* node, int channel) {
        std::unique_ptr<OrDagNode> n(KLWire::FetchDagNode(root.get(), node));
        return n ? static_cast<const ChannelCurve*>(KLWire::FindChannel(n.get(), channel))
                 : nullptr;
    }

    RecordingImp imp;
    std::unique_ptr<TempDir> dir;
    std::unique_ptr<KLWireSource> wire;
    std::unique_ptr<OrDagNode> root;
    KLKeySet set{"mouth", "face.gltf"};
    KLKeyTrack track{&set};
};

struct Expected {
    double frame;
    double value;
    int in;
    int out;
};

void ExpectKeys(const ChannelCurve* curve, const std::vector<Expected>& keys) {
    ASSERT_NE(curve, nullptr);
    ASSERT_EQ(curve->keys().size(), keys.size());
    for (size_t i = 0; i < keys.size(); ++i) {
        const ChannelCurve::Key& k = curve->keys()[i];
        EXPECT_NEAR(k.time, Frames(keys[i].frame).Seconds(), 1e-9) << "key " << i;
        EXPECT_FLOAT_EQ(float(k.value), float(keys[i].value)) << "key " << i;
        EXPECT_EQ(int(k.in), keys[i].in) << "in tangent of key " << i;
        EXPECT_EQ(int(k.out), keys[i].out) << "out tangent of key " << i;
    }
}

// value = d + v * (s - d) at each key time + offset; in tangent from the key's own smoothing,
// out tangent from the key before it (flat for the first); events outside the range skipped.
TEST_F(ApplyTest, BlendsFromRestPoseWithTangentsPerKey) {
    set.defaultIndex = 0;
    AddChannel("jaw", KLKeyChannel::kRX, {1, 11, -3});
    AddChannel("jaw", KLKeyChannel::kTY, {5, 5, 5});  // constant: applied too, unreported
    track.InsertKey(1, Frames(0), set.GetKeyShape(1), KLKeyEvent::kLinear, 1.0f);
    track.InsertKey(2, Frames(3.5), set.GetKeyShape(2), KLKeyEvent::kSmooth, 0.5f);
    track.InsertKey(1, Frames(10), set.GetKeyShape(1), KLKeyEvent::kEase, 2.0f);
    track.InsertKey(0, Frames(20), set.GetKeyShape(0), KLKeyEvent::kLinear, 1.0f);

    ReportCapture reports;
    ASSERT_EQ(track.Apply(wire.get(), "face", Frames(0), Frames(10), Frames(100)), 1);
    EXPECT_EQ(reports.Messages(), std::vector<std::string>{"Apply [jaw.RX]...\n"});
    EXPECT_TRUE(imp.confirms.empty());
    EXPECT_TRUE(imp.informs.empty());
    // Linear 1, Smooth 0, Ease 2.
    ExpectKeys(Curve("jaw", KLKeyChannel::kRX),
               {{100, 11, 1, 2}, {103.5, -1, 0, 1}, {110, 21, 2, 0}});
    ExpectKeys(Curve("jaw", KLKeyChannel::kTY), {{100, 5, 1, 2}, {103.5, 5, 0, 1}, {110, 5, 2, 0}});
    EXPECT_EQ(Curve("jaw", KLKeyChannel::kTX), nullptr);
}

TEST_F(ApplyTest, DefaultKeyShapeIsTheRestPose) {
    set.defaultIndex = 2;
    AddChannel("jaw", KLKeyChannel::kSY, {1, 2, 4});
    track.InsertKey(0, Frames(1), set.GetKeyShape(0), KLKeyEvent::kEase, 0.25f);
    track.InsertKey(2, Frames(2), set.GetKeyShape(2), KLKeyEvent::kEase, 0.75f);
    ASSERT_EQ(track.Apply(wire.get(), "face", Frames(0), Frames(5), CueTime()), 1);
    ExpectKeys(Curve("jaw", KLKeyChannel::kSY), {{1, 4 + 0.25 * (1 - 4), 2, 2}, {2, 4, 2, 2}});
}

TEST_F(ApplyTest, RangeEndsAreInclusiveToTheTick) {
    AddChannel("jaw", KLKeyChannel::kTX, {0, 1, 2});
    for (int f : {5, 6, 7, 8})
        track.InsertKey(1, Frames(f), set.GetKeyShape(1), 1, float(f));
    ASSERT_EQ(track.Apply(wire.get(), "face", Frames(6), Frames(7), CueTime()), 1);
    ExpectKeys(Curve("jaw", KLKeyChannel::kTX), {{6, 6, 2, 2}, {7, 7, 2, 2}});

    const CueTime tick = CueTime::FromTicks(1);
    ASSERT_EQ(track.Apply(wire.get(), "face", Frames(6) + tick, Frames(7) - tick, CueTime()), 1);
    // Nothing in range: the channel is left as it was.
    ExpectKeys(Curve("jaw", KLKeyChannel::kTX), {{6, 6, 2, 2}, {7, 7, 2, 2}});
}

// With offset = destination start - source start, the key at the source start lands on the
// destination start.
TEST_F(ApplyTest, OffsetMovesSourceStartToDestinationStart) {
    AddChannel("jaw", KLKeyChannel::kTZ, {0, 3, 6});
    track.InsertKey(1, Frames(40), set.GetKeyShape(1), 0, 1.0f);
    track.InsertKey(2, Frames(45.5), set.GetKeyShape(2), 0, 1.0f);
    const CueTime sourceIn = Frames(40), destIn = Frames(12);
    ASSERT_EQ(track.Apply(wire.get(), "face", sourceIn, Frames(50), destIn - sourceIn), 1);
    ExpectKeys(Curve("jaw", KLKeyChannel::kTZ), {{12, 3, 1, 2}, {17.5, 6, 1, 1}});
}

TEST_F(ApplyTest, MissingBaseNodeStopsWithMessage) {
    AddChannel("jaw", KLKeyChannel::kTX, {0, 1, 2});
    track.InsertKey(1, Frames(1), set.GetKeyShape(1), 1, 1.0f);
    EXPECT_EQ(track.Apply(wire.get(), "nobody", Frames(0), Frames(5), CueTime()), 0);
    ASSERT_EQ(imp.informs.size(), 1u);
    EXPECT_EQ(imp.informs[0].message, "Cannot find base dag [nobody] for apply ...");
    EXPECT_EQ(imp.informs[0].first, "Dismiss");
    EXPECT_EQ(Curve("jaw", KLKeyChannel::kTX), nullptr);
    EXPECT_EQ(track.Apply(nullptr, "face", Frames(0), Frames(5), CueTime()), 0);
}

// A base node below the top level is found by name anywhere in the scene.
TEST_F(ApplyTest, BaseNodeBelowTopLevel) {
    AddChannel("jaw", KLKeyChannel::kTX, {0, 1, 2});
    AddChannel("lip", KLKeyChannel::kTX, {0, 1, 2});
    track.InsertKey(1, Frames(1), set.GetKeyShape(1), 1, 1.0f);
    imp.answers = {1};
    EXPECT_EQ(track.Apply(wire.get(), "jaw", Frames(0), Frames(5), CueTime()), 1);
    ExpectKeys(Curve("jaw", KLKeyChannel::kTX), {{1, 1, 2, 2}});
    ASSERT_EQ(imp.confirms.size(), 1u) << "lip is not below jaw";
}

// "jaw#2" is not in the scene; cut at "#", "jaw" is unique there and is found with name
// demangling. "lip#3" cuts to "lip", which two nodes bear; "nose" is nowhere.
TEST_F(ApplyTest, NameRulesAndContinue) {
    AddChannel("lip#3", KLKeyChannel::kTX, {0, 1, 2});
    AddChannel("jaw#2", KLKeyChannel::kTY, {0, 1, 2});
    AddChannel("nose", KLKeyChannel::kTZ, {0, 1, 2});
    AddChannel("lip#2", KLKeyChannel::kTZ, {0, 1, 2});
    track.InsertKey(2, Frames(1), set.GetKeyShape(2), 1, 1.0f);
    imp.answers = {1, 1};
    ASSERT_EQ(track.Apply(wire.get(), "face", Frames(0), Frames(5), CueTime()), 1);
    ASSERT_EQ(imp.confirms.size(), 2u);
    EXPECT_EQ(imp.confirms[0].message, "Dag name [lip#3] isn't unique, ignored.");
    EXPECT_EQ(imp.confirms[0].first, "Continue");
    EXPECT_EQ(imp.confirms[0].second, "Cancel");
    // A name that is nowhere is not unique either: it is reported the same way.
    EXPECT_EQ(imp.confirms[1].message, "Dag name [nose] isn't unique, ignored.");
    ExpectKeys(Curve("jaw", KLKeyChannel::kTY), {{1, 2, 2, 2}});
    ExpectKeys(Curve("lip#2", KLKeyChannel::kTZ), {{1, 2, 2, 2}});
    EXPECT_EQ(Curve("lip", KLKeyChannel::kTX), nullptr);
}

TEST_F(ApplyTest, CancelStopsAndKeepsWhatWasStored) {
    AddChannel("jaw", KLKeyChannel::kTX, {0, 1, 2});
    AddChannel("lip#3", KLKeyChannel::kTX, {0, 1, 2});
    AddChannel("brow", KLKeyChannel::kTX, {0, 1, 2});
    track.InsertKey(1, Frames(1), set.GetKeyShape(1), 1, 1.0f);
    imp.answers = {0};
    EXPECT_EQ(track.Apply(wire.get(), "face", Frames(0), Frames(5), CueTime()), 0);
    EXPECT_EQ(imp.confirms.size(), 1u);
    EXPECT_NE(Curve("jaw", KLKeyChannel::kTX), nullptr) << "stored before the cancel";
    EXPECT_EQ(Curve("brow", KLKeyChannel::kTX), nullptr);
}

TEST_F(ApplyTest, NoEventInRangeStoresNothing) {
    AddChannel("jaw", KLKeyChannel::kTX, {0, 1, 2});
    track.InsertKey(1, Frames(30), set.GetKeyShape(1), 1, 1.0f);
    EXPECT_EQ(track.Apply(wire.get(), "face", Frames(0), Frames(5), CueTime()), 1);
    EXPECT_EQ(Curve("jaw", KLKeyChannel::kTX), nullptr);
    KLKeyTrack empty(&set);
    EXPECT_EQ(empty.Apply(wire.get(), "face", Frames(0), Frames(5), CueTime()), 1);
}

TEST_F(ApplyTest, KindTwoWritesValuesOnItsNodeAndChannel) {
    KLKeySet brow("brow", "brow", KLKeyChannel::kRZ, 0.0f, 1.0f);
    std::istringstream in("key up 1\nkey down 2\n");
    brow.Read(in);
    KLKeyTrack t(&brow);
    t.InsertKey(0, Frames(2), brow.GetKeyShape(0), KLKeyEvent::kSmooth, 30.0f);
    t.InsertKey(1, Frames(4.25), brow.GetKeyShape(1), KLKeyEvent::kLinear, -12.5f);
    t.InsertKey(1, Frames(9), brow.GetKeyShape(1), KLKeyEvent::kLinear, 99.0f);
    ASSERT_EQ(t.Apply(wire.get(), "face", Frames(0), Frames(8), Frames(1)), 1);
    ExpectKeys(Curve("brow", KLKeyChannel::kRZ), {{3, 30, 0, 2}, {5.25, -12.5, 1, 0}});
}

TEST_F(ApplyTest, KindTwoMissingNodeAsks) {
    KLKeySet brow("brow", "forehead", KLKeyChannel::kRZ, 0.0f, 1.0f);
    KLKeyTrack t(&brow);
    t.InsertKey(0, Frames(2), nullptr, 1, 1.0f);
    imp.answers = {1, 0};
    EXPECT_EQ(t.Apply(wire.get(), "face", Frames(0), Frames(8), CueTime()), 1);
    EXPECT_EQ(t.Apply(wire.get(), "face", Frames(0), Frames(8), CueTime()), 0);
    ASSERT_EQ(imp.confirms.size(), 2u);
    EXPECT_EQ(imp.confirms[0].message, "Could not locate apply dag [forehead].");
}

// The stored scene, read back, gives the applied value at every key (fractional frames too).
TEST_F(ApplyTest, StoredSceneReadsBackAtEveryKey) {
    CueTime::default_fps = 24;
    AddChannel("jaw", KLKeyChannel::kRX, {0, 30, -15});
    AddChannel("lip#2", KLKeyChannel::kTX, {0, 0.5f, 2});
    const double frames[] = {0, 2.5, 7, 7.75, 13, 20};
    const int smoothing[] = {0, 1, 2, 2, 0, 1};
    for (int i = 0; i < 6; ++i) {
        track.InsertKey(1 + i % 2, Frames(frames[i]), set.GetKeyShape(1 + i % 2), smoothing[i],
                        0.5f + 0.25f * i);
    }
    ASSERT_EQ(track.Apply(wire.get(), "face", Frames(0), Frames(20), Frames(3)), 1);
    const std::vector<ChannelCurve::Key> rx = Curve("jaw", KLKeyChannel::kRX)->keys();
    const std::vector<ChannelCurve::Key> tx = Curve("lip#2", KLKeyChannel::kTX)->keys();
    for (const char* name : {"stored.gltf", "stored.glb"}) {
        ASSERT_EQ(wire->Store(dir->File(name).c_str()), 1);
        KLWireSource back(dir->File(name).c_str());
        ASSERT_TRUE(back.Valid()) << back.ErrorText();
        std::unique_ptr<OrDagNode> r(back.RootNode());
        std::unique_ptr<OrDagNode> jaw(KLWire::FetchDagNode(r.get(), "jaw"));
        std::unique_ptr<OrDagNode> lip(KLWire::FetchDagNode(r.get(), "lip#2"));
        OrChannel* backRx = KLWire::FindChannel(jaw.get(), KLKeyChannel::kRX);
        OrChannel* backTx = KLWire::FindChannel(lip.get(), KLKeyChannel::kTX);
        ASSERT_NE(backRx, nullptr);
        ASSERT_NE(backTx, nullptr);
        for (int i = 0; i < 6; ++i) {
            const double f = (Frames(frames[i]) + Frames(3)).Frames();  // the key's own tick
            const int shape = 1 + i % 2;
            const float v = 0.5f + 0.25f * i;
            EXPECT_NEAR(backRx->eval(f), rx[size_t(i)].value, 1e-3) << name << " key " << i;
            EXPECT_NEAR(backRx->eval(f), v * (shape == 1 ? 30.0 : -15.0), 1e-3);
            EXPECT_NEAR(backTx->eval(f), tx[size_t(i)].value, 1e-5) << name << " key " << i;
        }
    }
}

}  // namespace
