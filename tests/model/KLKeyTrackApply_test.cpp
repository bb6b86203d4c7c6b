#include <gtest/gtest.h>

#include <filesystem>

#include "model/KLEdlEvent.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "model/ModelTestUtil.h"
#include "scene/ChannelCurve.h"
#include "scene/KLWire.h"
#include "toolkit/KLFilePath.h"

namespace {

struct Expected {
    double frame, value;
    int in, out;  // tangent codes
};

// A scene with a top-level "face" holding "jaw", two nodes named "lip" (the second is
// "lip#2") and "brow", and a top-level "other"; no animation. Key shapes at 0, 10 and 20.
class ApplyTest : public ModelTest {
  protected:
    void SetUp() override {
        SceneBuilder b;
        const int face = b.AddNode("face");
        for (const char* name : {"jaw", "lip", "lip", "brow"})
            b.AddNode(name, face);
        b.AddNode("other");
        Open(b, "target.gltf");
        ReadText(set, "key rest 0\nkey open 10\nkey smile 20\n");
    }
    // A kind-1 channel with one value per key shape; channels are applied in the order added.
    void AddChannel(const char* node, int channel, std::vector<float> values) {
        auto* c = new KLKeyChannel(node, channel, int(values.size()));
        for (size_t i = 0; i < values.size(); ++i)
            c->Set(int(i), values[i]);
        set.keyChannels.push_back(c);
    }
    void Key(int shape, double frame, int smoothing, float value, KLKeyTrack* t = nullptr) {
        KLKeySet* s = t ? t->keySet : &set;
        (t ? t : &track)->InsertKey(shape, Frames(frame), s->GetKeyShape(shape), smoothing, value);
    }
    int Apply(double from, double to, double offset = 0, const char* base = "face") {
        return track.Apply(wire.get(), base, Frames(from), Frames(to), Frames(offset));
    }
    const ChannelCurve* Curve(const char* node, int channel) {
        std::unique_ptr<OrDagNode> n(KLWire::FetchDagNode(root.get(), node));
        return n ? static_cast<const ChannelCurve*>(KLWire::FindChannel(n.get(), channel))
                 : nullptr;
    }
    void ExpectKeys(const char* node, int channel, const std::vector<Expected>& keys) {
        const ChannelCurve* curve = Curve(node, channel);
        ASSERT_NE(curve, nullptr) << node;
        ASSERT_EQ(curve->keys().size(), keys.size()) << node;
        for (size_t i = 0; i < keys.size(); ++i) {
            const ChannelCurve::Key& k = curve->keys()[i];
            EXPECT_NEAR(k.time, Frames(keys[i].frame).Seconds(), 1e-9) << node << " key " << i;
            EXPECT_FLOAT_EQ(float(k.value), float(keys[i].value)) << node << " key " << i;
            EXPECT_EQ(int(k.in), keys[i].in) << node << " in tangent of key " << i;
            EXPECT_EQ(int(k.out), keys[i].out) << node << " out tangent of key " << i;
        }
    }

