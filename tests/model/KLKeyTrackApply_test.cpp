#include <gtest/gtest.h>

#include "model/KLEdlEvent.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "model/ModelTestUtil.h"
#include "scene/ChannelCurve.h"
#include "toolkit/KLFilePath.h"

namespace {

// The face scene, unanimated; key shapes at 0, 10 and 20.
class ApplyTest : public ModelTest {
  protected:
    void SetUp() override {
        OpenFace();
        ReadText(set, "key rest 0\nkey open 10\nkey smile 20\n");
    }
    void Key(int shape, double frame, int smoothing, float value) {
        track.InsertKey(shape, Frames(frame), set.GetKeyShape(shape), smoothing, value);
    }
    int Apply(double from, double to, double offset = 0, const char* base = "face") {
        return track.Apply(wire.get(), base, Frames(from), Frames(to), Frames(offset));
    }
    // The keys as "frame value in-tangent out-tangent, ..."; "-": the channel is not animated.
    std::string Keys(const char* node, int channel) {
        const auto* curve =
            static_cast<const ChannelCurve*>(KLWire::FindChannel(Node(node), channel));
        if (!curve)
            return "-";
        std::ostringstream out;
        for (const ChannelCurve::Key& k : curve->keys())
            out << (out.tellp() ? ", " : "") << k.time * CueTime::default_fps << " " << k.value
                << " " << int(k.in) << " " << int(k.out);
        return out.str();
    }
    KLKeySet set{"mouth", "face.gltf"};
    KLKeyTrack track{&set};
};

// value = d + v (s - d), d the rest shape's; in tangent from the key's smoothing, out from the
// key before (flat first); range ends inclusive to the tick. Constant channels go unreported.
TEST_F(ApplyTest, BlendsFromRestPoseWithTangentsPerKeyInRange) {
    set.defaultIndex = 2;
    AddChannel(set, "jaw", KLKeyChannel::kRX, {1, 11, -3});
    AddChannel(set, "jaw", KLKeyChannel::kTY, {5, 5, 5});
    Key(1, 0, KLKeyEvent::kLinear, 1.0f);
    Key(0, 3.5, KLKeyEvent::kSmooth, 0.5f);
    Key(1, 10, KLKeyEvent::kEase, 2.0f);
    Key(0, 20, KLKeyEvent::kLinear, 1.0f);
    ReportCapture reports;
    ASSERT_EQ(Apply(0, 10), 1);
    EXPECT_EQ(reports.messages, std::vector<std::string>{"Apply [jaw.RX]...\n"});
    EXPECT_TRUE(imp.confirms.empty() && imp.informs.empty());
    EXPECT_EQ(Keys("jaw", KLKeyChannel::kRX), "0 11 1 2, 3.5 -1 0 1, 10 25 2 0");
    EXPECT_EQ(Keys("jaw", KLKeyChannel::kTY), "0 5 1 2, 3.5 5 0 1, 10 5 2 0");
    EXPECT_EQ(Keys("jaw", KLKeyChannel::kTX), "-");
    const CueTime tick = Ticks(1);
    ASSERT_EQ(track.Apply(wire.get(), "face", Frames(3.5) + tick, Frames(10) - tick, {}), 1);
    EXPECT_EQ(Keys("jaw", KLKeyChannel::kRX), "0 11 1 2, 3.5 -1 0 1, 10 25 2 0") << "unchanged";
    ASSERT_EQ(track.Apply(wire.get(), "face", tick, Frames(20) - tick, {}), 1);
    EXPECT_EQ(Keys("jaw", KLKeyChannel::kRX), "3.5 -1 0 2, 10 25 2 0");
}

// offset = destination start - source start (fractional frames at 24 fps); a base node below
// the top level is found by name.
TEST_F(ApplyTest, OffsetAndBaseNode) {
    CueTime::default_fps = 24;
    AddChannel(set, "jaw", KLKeyChannel::kTZ, {0, 3, 6});
    AddChannel(set, "lip", KLKeyChannel::kTX, {0, 1, 2});
    Key(1, 40, KLKeyEvent::kLinear, 1.0f);
    Key(2, 45.5, KLKeyEvent::kLinear, 0.25f);
    ASSERT_EQ(Apply(40, 50, 12.5 - 40, "neck"), 1);
    EXPECT_EQ(Keys("jaw", KLKeyChannel::kTZ), "12.5 3 1 2, 18 1.5 1 1");
    EXPECT_EQ(imp.confirms.size(), 1u) << "lip is not below neck";
}

// "jaw#2" cut at "#" finds the unique "jaw"; "lip#3" (two "lip"s) and "nose" (none) are told
// as not unique. Continue goes on; Cancel stops, keeping what was stored.
TEST_F(ApplyTest, NameRulesContinueAndCancel) {
    for (auto [node, channel] : {std::pair{"lip#3", KLKeyChannel::kTX},
                                 {"jaw#2", KLKeyChannel::kTY},
                                 {"nose", KLKeyChannel::kTZ},
                                 {"lip#2", KLKeyChannel::kTZ},
                                 {"nose", KLKeyChannel::kRX},
                                 {"brow", KLKeyChannel::kTX}})
        AddChannel(set, node, channel, {0, 1, 2});
    Key(2, 1, KLKeyEvent::kEase, 1.0f);
    imp.answers = {1, 1, 0};
    ASSERT_EQ(Apply(0, 5), 0);
    EXPECT_EQ(imp.confirms,
              (std::vector<std::string>{"Dag name [lip#3] isn't unique, ignored.|Continue|Cancel",
                                        "Dag name [nose] isn't unique, ignored.|Continue|Cancel",
                                        "Dag name [nose] isn't unique, ignored.|Continue|Cancel"}));
    EXPECT_EQ(Keys("jaw", KLKeyChannel::kTY), "1 2 2 2");
    EXPECT_EQ(Keys("lip#2", KLKeyChannel::kTZ), "1 2 2 2");
    EXPECT_EQ(Keys("lip", KLKeyChannel::kTX), "-");
    EXPECT_EQ(Keys("brow", KLKeyChannel::kTX), "-") << "after the cancel";
    EXPECT_FALSE(KLWire::NamesDemangled() || KLWire::alwaysClearChannel)
        << "the settings apply switches on are off again, after a cancel too";
}

// Kind 2 writes the values as they stand on its node and channel; a missing node asks.
TEST_F(ApplyTest, KindTwoWritesValuesOnItsNodeAndChannel) {
    KLKeySet brow("brow", "brow", KLKeyChannel::kRZ, 0.0f, 1.0f);
    KLKeyTrack t(&brow);
    t.InsertKey(0, Frames(2), nullptr, KLKeyEvent::kSmooth, 30.0f);
    t.InsertKey(1, Frames(4.25), nullptr, KLKeyEvent::kLinear, -12.5f);
    t.InsertKey(1, Frames(9), nullptr, KLKeyEvent::kLinear, 99.0f);
    const auto apply = [&](int offset) {
        return t.Apply(wire.get(), "face", Frames(0), Frames(8), Frames(offset));
    };
    ASSERT_EQ(apply(1), 1);
    EXPECT_EQ(Keys("brow", KLKeyChannel::kRZ), "3 30 0 2, 5.25 -12.5 1 0");
    brow.nodeName = "forehead";
    imp.answers = {1, 0};
    EXPECT_EQ(apply(0), 1);
    EXPECT_EQ(apply(0), 0);
    EXPECT_EQ(imp.confirms, std::vector<std::string>(
                                2, "Could not locate apply dag [forehead].|Continue|Cancel"));
}

// An edit-list event stores its scene only while open and valid; without a scene file it
// opens nothing.
TEST_F(ApplyTest, EdlEventStoresOnlyAnOpenScene) {
    KLEdlEvent event(File("face.gltf").c_str(), {}, {}, {}, {}), none(nullptr, {}, {}, {}, {}),
        missing(File("none.gltf").c_str(), {}, {}, {}, {});
    EXPECT_EQ(event.StoreWire(File("out.glb").c_str()), 0) << "not open";
    none.OpenWire();
    missing.OpenWire();
    EXPECT_TRUE(!none.wire && missing.wire && !missing.wire->Valid() && !missing.dagList);
    EXPECT_EQ(missing.StoreWire(File("out.glb").c_str()), 0);
    EXPECT_FALSE(KLFilePath::Exists(File("out.glb").c_str()));
}

}  // namespace
