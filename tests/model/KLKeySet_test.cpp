#include "model/KLKeySet.h"

#include <gtest/gtest.h>

#include <sstream>

#include "model/ModelTestUtil.h"
#include "toolkit/CueRecognizer.h"
#include "toolkit/KLFilePath.h"
#include "toolkit/KLImageSGI.h"

namespace {

class NamedRecognizer : public CueRecognizer {
  public:
    explicit NamedRecognizer(const char* name) : CueRecognizer(name) {}
    bool Recognize(const CueSound&) override { return false; }
    CueRecognizer* Clone() const override { return new NamedRecognizer(Name()); }
};

class KLKeySetTest : public ::testing::Test {
  protected:
    void SetUp() override {
        const auto* info = ::testing::UnitTest::GetInstance()->current_test_info();
        dir = std::make_unique<TempDir>(std::string("keyset_") + info->name());
        imp.pixDir = dir->Path();
    }
    // A picture file of w x h pixels in the picture directory.
    void MakePicture(const std::string& name, int w = 32, int h = 24) {
        KLImageSGI picture(w, h);
        ASSERT_TRUE(picture.Store(dir->File(name).c_str()));
    }
    static std::string Written(KLKeySet& set) {
        std::ostringstream out;
        set.Write(out);
        return out.str();
    }

