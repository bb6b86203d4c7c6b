#include "model/KLKeySet.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>

#include "model/ModelTestUtil.h"
#include "scene/KLWire.h"
#include "toolkit/KLFilePath.h"
#include "toolkit/KLImageSGI.h"

namespace {

// Channel names as reports show them; an unknown channel is reported and named TX.
TEST(KLKeyChannel, SetGetNamesAndDump) {
    CerrCapture err;
    KLKeyChannel c("jaw", KLKeyChannel::kRX, 2);
    c.Set(-1, 1.0f);  // out of range: ignored, not counted, silent
    c.Set(2, 1.0f);
    for (float v : {2.5f, 3.5f, 3.5f})
        c.Set(1, v);
    EXPECT_EQ(c.count, 3) << "every set in range counts";
    EXPECT_EQ(c.Get(1), 3.5f);
    EXPECT_EQ(c.Get(2), -10000.0f);
    EXPECT_EQ(c.Get(-1), -10000.0f);
    c.Dump();  // the count exceeds the size: only existing slots are printed
    std::string names;
    for (int i = 0; i <= 9; ++i)
        names += KLKeyChannel("n", i, 1).GetChannelName();
    EXPECT_EQ(names, "TXTYTZRXRYRZSXSYSZTX");
    EXPECT_EQ(
        err.Text(),
        "KLKeyChannel::Get() out of range\nKLKeyChannel::Get() out of range\n"
        "    Idx 0 value 0\n    Idx 1 value 3.5\nKLKeyChannel::GetChannelName() unknown channel\n");
}

// Constant unless every slot was set (by count) and the values differ exactly.
struct ConstantCase {
    const char* name;
    int size;
    std::vector<std::pair<int, float>> sets;
    int constant;
};
void PrintTo(const ConstantCase& c, std::ostream* os) {
    *os << c.name;
}
class KLKeyChannelConstant : public ::testing::TestWithParam<ConstantCase> {};
TEST_P(KLKeyChannelConstant, Rule) {
    KLKeyChannel c("a", 0, GetParam().size);
    for (const auto& [i, v] : GetParam().sets)
        c.Set(i, v);
    EXPECT_EQ(c.Constant(), GetParam().constant);
}
INSTANTIATE_TEST_SUITE_P(
    Cases, KLKeyChannelConstant,
    ::testing::Values(ConstantCase{"NothingSet", 3, {}, 1},
                      ConstantCase{"PartlySet", 3, {{0, 1.0f}, {2, 5.0f}}, 1},
                      ConstantCase{"AllEqual", 3, {{0, 0.25f}, {1, 0.25f}, {2, 0.25f}}, 1},
                      ConstantCase{"LastUlpDiffers",
                                   3,
                                   {{0, 1.0f}, {1, 1.0f}, {2, std::nextafter(1.0f, 2.0f)}},
                                   0},
                      // count matches size, slot 1 never set: its zero differs
                      ConstantCase{"OneSlotSetTwice", 2, {{0, 3.0f}, {0, 4.0f}}, 0},
                      ConstantCase{"ThreeSetsOnTwoSlots", 2, {{0, 1.0f}, {1, 2.0f}, {1, 2.0f}}, 1},
                      ConstantCase{"NoValues", -5, {}, 1}),
    [](const auto& p) { return std::string(p.param.name); });

class KLKeySetTest : public ModelTest {
  protected:
    KLKeySetTest() { imp.pixDir = dir; }
    void MakePicture(const std::string& name) {
        ASSERT_TRUE(KLImageSGI(32, 24).Store(File(name).c_str()));
    }
    bool OnFile(const std::string& name) { return KLFilePath::Exists(File(name).c_str()); }
    KLKeySet set{"mouth", nullptr};
};

// Shape lookups are exact and the first of equal frames or names wins; channels added later
// are found first.
TEST_F(KLKeySetTest, Lookups) {
    ReadText(set, "key rest 0\nkey ah 12\nkey ah 20\nkey oo 12\nend\n");
    ASSERT_EQ(set.keyShapeCount, 4);
    EXPECT_EQ(set.keyShapes[3]->index, 3);
    EXPECT_EQ(set.GetKeyShapeIdx(12.0f), 1);
    EXPECT_EQ(set.GetKeyShapeIdx(12.5f), -1);
    EXPECT_EQ(set.GetKeyShapeId("ah"), 1);
    EXPECT_EQ(set.GetKeyShapeId("AH"), -1);
    EXPECT_EQ(set.GetKeyShapeId(nullptr), -1);
    EXPECT_EQ(set.GetKeyShapeFrame(2), 20.0f);
    EXPECT_EQ(set.GetKeyShapeFrame(4), -1.0f);
    EXPECT_STREQ(set.GetKeyShapeName(3), "oo");
    EXPECT_TRUE(!set.GetKeyShape(-1) && !set.GetKeyShapeName(4) && !set.GetKeyShapeImage(4));
    auto* later = new KLKeyChannel("jaw", 3, 2);
    set.AddKeyChannel(new KLKeyChannel("jaw", 3, 2));
    set.AddKeyChannel(new KLKeyChannel("jaw", 4, 2));
    set.AddKeyChannel(later);
    EXPECT_EQ(set.GetKeyChannel("jaw", 3), later);
    EXPECT_TRUE(!set.GetKeyChannel("jaw", 5) && !set.GetKeyChannel("lip", 3));
}

// Only "key" lines of three or four words count, silently; the block ends at "end"; a new
// read replaces the key shapes. The default is the last shape at the rest frame (kind 1).
TEST_F(KLKeySetTest, ReadStatementsAndDefault) {
    CerrCapture err;
    imp.restFrame = 5.0f;
    ReadText(set, "key x 1\nkey y 2\n");
    std::istringstream in(
        "# a comment\nkey short\nkey a 5 pic.sgi extra\nkeys b 5\n\nkey c 5\nshape d 4\n"
        "key e 6\nkey f 5\nkey g 7\nend here\nkey after 5\n");
    set.Read(in);
    EXPECT_EQ(err.Text(), "");
    ASSERT_EQ(set.keyShapeCount, 4);
    EXPECT_STREQ(set.GetKeyShapeName(0), "c");
    EXPECT_EQ(set.GetDefaultKeyShape(), set.keyShapes[2].get());
    std::string rest;
    std::getline(in, rest);
    EXPECT_EQ(rest, "key after 5") << "the block stops at its end line";
    ReadText(set, "end\n");
    EXPECT_EQ(set.keyShapeCount, 0);
    EXPECT_EQ(set.GetDefaultKeyShape(), nullptr);
    KLKeySet two("two", "node", 0, 0, 1);
    two.defaultIndex = 1;
    ReadText(two, "key a 5\nkey b 6\nkey c 5\n");
    EXPECT_EQ(two.defaultIndex, 1) << "kind 2 keeps its default";
}

// A picture is kept when readable (relative names below the picture directory); frames are
// whole numbers, except for kind 2 without a readable picture.
TEST_F(KLKeySetTest, ReadPicturesAndFrames) {
    MakePicture("p.sgi");
    const std::string block =
        "key a 12.75 p.sgi\nkey b 12.75 nope.sgi\nkey c 12.75 " + File("p.sgi") + "\nkey d 12.75\n";
    KLKeySet two("two", "node", 0, 0, 1);
    ReadText(set, block);
    ReadText(two, block);
    ASSERT_TRUE(set.keyShapeCount == 4 && two.keyShapeCount == 4);
    EXPECT_STREQ(set.keyShapes[0]->ImageFile(), "p.sgi") << "kept as written";
    EXPECT_EQ(set.keyShapes[1]->ImageFile(), nullptr);
    EXPECT_EQ(set.keyShapes[2]->ImageFile(), File("p.sgi"));
    EXPECT_EQ(set.imagesOnFile, 0) << "a picture missing";
    for (size_t i = 0; i < 4; ++i) {
        EXPECT_EQ(set.keyShapes[i]->frame, 12.0f) << i;
        EXPECT_EQ(two.keyShapes[i]->frame, i == 0 || i == 2 ? 12.0f : 12.75f) << i;
    }
    set.imagesOnFile = 1;
    ReadText(set, "key a 1 p.sgi\n");
    EXPECT_EQ(set.imagesOnFile, 1);
    imp.pixDir = "/nonexistent-pix";
    ReadText(set, "key a 1 p.sgi\n");
    EXPECT_EQ(set.keyShapes[0]->ImageFile(), nullptr);
}

// Frames beyond the integer range saturate, and name their pictures without overflow.
TEST_F(KLKeySetTest, HugeFramesSaturate) {
    ReadText(set, "key \"\" \"\"\nkey x 99999999999999999999\nkey y -1e40\nkey w -7\n");
    ASSERT_EQ(set.keyShapeCount, 4);
    EXPECT_STREQ(set.GetKeyShapeName(0), "");
    EXPECT_EQ(set.GetKeyShapeFrame(1), 2147483647.0f);
    EXPECT_EQ(set.GetKeyShapeFrame(3), -7.0f);
    EXPECT_NE(Written(set).find("key x 2147483648 mouth.2147483647.sgi"), std::string::npos);
}

// Each block read, written (pictures stored as needed), read back to equal key shapes and
// written again to the same text.
struct WriteCase {
    const char *name, *input;
    bool kindTwo;
    int pictureSetOn;  // a picture set in the program on this key shape; -1: none
    const char *golden, *stored, *notStored;  // picture files the write does and does not store
};
void PrintTo(const WriteCase& c, std::ostream* os) {
    *os << c.name;
}
class KLKeySetWrite : public KLKeySetTest, public ::testing::WithParamInterface<WriteCase> {};

TEST_P(KLKeySetWrite, GoldenAndReadBack) {
    const WriteCase& c = GetParam();
    for (const char* p : {"a.sgi", "b c.sgi"})
        MakePicture(p);
    KLKeySet two("brow", "node", 1, 0, 1);
    KLKeySet& s = c.kindTwo ? two : set;
    ReadText(s, c.input);
    if (c.pictureSetOn >= 0) {
        s.keyShapes[size_t(c.pictureSetOn)]->SetImage(new KLImageSGI(10, 10));
        s.imagesChanged = 1;
    }
    EXPECT_EQ(Written(s), c.golden);
    if (c.stored) {
        auto stored = KLImageSGI::Load(File(c.stored).c_str());
        ASSERT_TRUE(stored);
        EXPECT_TRUE(stored->Width() == 160 && stored->Height() == 121);
    }
    EXPECT_FALSE(OnFile(c.notStored));
    if (c.kindTwo)
        return;  // a stored picture makes kind 2 read its frame as a whole number
    KLKeySet again("mouth", nullptr);
    ReadText(again, c.golden);
    ASSERT_EQ(again.keyShapeCount, s.keyShapeCount);
    for (int i = 0; i < s.keyShapeCount; ++i) {
        EXPECT_EQ(*again.keyShapes[i]->name, *s.keyShapes[i]->name);
        EXPECT_EQ(again.keyShapes[i]->frame, s.keyShapes[i]->frame);
    }
    EXPECT_EQ(Written(again), c.golden);
}

INSTANTIATE_TEST_SUITE_P(
    Blocks, KLKeySetWrite,
    ::testing::Values(WriteCase{"AllOnFileKeepNames",
                                "key a 0 a.sgi\n  key \"wide open\" 12 \"b c.sgi\"\nend\n", false,
                                -1, "    key a 0 a.sgi\n    key \"wide open\" 12 \"b c.sgi\"\n",
                                nullptr, "mouth.0000.sgi"},
                      WriteCase{"GeneratedNamesByFrame", "key a 3 a.sgi\nkey \"b\tc\" 12\n", false,
                                -1,
                                "    key a 3 mouth.0003.sgi\n    key \"b\tc\" 12 mouth.0012.sgi\n",
                                "mouth.0003.sgi", "mouth.0012.sgi"},
                      WriteCase{"KindTwoNamesByIndex", "key up 2.5\nkey down 7.25\n", true, 1,
                                "    key up 2.5 brow.0000.sgi\n    key down 7.25 brow.0001.sgi\n",
                                "brow.0001.sgi", "brow.0000.sgi"}),
    [](const auto& p) { return std::string(p.param.name); });

// A picture is loaded once at 160 x 121 with an 80 x 60 icon; one set in the program takes
// precedence with its own icon until cleared.
TEST_F(KLKeySetTest, KeyPictures) {
    MakePicture("face.sgi");
    CerrCapture err;
    EXPECT_EQ(KLKey(1.0f, "missing", "missing.sgi").GetImage(), nullptr);
    KLKey key(1.0f, "face", "face.sgi");
    KLImageSGI* picture = key.GetImage();
    ASSERT_TRUE(picture && picture->Width() == 160 && picture->Height() == 121);
    EXPECT_EQ(key.GetImage(), picture) << "loaded once";
    KLImageSGI* icon = key.GetIcon();
    ASSERT_TRUE(icon && icon->Width() == 80 && icon->Height() == 60);
    key.SetImage(new KLImageSGI(300, 200));
    EXPECT_TRUE(key.GetImage() != picture && key.GetImage()->Width() == 160);
    EXPECT_TRUE(key.GetIcon() != icon && key.GetIcon()->Height() == 60);
    key.ClearImage();
    EXPECT_TRUE(key.GetImage() == picture && key.GetIcon() == icon);
    key.SetImage(nullptr);
    EXPECT_EQ(err.Text(),
              "KLKey::GetImage() failed to get image\nKLKey::SetImage() no image on input\n");
}

// Key shapes at frames 0, 15 and 30 (0, 0.5 and 1 second at 30 fps) of a scene with a
// constant-translated "head" over "neck" over "jaw" (translation x 0, 1, 2, y and z constant;
// rotation about X 0, 10, 20) and a constant-scaled "brow"; two top-level nodes "lip" ("lip",
// "lip#2") with translation x changing; an unanimated "still".
class ExtractTest : public ModelTest {
  protected:
    void SetUp() override {
        SceneBuilder b;
        const std::vector<float> at = {0.0f, 0.5f, 1.0f};
        const int head = b.AddNode("head");
        b.Animate(head, "translation", at, {1, 2, 3, 1, 2, 3, 1, 2, 3});
        const int jaw = b.AddNode("jaw", b.AddNode("neck", head));
        b.Animate(jaw, "translation", at, {0, 7, 0, 1, 7, 0, 2, 7, 0});
        b.RotateX(jaw, at, {0, 10, 20});
        b.Animate(b.AddNode("brow", head), "scale", at, {1, 1, 1, 1, 1, 1, 1, 1, 1});
        b.Animate(b.AddNode("lip"), "translation", at, {0, 0, 0, 1, 0, 0, 0, 0, 0});
        b.Animate(b.AddNode("lip"), "translation", at, {5, 0, 0, 5, 0, 0, 6, 0, 0});
        b.AddNode("still");
        Open(b, "face.gltf");
        ReadText(set, "key rest 0\nkey open 15\nkey wide 30\n");
    }
    KLKeySet set{"mouth", "face.gltf"};
};

// Only channels that change are kept, each reported. Starting from a node rather than the
// root walks that node and the siblings after it.
TEST_F(ExtractTest, KeepsOnlyChannelsThatChange) {
    ReportCapture reports;
    set.ExtractKeys(root.get());
    EXPECT_EQ(set.keyChannels.size(), 4u);
    KLKeyChannel* tx = set.GetKeyChannel("jaw", KLKeyChannel::kTX);
    ASSERT_NE(tx, nullptr);
    EXPECT_EQ(tx->count, 3);
    for (int i = 0; i < 3; ++i)
        EXPECT_FLOAT_EQ(tx->Get(i), float(i));
    EXPECT_NEAR(set.GetKeyChannel("jaw", KLKeyChannel::kRX)->Get(1), 10.0f, 1e-3);
    EXPECT_NEAR(set.GetKeyChannel("jaw", KLKeyChannel::kRX)->Get(2), 20.0f, 1e-3);
    std::vector<std::string> reported = reports.messages;
    std::sort(reported.begin(), reported.end());
    EXPECT_EQ(reported,
              (std::vector<std::string>{"Key Channel [jaw.RX].\n", "Key Channel [jaw.TX].\n",
                                        "Key Channel [lip#2.TX].\n", "Key Channel [lip.TX].\n"}));

    std::unique_ptr<OrDagNode> head(root->childNode());
    std::unique_ptr<OrDagNode> lip(head->nextNode());
    ASSERT_STREQ(KLWire::NodeName(lip.get()), "lip");
    KLKeySet fromLip("mouth", "face.gltf"), empty("none", nullptr);
    ReadText(fromLip, "key rest 0\nkey open 15\nkey wide 30\n");
    fromLip.ExtractKeys(lip.get());
    EXPECT_EQ(fromLip.keyChannels.size(), 2u);
    EXPECT_NE(fromLip.GetKeyChannel("lip#2", KLKeyChannel::kTX), nullptr);
    empty.ExtractKeys(root.get());
    set.ExtractKeys(nullptr);
    EXPECT_TRUE(empty.keyChannels.empty());
}

// Two nodes sampled under one name share a channel; every slot is then set twice, so the
// channel counts as incompletely filled and is dropped.
TEST_F(ExtractTest, NodesSharingANameDropTheirChannel) {
    std::unique_ptr<OrDagNode> lip(KLWire::FetchDagNode(root.get(), "lip"));
    std::unique_ptr<OrDagNode> still(KLWire::FetchDagNode(root.get(), "still"));
    for (int i = 0; i < set.keyShapeCount; ++i) {
        const CueTime t(double(set.keyShapes[i]->frame), 0);
        set.extract_dag(t, i, lip.get());
        set.extract_dag(t, i, lip.get());
    }
    ASSERT_NE(set.GetKeyChannel("lip", KLKeyChannel::kTX), nullptr);
    EXPECT_EQ(set.GetKeyChannel("lip", KLKeyChannel::kTX)->count, 6);
    set.ExtractKeys(still.get());
    EXPECT_TRUE(set.keyChannels.empty());
}

}  // namespace