    KLKeySet set{"mouth", "face.gltf"};
    KLKeyTrack track{&set};
};

// value = d + v * (s - d) with d the default (rest) shape's value; in tangent from the key's
// own smoothing, out tangent from the key before it (flat for the first); events outside the
// range skipped. Constant channels are applied too, but not reported.
TEST_F(ApplyTest, BlendsFromRestPoseWithTangentsPerKey) {
    set.defaultIndex = 2;
    AddChannel("jaw", KLKeyChannel::kRX, {1, 11, -3});
    AddChannel("jaw", KLKeyChannel::kTY, {5, 5, 5});
    Key(1, 0, KLKeyEvent::kLinear, 1.0f);
    Key(0, 3.5, KLKeyEvent::kSmooth, 0.5f);
    Key(1, 10, KLKeyEvent::kEase, 2.0f);
    Key(0, 20, KLKeyEvent::kLinear, 1.0f);
    ReportCapture reports;
    ASSERT_EQ(Apply(0, 10), 1);
    EXPECT_EQ(reports.messages, std::vector<std::string>{"Apply [jaw.RX]...\n"});
    EXPECT_TRUE(imp.confirms.empty());
    EXPECT_TRUE(imp.informs.empty());
    // Linear 1, Smooth 0, Ease 2.
    ExpectKeys("jaw", KLKeyChannel::kRX, {{0, 11, 1, 2}, {3.5, -1, 0, 1}, {10, 25, 2, 0}});
    ExpectKeys("jaw", KLKeyChannel::kTY, {{0, 5, 1, 2}, {3.5, 5, 0, 1}, {10, 5, 2, 0}});
    EXPECT_EQ(Curve("jaw", KLKeyChannel::kTX), nullptr);
}

TEST_F(ApplyTest, RangeEndsAreInclusiveToTheTick) {
    AddChannel("jaw", KLKeyChannel::kTX, {0, 1, 2});
    for (int f : {5, 6, 7, 8})
        Key(1, f, KLKeyEvent::kEase, float(f));
    ASSERT_EQ(Apply(0, 4), 1);
    EXPECT_EQ(Curve("jaw", KLKeyChannel::kTX), nullptr) << "no event in range: nothing stored";
    ASSERT_EQ(Apply(6, 7), 1);
    ExpectKeys("jaw", KLKeyChannel::kTX, {{6, 6, 2, 2}, {7, 7, 2, 2}});
    const CueTime tick = CueTime::FromTicks(1);
    ASSERT_EQ(track.Apply(wire.get(), "face", Frames(6) + tick, Frames(7) - tick, CueTime()), 1);
    ExpectKeys("jaw", KLKeyChannel::kTX, {{6, 6, 2, 2}, {7, 7, 2, 2}});  // left as it was
    KLKeyTrack empty(&set);
    EXPECT_EQ(empty.Apply(wire.get(), "face", Frames(0), Frames(5), CueTime()), 1);
}

// With offset = destination start - source start, the key at the source start lands on the
// destination start. A base node below the top level is found anywhere by name.
TEST_F(ApplyTest, OffsetAndBaseBelowTopLevel) {
    AddChannel("jaw", KLKeyChannel::kTZ, {0, 3, 6});
    AddChannel("lip", KLKeyChannel::kTX, {0, 1, 2});
    Key(1, 40, KLKeyEvent::kLinear, 1.0f);
    Key(2, 45.5, KLKeyEvent::kLinear, 1.0f);
    ASSERT_EQ(Apply(40, 50, 12 - 40, "jaw"), 1);
    ExpectKeys("jaw", KLKeyChannel::kTZ, {{12, 3, 1, 2}, {17.5, 6, 1, 1}});
    EXPECT_EQ(imp.confirms.size(), 1u) << "lip is not below jaw";
}

TEST_F(ApplyTest, MissingBaseNodeStopsWithMessage) {
    AddChannel("jaw", KLKeyChannel::kTX, {0, 1, 2});
    Key(1, 1, KLKeyEvent::kEase, 1.0f);
    EXPECT_EQ(Apply(0, 5, 0, "nobody"), 0);
    ASSERT_EQ(imp.informs.size(), 1u);
    EXPECT_EQ(imp.informs[0].message, "Cannot find base dag [nobody] for apply ...");
    EXPECT_EQ(imp.informs[0].first, "Dismiss");
    EXPECT_EQ(Curve("jaw", KLKeyChannel::kTX), nullptr);
    EXPECT_EQ(track.Apply(nullptr, "face", Frames(0), Frames(5), CueTime()), 0);
}

// "jaw#2" is not in the scene; cut at "#", "jaw" is unique there and is found with name
// demangling. "lip#3" cuts to "lip", which two nodes bear; "nose" is nowhere: both are
// reported as not unique. Continue goes on; Cancel stops, keeping what was stored.
TEST_F(ApplyTest, NameRulesContinueAndCancel) {
    AddChannel("lip#3", KLKeyChannel::kTX, {0, 1, 2});
    AddChannel("jaw#2", KLKeyChannel::kTY, {0, 1, 2});
    AddChannel("nose", KLKeyChannel::kTZ, {0, 1, 2});
    AddChannel("lip#2", KLKeyChannel::kTZ, {0, 1, 2});
    AddChannel("nose", KLKeyChannel::kRX, {0, 1, 2});
    AddChannel("brow", KLKeyChannel::kTX, {0, 1, 2});
    Key(2, 1, KLKeyEvent::kEase, 1.0f);
    imp.answers = {1, 1, 0};
    ASSERT_EQ(Apply(0, 5), 0);
    ASSERT_EQ(imp.confirms.size(), 3u);
    EXPECT_EQ(imp.confirms[0].message, "Dag name [lip#3] isn't unique, ignored.");
    EXPECT_EQ(imp.confirms[0].first, "Continue");
    EXPECT_EQ(imp.confirms[0].second, "Cancel");
    EXPECT_EQ(imp.confirms[1].message, "Dag name [nose] isn't unique, ignored.");
    ExpectKeys("jaw", KLKeyChannel::kTY, {{1, 2, 2, 2}});
    ExpectKeys("lip#2", KLKeyChannel::kTZ, {{1, 2, 2, 2}});
    EXPECT_EQ(Curve("lip", KLKeyChannel::kTX), nullptr);
    EXPECT_EQ(Curve("brow", KLKeyChannel::kTX), nullptr) << "after the cancel";
}

// Kind 2 writes the values as they stand on its node and channel; a missing node asks.
TEST_F(ApplyTest, KindTwoWritesValuesOnItsNodeAndChannel) {
    KLKeySet brow("brow", "brow", KLKeyChannel::kRZ, 0.0f, 1.0f);
    ReadText(brow, "key up 1\nkey down 2\n");
    KLKeyTrack t(&brow);
    Key(0, 2, KLKeyEvent::kSmooth, 30.0f, &t);
    Key(1, 4.25, KLKeyEvent::kLinear, -12.5f, &t);
    Key(1, 9, KLKeyEvent::kLinear, 99.0f, &t);
    ASSERT_EQ(t.Apply(wire.get(), "face", Frames(0), Frames(8), Frames(1)), 1);
    ExpectKeys("brow", KLKeyChannel::kRZ, {{3, 30, 0, 2}, {5.25, -12.5, 1, 0}});

    brow.nodeName = "forehead";
    imp.answers = {1, 0};
    EXPECT_EQ(t.Apply(wire.get(), "face", Frames(0), Frames(8), CueTime()), 1);
    EXPECT_EQ(t.Apply(wire.get(), "face", Frames(0), Frames(8), CueTime()), 0);
    ASSERT_EQ(imp.confirms.size(), 2u);
    EXPECT_EQ(imp.confirms[0].message, "Could not locate apply dag [forehead].");
}

// The stored scene, read back, gives the applied value at every key (fractional frames at
// 24 fps too).
TEST_F(ApplyTest, StoredSceneReadsBackAtEveryKey) {
    CueTime::default_fps = 24;
    AddChannel("jaw", KLKeyChannel::kRX, {0, 30, -15});
    AddChannel("lip#2", KLKeyChannel::kTX, {0, 0.5f, 2});
    const double frames[] = {0, 2.5, 7, 7.75, 13, 20};
    const int smoothing[] = {0, 1, 2, 2, 0, 1};
    for (int i = 0; i < 6; ++i)
        Key(1 + i % 2, frames[i], smoothing[i], 0.5f + 0.25f * i);
    ASSERT_EQ(Apply(0, 20, 3), 1);
    const std::vector<ChannelCurve::Key> rx = Curve("jaw", KLKeyChannel::kRX)->keys();
    const std::vector<ChannelCurve::Key> tx = Curve("lip#2", KLKeyChannel::kTX)->keys();
    for (const char* name : {"stored.gltf", "stored.glb"}) {
        ASSERT_EQ(wire->Store(File(name).c_str()), 1);
        KLWireSource back(File(name).c_str());
        ASSERT_TRUE(back.Valid()) << back.ErrorText();
        std::unique_ptr<OrDagNode> r(back.RootNode());
        std::unique_ptr<OrDagNode> jaw(KLWire::FetchDagNode(r.get(), "jaw"));
        std::unique_ptr<OrDagNode> lip(KLWire::FetchDagNode(r.get(), "lip#2"));
        OrChannel* backRx = KLWire::FindChannel(jaw.get(), KLKeyChannel::kRX);
        OrChannel* backTx = KLWire::FindChannel(lip.get(), KLKeyChannel::kTX);
        ASSERT_TRUE(backRx && backTx);
        for (size_t i = 0; i < 6; ++i) {
            const double f = (Frames(frames[i]) + Frames(3)).Frames();  // the key's own tick
            const float v = 0.5f + 0.25f * i;
            EXPECT_NEAR(backRx->eval(f), rx[i].value, 1e-3) << name << " key " << i;
            EXPECT_NEAR(backRx->eval(f), v * (i % 2 ? -15.0 : 30.0), 1e-3);
            EXPECT_NEAR(backTx->eval(f), tx[i].value, 1e-5) << name << " key " << i;
        }
    }
}

// An edit-list event holds its scene file relative to the scene directory when below it,
// opens it with its node list, and stores it (then closed) only while open.
TEST_F(ApplyTest, EdlEventOpensAndStoresItsScene) {
    imp.wireDir = File("wire");
    std::filesystem::create_directories(imp.wireDir + "/shots");
    std::filesystem::copy_file(File("target.gltf"), imp.wireDir + "/shots/a.gltf");
    KLEdlEvent event((imp.wireDir + "/shots/a.gltf").c_str(), {}, {}, {}, {});
    EXPECT_STREQ(event.WireFile(), "shots/a.gltf");
    EXPECT_EQ(event.StoreWire(File("out.glb").c_str()), 0);
    EXPECT_FALSE(KLFilePath::Exists(File("out.glb").c_str())) << "closed: nothing written";
    event.OpenWire();
    ASSERT_TRUE(event.wire && event.wire->Valid());
    ASSERT_NE(event.dagList, nullptr);
    ASSERT_EQ(event.dagList->nodes.size(), 7u) << "root and six nodes";
    EXPECT_STREQ(KLWire::NodeName(event.dagList->nodes[2]), "jaw");
    EXPECT_EQ(event.StoreWire(File("out.glb").c_str()), 1);
    EXPECT_EQ(event.wire, nullptr);
    EXPECT_NE(event.dagList, nullptr) << "the node list survives closing";
    EXPECT_TRUE(KLWireSource(File("out.glb").c_str()).Valid());

    KLEdlEvent outside(File("target.gltf").c_str(), {}, {}, {}, {});
    EXPECT_EQ(std::string(outside.WireFile()), File("target.gltf"));
    outside.OpenWire();
    EXPECT_TRUE(outside.wire && outside.wire->Valid());
    KLEdlEvent none(nullptr, {}, {}, {}, {});
    none.OpenWire();
    EXPECT_EQ(none.wire, nullptr);
    KLEdlEvent missing("shots/none.gltf", {}, {}, {}, {});
    missing.OpenWire();
    ASSERT_NE(missing.wire, nullptr);
    EXPECT_FALSE(missing.wire->Valid());
    EXPECT_EQ(missing.dagList, nullptr);
    CerrCapture err;
    EXPECT_EQ(missing.StoreWire(File("x.gltf").c_str()), 0);
    EXPECT_FALSE(KLFilePath::Exists(File("x.gltf").c_str()));
}

}  // namespace