    RecordingImp imp;
    std::unique_ptr<TempDir> dir;
};

TEST_F(KLKeySetTest, ConstructorsAndMessages) {
    KLKeySet one("mouth", "face.gltf");
    EXPECT_EQ(one.kind, 1);
    EXPECT_EQ(*one.sourceFile, "face.gltf");
    EXPECT_FALSE(one.nodeName);
    EXPECT_EQ(one.imagesOnFile, 1);
    EXPECT_EQ(one.imagesChanged, 0);
    EXPECT_EQ(one.defaultIndex, 0);
    EXPECT_EQ(one.GetDefaultKeyShape(), nullptr) << "no key shapes yet";

    KLKeySet two("brow", "browNode", 4, -1.5f, 2.5f);
    EXPECT_EQ(two.kind, 2);
    EXPECT_FALSE(two.sourceFile);
    EXPECT_EQ(*two.nodeName, "browNode");
    EXPECT_EQ(two.channelIndex, 4);
    EXPECT_EQ(two.lowValue, -1.5f);
    EXPECT_EQ(two.highValue, 2.5f);

    CerrCapture err;
    KLKeySet unnamed(nullptr, "x");
    KLKeySet unnamed2(nullptr, "n", 0, 0, 0);
    KLKey key(1.0f, nullptr, nullptr);
    EXPECT_EQ(err.Text(),
              "KLKeySet::KLKeySet() no keyset name given\n"
              "KLKeySet::KLKeySet() no keyset name given\nKLKey::KLKey() name is 0\n");
}

TEST_F(KLKeySetTest, LookupsAreExactAndFirstWins) {
    KLKeySet set("mouth", nullptr);
    std::istringstream in("key rest 0\nkey ah 12\nkey ah 20\nkey oo 12\nend\n");
    set.Read(in);
    ASSERT_EQ(set.keyShapeCount, 4);
    for (int i = 0; i < 4; ++i)
        EXPECT_EQ(set.keyShapes[i]->index, i);
    EXPECT_EQ(set.GetKeyShapeIdx(12.0f), 1);
    EXPECT_EQ(set.GetKeyShapeIdx(12.5f), -1);
    EXPECT_EQ(set.GetKeyShapeId("ah"), 1);
    EXPECT_EQ(set.GetKeyShapeId("AH"), -1);
    EXPECT_EQ(set.GetKeyShapeId(nullptr), -1);
    EXPECT_EQ(set.GetKeyShapeFrame(2), 20.0f);
    EXPECT_EQ(set.GetKeyShapeFrame(4), -1.0f);
    EXPECT_STREQ(set.GetKeyShapeName(3), "oo");
    EXPECT_EQ(set.GetKeyShape(-1), nullptr);
    EXPECT_EQ(set.GetKeyShape(4), nullptr);
    EXPECT_EQ(set.GetKeyShapeName(4), nullptr);
    EXPECT_EQ(set.GetKeyShapeImage(4), nullptr);
    EXPECT_EQ(set.GetKeyShapeIcon(-1), nullptr);
    EXPECT_EQ(set.GetDefaultKeyShape(), set.keyShapes[0].get());
}

TEST_F(KLKeySetTest, LaterAddedChannelsAndRecognizersAreFoundFirst) {
    KLKeySet set("mouth", nullptr);
    auto* first = new KLKeyChannel("jaw", 3, 2);
    auto* second = new KLKeyChannel("jaw", 3, 2);
    set.AddKeyChannel(first);
    set.AddKeyChannel(new KLKeyChannel("jaw", 4, 2));
    set.AddKeyChannel(second);
    EXPECT_EQ(set.GetKeyChannel("jaw", 3), second);
    EXPECT_EQ(set.GetKeyChannel("jaw", 5), nullptr);
    EXPECT_EQ(set.GetKeyChannel("lip", 3), nullptr);

    auto* r1 = new NamedRecognizer("phoneme");
    auto* r2 = new NamedRecognizer("phoneme");
    set.AddRecognizer(r1);
    set.AddRecognizer(new NamedRecognizer("loudness"));
    set.AddRecognizer(r2);
    EXPECT_EQ(set.GetRecognizer("phoneme"), r2);
    EXPECT_STREQ(set.GetRecognizer("loudness")->Name(), "loudness");
    EXPECT_EQ(set.GetRecognizer("other"), nullptr);
}

TEST_F(KLKeySetTest, ReadSkipsOtherShapesSilently) {
    MakePicture("pic.sgi");
    KLKeySet set("mouth", nullptr);
    std::istringstream in(
        "# a comment\n"
        "key short\n"
        "key a 1 pic.sgi extra\n"
        "keys b 2\n"
        "\n"
        "key c 3\n"
        "shape d 4\n"
        "end here\n"
        "key after 5\n");
    CerrCapture err;
    set.Read(in);
    EXPECT_EQ(err.Text(), "");
    ASSERT_EQ(set.keyShapeCount, 1);
    EXPECT_STREQ(set.GetKeyShapeName(0), "c");
    std::string rest;
    std::getline(in, rest);
    EXPECT_EQ(rest, "key after 5") << "the block stops at its end line";
}

TEST_F(KLKeySetTest, ReadReplacesShapesAndTracksPictures) {
    MakePicture("open.sgi");
    KLKeySet set("mouth", nullptr);
    std::istringstream first("key x 1\nkey y 2\nend\n");
    set.Read(first);
    ASSERT_EQ(set.keyShapeCount, 2);

    set.imagesOnFile = 1;
    std::istringstream second("key open 7 open.sgi\nend\n");
    set.Read(second);
    ASSERT_EQ(set.keyShapeCount, 1);
    EXPECT_STREQ(set.keyShapes[0]->ImageFile(), "open.sgi") << "kept as written";
    EXPECT_EQ(set.imagesOnFile, 1);

    std::istringstream third("key open 7 open.sgi\nkey gone 8 missing.sgi\nend\n");
    set.Read(third);
    ASSERT_EQ(set.keyShapeCount, 2);
    EXPECT_EQ(set.keyShapes[1]->ImageFile(), nullptr);
    EXPECT_EQ(set.imagesOnFile, 0);

    std::istringstream empty("end\n");
    set.Read(empty);
    EXPECT_EQ(set.keyShapeCount, 0);
    EXPECT_TRUE(set.keyShapes.empty());
}

TEST_F(KLKeySetTest, AbsolutePicturePathIsNotJoined) {
    MakePicture("abs.sgi");
    imp.pixDir = "/nonexistent-pix";
    KLKeySet set("mouth", nullptr);
    std::istringstream in("key a 1 " + dir->File("abs.sgi") + "\nkey b 2 abs.sgi\n");
    set.Read(in);
    ASSERT_EQ(set.keyShapeCount, 2);
    EXPECT_STREQ(set.keyShapes[0]->ImageFile(), dir->File("abs.sgi").c_str());
    EXPECT_EQ(set.keyShapes[1]->ImageFile(), nullptr);
}

// Kind 1 reads frames as whole numbers; kind 2 takes the number as written unless the
// picture is readable.
TEST_F(KLKeySetTest, FrameNumberAsymmetry) {
    MakePicture("p.sgi");
    const std::string block = "key a 12.75 p.sgi\nkey b 12.75 nope.sgi\nkey c 12.75\nend\n";
    KLKeySet one("one", nullptr);
    std::istringstream in1(block);
    one.Read(in1);
    KLKeySet two("two", "node", 0, 0, 1);
    std::istringstream in2(block);
    two.Read(in2);
    ASSERT_EQ(one.keyShapeCount, 3);
    ASSERT_EQ(two.keyShapeCount, 3);
    EXPECT_EQ(one.keyShapes[0]->frame, 12.0f);
    EXPECT_EQ(one.keyShapes[1]->frame, 12.0f);
    EXPECT_EQ(one.keyShapes[2]->frame, 12.0f);
    EXPECT_EQ(two.keyShapes[0]->frame, 12.0f);
    EXPECT_EQ(two.keyShapes[1]->frame, 12.75f);
    EXPECT_EQ(two.keyShapes[2]->frame, 12.75f);
}

TEST_F(KLKeySetTest, DefaultIndexIsLastShapeAtRestFrame) {
    imp.restFrame = 5.0f;
    KLKeySet one("one", nullptr);
    std::istringstream in("key a 5\nkey b 6\nkey c 5\nkey d 7\n");
    one.Read(in);
    EXPECT_EQ(one.defaultIndex, 2);

    KLKeySet two("two", "node", 0, 0, 1);
    two.defaultIndex = 1;
    std::istringstream in2("key a 5\nkey b 6\nkey c 5\n");
    two.Read(in2);
    EXPECT_EQ(two.defaultIndex, 1) << "kind 2 keeps its default";
}

TEST_F(KLKeySetTest, MalformedInputDoesNotCrash) {
    KLKeySet set("mouth", nullptr);
    std::string garbage(
        "key \"\" \"\"\nkey \"\n\"\"\"\"\nkey x 99999999999999999999\nkey y -1e40\n"
        "key z nan\n");
    for (int i = 0; i < 256; ++i)
        garbage.push_back(char(i * 37));
    garbage += "\nkey w -7\n";
    std::istringstream in(garbage);
    set.Read(in);
    ASSERT_GE(set.keyShapeCount, 4);
    EXPECT_STREQ(set.GetKeyShapeName(0), "");
    EXPECT_EQ(set.GetKeyShapeFrame(1), 2147483647.0f) << "saturated";
    EXPECT_EQ(set.keyShapes.back()->frame, -7.0f);
    std::ostringstream out;
    set.Write(out);  // huge frames name their pictures without overflow
    EXPECT_NE(out.str().find("key x 2147483648 mouth.2147483647.sgi"), std::string::npos)
        << out.str();
}

TEST_F(KLKeySetTest, WriteKeepsPictureNamesWhenAllOnFile) {
    MakePicture("a.sgi");
    MakePicture("b c.sgi");
    KLKeySet set("mouth", nullptr);
    std::istringstream in("key a 0 a.sgi\n    key \"wide open\" 12 \"b c.sgi\"\nend\n");
    set.Read(in);
    ASSERT_EQ(set.imagesOnFile, 1);
    EXPECT_EQ(Written(set), "    key a 0 a.sgi\n    key \"wide open\" 12 \"b c.sgi\"\n");
    EXPECT_FALSE(KLFilePath::Exists(dir->File("mouth.0000.sgi").c_str())) << "nothing stored";
}

TEST_F(KLKeySetTest, WriteNamesGeneratedPicturesAndStoresThem) {
    MakePicture("a.sgi");
    KLKeySet set("mouth", nullptr);
    std::istringstream in("key a 3 a.sgi\nkey \"b\tc\" 12\nend\n");
    set.Read(in);
    ASSERT_EQ(set.imagesOnFile, 0);
    EXPECT_EQ(Written(set), "    key a 3 mouth.0003.sgi\n    key \"b\tc\" 12 mouth.0012.sgi\n");
    // Key a had a readable picture: it is stored anew, at 160 x 121.
    auto stored = KLImageSGI::Load(dir->File("mouth.0003.sgi").c_str());
    ASSERT_TRUE(stored);
    EXPECT_EQ(stored->Width(), 160);
    EXPECT_EQ(stored->Height(), 121);
    EXPECT_FALSE(KLFilePath::Exists(dir->File("mouth.0012.sgi").c_str())) << "no picture to store";
}

TEST_F(KLKeySetTest, KindTwoPicturesAreNumberedByIndex) {
    KLKeySet set("brow", "node", 1, 0, 1);
    std::istringstream in("key up 2.5\nkey down 7.25\n");
    set.Read(in);
    set.keyShapes[1]->SetImage(new KLImageSGI(10, 10));
    set.imagesChanged = 1;
    EXPECT_EQ(Written(set), "    key up 2.5 brow.0000.sgi\n    key down 7.25 brow.0001.sgi\n");
    EXPECT_TRUE(KLFilePath::Exists(dir->File("brow.0001.sgi").c_str()));
}

// Everything Write produces reads back to equal key shapes.
TEST_F(KLKeySetTest, RoundTrip) {
    MakePicture("x y.sgi");
    MakePicture("z.sgi");
    KLKeySet set("mouth", nullptr);
    std::istringstream in("key \"x y\" 1 \"x y.sgi\"\nkey \"tab\there\" 2 z.sgi\nkey q 30 z.sgi\n");
    set.Read(in);
    const std::string text = Written(set);
    KLKeySet again("mouth", nullptr);
    std::istringstream back(text);
    again.Read(back);
    ASSERT_EQ(again.keyShapeCount, set.keyShapeCount);
    for (int i = 0; i < set.keyShapeCount; ++i) {
        EXPECT_EQ(*again.keyShapes[i]->name, *set.keyShapes[i]->name);
        EXPECT_EQ(again.keyShapes[i]->frame, set.keyShapes[i]->frame);
        EXPECT_EQ(*again.keyShapes[i]->imageFile, *set.keyShapes[i]->imageFile);
    }
    EXPECT_EQ(Written(again), text);
}

// A double quote in a name is written as it stands, so the name cannot be read back whole:
// the tokenizer takes the quote as the start of a quoted stretch.
TEST_F(KLKeySetTest, NameWithDoubleQuoteDoesNotRoundTrip) {
    KLKeySet set("mouth", nullptr);
    std::istringstream in("key ok 1\n");
    set.Read(in);
    set.keyShapes[0]->name = "say\"ah";
    set.imagesOnFile = 1;
    set.keyShapes[0]->imageFile = "p.sgi";
    EXPECT_EQ(Written(set), "    key say\"ah 1 p.sgi\n");
}

TEST_F(KLKeySetTest, KeyPictures) {
    MakePicture("face.sgi", 64, 48);
    KLKey none(1.0f, "none", nullptr);
    EXPECT_EQ(none.GetImage(), nullptr);
    EXPECT_EQ(none.GetIcon(), nullptr);

    KLKey missing(1.0f, "missing", "missing.sgi");
    {
        CerrCapture err;
        EXPECT_EQ(missing.GetImage(), nullptr);
        EXPECT_EQ(err.Text(), "KLKey::GetImage() failed to get image\n");
    }

    KLKey onFile(1.0f, "face", "face.sgi");
    KLImageSGI* picture = onFile.GetImage();
    ASSERT_NE(picture, nullptr);
    EXPECT_EQ(picture->Width(), 160);
    EXPECT_EQ(picture->Height(), 121);
    EXPECT_EQ(onFile.GetImage(), picture) << "loaded once";
    KLImageSGI* icon = onFile.GetIcon();
    ASSERT_NE(icon, nullptr);
    EXPECT_EQ(icon->Width(), 80);
    EXPECT_EQ(icon->Height(), 60);
    EXPECT_EQ(onFile.fileIcon.get(), icon);

    // A picture set in the program takes precedence, with its own icon made at once.
    onFile.SetImage(new KLImageSGI(300, 200));
    ASSERT_NE(onFile.icon, nullptr);
    EXPECT_EQ(onFile.GetImage(), onFile.image.get());
    EXPECT_EQ(onFile.GetImage()->Width(), 160);
    EXPECT_EQ(onFile.GetIcon(), onFile.icon.get());
    EXPECT_EQ(onFile.icon->Height(), 60);
    onFile.ClearImage();
    EXPECT_EQ(onFile.GetImage(), picture) << "the file's picture stays";
    EXPECT_EQ(onFile.GetIcon(), icon);

    CerrCapture err;
    onFile.SetImage(nullptr);
    EXPECT_EQ(err.Text(), "KLKey::SetImage() no image on input\n");
    EXPECT_EQ(onFile.GetImage(), picture);
}

}  // namespace
