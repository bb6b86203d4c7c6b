#include "model/KLKeySet.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <iterator>

#include "model/ModelTestUtil.h"
#include "toolkit/KLFilePath.h"
#include "toolkit/KLImageSGI.h"

namespace {

// Out-of-range slots are ignored on Set and told on Get. Constant unless the set count
// equals the size and the values differ exactly.
TEST(KLKeyChannel, SetGetAndConstant) {
    const std::string told = testkit::StdErr([&] {
        KLKeyChannel c("jaw", KLKeyChannel::kRX, 2), u("u", 0, 2);
        for (auto [i, v] : {std::pair{-1, 1.0f}, {2, 1.0f}, {1, 2.5f}, {1, 3.5f}})
            c.Set(i, v);
        EXPECT_TRUE(c.count == 2 && c.Get(1) == 3.5f && c.Get(2) == -10000.0f);
        EXPECT_EQ(c.Constant(), 0) << "slot 0 never set: its zero differs";
        u.Set(0, 1.0f);
        const int partly = u.Constant();
        u.Set(1, std::nextafter(1.0f, 2.0f));
        EXPECT_TRUE(partly == 1 && u.Constant() == 0);
    });
    EXPECT_EQ(told, "KLKeyChannel::Get() out of range\n");
}

class KLKeySetTest : public ModelTest {
  protected:
    KLKeySetTest() { imp.pixDir = dir; }
    // Each key shape as "name frame picture" ("-": none).
    static std::string Shapes(const KLKeySet& s) {
        std::ostringstream out;
        out.precision(10);
        for (const auto& k : s.keyShapes)
            out << k->Name() << " " << k->frame << " " << (k->ImageFile() ? k->ImageFile() : "-")
                << ", ";
        return out.str();
    }
    KLKeySet set{"mouth", nullptr};
};

// Shape names are exact and the first of equal names wins; channels added later are found
// first.
TEST_F(KLKeySetTest, Lookups) {
    ReadText(set, "key rest 0\nkey ah 12\nkey ah 20\nkey oo 12\nend\n");
    EXPECT_EQ((std::vector<int>{set.GetKeyShapeId("ah"), set.GetKeyShapeId("AH"),
                                set.GetKeyShapeId(nullptr)}),
              (std::vector<int>{1, -1, -1}));
    EXPECT_TRUE(!set.GetKeyShape(-1) && !set.GetKeyShapeName(4) && !set.GetKeyShapeImage(4));
    set.AddKeyChannel(std::make_unique<KLKeyChannel>("jaw", 3, 2));
    set.AddKeyChannel(std::make_unique<KLKeyChannel>("jaw", 4, 2));
    KLKeyChannel* later = set.AddKeyChannel(std::make_unique<KLKeyChannel>("jaw", 3, 2));
    EXPECT_EQ(set.GetKeyChannel("jaw", 3), later);
    EXPECT_TRUE(!set.GetKeyChannel("jaw", 5) && !set.GetKeyChannel("lip", 3));
}

// Only 3- or 4-word "key" lines count, silently, up to "end"; a new read replaces the shapes.
// The default is the last shape at the rest frame (kind 1); kind 2 keeps its default.
TEST_F(KLKeySetTest, ReadStatementsAndDefault) {
    imp.restFrame = 5.0f;
    ReadText(set, "key x 1\nkey y 2\n");
    std::istringstream in(
        "# a comment\nkey short\nkey a 5 pic.sgi extra\nkeys b 5\n\nkey c 5\nshape d 4\n"
        "key e 6\nkey f 5\nkey g 7\nend here\nkey after 5\n");
    EXPECT_EQ(testkit::StdErr([&] { set.Read(in); }), "");
    EXPECT_EQ(Shapes(set), "c 5 -, e 6 -, f 5 -, g 7 -, ");
    EXPECT_EQ(set.GetDefaultKeyShape(), set.keyShapes[2].get());
    EXPECT_EQ(std::string(std::istreambuf_iterator<char>(in), {}), "key after 5\n");
    ReadText(set, "end\n");
    EXPECT_TRUE(set.keyShapeCount == 0 && set.GetDefaultKeyShape() == nullptr);
    KLKeySet two("two", "node", 0, 0, 1);
    two.defaultIndex = 1;
    ReadText(two, "key a 5\nkey b 6\nkey c 5\n");
    EXPECT_EQ(two.defaultIndex, 1);
}

// A picture is kept when readable (relative names below the picture directory); frames are
// whole numbers, except for kind 2 without a readable picture. Huge frames saturate.
TEST_F(KLKeySetTest, ReadPicturesAndFrames) {
    ASSERT_TRUE(KLImageSGI(32, 24).Store(File("p.sgi").c_str()));
    const std::string block =
        "key a 12.75 p.sgi\nkey b 12.75 nope.sgi\nkey c 12.75 " + File("p.sgi") + "\nkey d 12.75\n";
    KLKeySet two("two", "node", 0, 0, 1);
    ReadText(set, block);
    ReadText(two, block);
    const std::string p = File("p.sgi");
    EXPECT_EQ(Shapes(set), "a 12 p.sgi, b 12 -, c 12 " + p + ", d 12 -, ");
    EXPECT_EQ(Shapes(two), "a 12 p.sgi, b 12.75 -, c 12 " + p + ", d 12.75 -, ");
    EXPECT_EQ(set.imagesOnFile, 0) << "a picture missing";
    ReadText(set,
             "key \"\" \"\"\nkey x 99999999999999999999\nkey y -99999999999999999999\nkey w -7\n");
    EXPECT_EQ(Shapes(set), " 0 -, x 2147483648 -, y -2147483648 -, w -7 -, ");
    EXPECT_NE(Written(set).find("key x 2147483648 mouth.2147483647.sgi"), std::string::npos);
}

// Golden blocks read back and written again to the same text: picture names are kept while
// every picture read is on file, else each picture is stored (160 x 121) as keyset.frame.sgi.
TEST_F(KLKeySetTest, WriteGoldenAndReadBack) {
    for (const char* p : {"a.sgi", "b c.sgi"})
        ASSERT_TRUE(KLImageSGI(32, 24).Store(File(p).c_str()));
    const auto check = [&](KLKeySet& s, const char* input, const char* golden) {
        ReadText(s, input);
        EXPECT_EQ(Written(s), golden);
        KLKeySet again("mouth", nullptr);
        ReadText(again, golden);
        EXPECT_EQ(again.keyShapeCount, s.keyShapeCount);
        EXPECT_EQ(Written(again), golden);
    };
    check(set, "key a 0 a.sgi\n  key \"wide open\" 12 \"b c.sgi\"\nend\n",
          "    key a 0 a.sgi\n    key \"wide open\" 12 \"b c.sgi\"\n");
    EXPECT_FALSE(KLFilePath::Exists(File("mouth.0000.sgi").c_str()));
    check(set, "key a 3 a.sgi\nkey \"b\tc\" 12\n",
          "    key a 3 mouth.0003.sgi\n    key \"b\tc\" 12 mouth.0012.sgi\n");
    EXPECT_TRUE(KLFilePath::Exists(File("mouth.0003.sgi").c_str()));
    EXPECT_FALSE(KLFilePath::Exists(File("mouth.0012.sgi").c_str())) << "no picture to store";
    set.keyShapes[1]->SetImage(new KLImageSGI(300, 200));  // made in the program
    Written(set);
    auto stored = KLImageSGI::Load(File("mouth.0012.sgi").c_str());
    EXPECT_TRUE(stored && stored->Width() == 160 && stored->Height() == 121);
}

// A picture made in the program stands before the one on file (loaded once, scaled to
// 160 x 121) until it is cleared.
TEST_F(KLKeySetTest, ProgramPictureStandsBeforeTheFilePicture) {
    ASSERT_TRUE(KLImageSGI(32, 24).Store(File("p.sgi").c_str()));
    KLKey key(3, "a", "p.sgi");
    KLImageSGI* onFile = key.GetImage();
    ASSERT_TRUE(onFile && onFile->Width() == 160 && onFile->Height() == 121);
    EXPECT_EQ(key.GetImage(), onFile) << "loaded once";
    key.SetImage(new KLImageSGI(300, 200));
    EXPECT_NE(key.GetImage(), onFile);
    key.ClearImage();
    EXPECT_EQ(key.GetImage(), onFile);
}

// Only channels that change are kept and told; from a node: it and its later siblings. Two
// nodes of one name fill each slot twice: the channel is incompletely filled and dropped.
TEST_F(KLKeySetTest, ExtractKeys) {
    OpenFace();
    const auto animate = [&](const char* node, int channel, std::vector<float> values) {
        const CueTime at[] = {Frames(0), Frames(15), Frames(30)};
        const int linear[] = {1, 1, 1};
        ASSERT_TRUE(KLWire::StoreChannel(Node(node), channel, 3, at, values.data(), linear, nullptr,
                                         linear, nullptr));
    };
    animate("jaw", KLKeyChannel::kTY, {7, 7, 7});
    animate("jaw", KLKeyChannel::kRX, {0, 10, 20});
    animate("lip", KLKeyChannel::kTX, {0, 1, 0});
    animate("lip#2", KLKeyChannel::kTX, {5, 5, 6});
    KLKeySet mouth("mouth", "face.gltf"), fromLip("mouth", "face.gltf");
    for (KLKeySet* s : {&mouth, &fromLip, &set})
        ReadText(*s, "key rest 0\nkey open 15\nkey wide 30\n");
    ReportCapture reports;
    mouth.ExtractKeys(root.get());
    mouth.ExtractKeys(nullptr);
    std::sort(reports.messages.begin(), reports.messages.end());
    EXPECT_EQ(reports.messages,
              (std::vector<std::string>{"Key Channel [jaw.RX].\n", "Key Channel [lip#2.TX].\n",
                                        "Key Channel [lip.TX].\n"}));
    const KLKeyChannel *lip = mouth.GetKeyChannel("lip", 0), *rx = mouth.GetKeyChannel("jaw", 3);
    ASSERT_TRUE(mouth.keyChannels.size() == 3 && lip && rx);
    EXPECT_TRUE(lip->Get(0) == 0.0f && lip->Get(1) == 1.0f && lip->Get(2) == 0.0f);
    EXPECT_NEAR(rx->Get(1), 10.0f, 1e-4);
    fromLip.ExtractKeys(Node("lip"));
    EXPECT_TRUE(fromLip.keyChannels.size() == 2 && fromLip.GetKeyChannel("lip#2", 0));
    for (int i = 0; i < 6; ++i)
        set.extract_dag(Frames(15 * (i / 2)), i / 2, Node("lip"));
    EXPECT_EQ(set.GetKeyChannel("lip", KLKeyChannel::kTX)->count, 6);
    set.ExtractKeys(Node("other"));
    EXPECT_TRUE(set.keyChannels.empty());
}

}  // namespace
