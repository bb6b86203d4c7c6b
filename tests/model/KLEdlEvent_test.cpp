#include "model/KLEdlEvent.h"

#include <gtest/gtest.h>

#include <filesystem>

#include "model/ModelTestUtil.h"
#include "scene/KLWire.h"
#include "scene/KLWireSource.h"
#include "scene/OrDagNode.h"
#include "toolkit/KLFilePath.h"

namespace {

class EdlTest : public ::testing::Test {
  protected:
    void SetUp() override {
        const auto* info = ::testing::UnitTest::GetInstance()->current_test_info();
        dir = std::make_unique<TempDir>(std::string("edl_") + info->name());
        imp.wireDir = dir->File("wire");
        std::filesystem::create_directories(imp.wireDir + "/shots");
        SceneBuilder b;
        b.AddNode("jaw", b.AddNode("face"));
        ASSERT_TRUE(b.Write(imp.wireDir + "/shots/a.gltf"));
        ASSERT_TRUE(b.Write(dir->File("outside.gltf")));
    }

    RecordingImp imp;
    std::unique_ptr<TempDir> dir;
};

TEST_F(EdlTest, PathBelowWireDirectoryIsHeldRelative) {
    const CueTime a = CueTime::FromTicks(1), b = CueTime::FromTicks(2), c = CueTime::FromTicks(3),
                  d = CueTime::FromTicks(4);
    KLEdlEvent event((imp.wireDir + "/shots/a.gltf").c_str(), a, b, c, d);
    EXPECT_STREQ(event.WireFile(), "shots/a.gltf");
    EXPECT_EQ(event.sourceIn, a);
    EXPECT_EQ(event.sourceOut, b);
    EXPECT_EQ(event.destIn, c);
    EXPECT_EQ(event.destOut, d);
    EXPECT_EQ(event.wire, nullptr);
    EXPECT_EQ(event.dagList, nullptr);

    event.OpenWire();
    ASSERT_NE(event.wire, nullptr);
    EXPECT_TRUE(event.wire->Valid()) << event.wire->ErrorText();
    EXPECT_EQ(event.wire->Path(), imp.wireDir + "/shots/a.gltf");
    ASSERT_NE(event.dagList, nullptr);
    ASSERT_EQ(event.dagList->nodes.size(), 3u) << "root, face, jaw";
    EXPECT_STREQ(KLWire::NodeName(event.dagList->nodes[2]), "jaw");

    event.CloseWire();
    EXPECT_EQ(event.wire, nullptr);
    EXPECT_NE(event.dagList, nullptr) << "the node list survives closing";
}

TEST_F(EdlTest, AbsolutePathOutsideIsKeptWhole) {
    KLEdlEvent event(dir->File("outside.gltf").c_str(), CueTime(), CueTime(), CueTime(), CueTime());
    EXPECT_EQ(std::string(event.WireFile()), dir->File("outside.gltf"));
    event.OpenWire();
    ASSERT_NE(event.wire, nullptr);
    EXPECT_TRUE(event.wire->Valid());
}

TEST_F(EdlTest, NullFileOpensNothing) {
    KLEdlEvent event(nullptr, CueTime(), CueTime(), CueTime(), CueTime());
    EXPECT_EQ(event.WireFile(), nullptr);
    event.OpenWire();
    EXPECT_EQ(event.wire, nullptr);
    EXPECT_EQ(event.dagList, nullptr);
}

TEST_F(EdlTest, StoreWritesAndCloses) {
    KLEdlEvent event("shots/a.gltf", CueTime(), CueTime(), CueTime(), CueTime());
    const std::string out = dir->File("out.glb");
    EXPECT_EQ(event.StoreWire(out.c_str()), 0);
    EXPECT_FALSE(KLFilePath::Exists(out.c_str())) << "closed: nothing written";

    event.OpenWire();
    EXPECT_EQ(event.StoreWire(out.c_str()), 1);
    EXPECT_EQ(event.wire, nullptr);
    KLWireSource back(out.c_str());
    EXPECT_TRUE(back.Valid()) << back.ErrorText();

    // Reopening replaces the node list.
    event.OpenWire();
    KLDagList* first = event.dagList.get();
    event.OpenWire();
    EXPECT_NE(event.dagList.get(), nullptr);
    EXPECT_NE(event.dagList.get(), first);
}

TEST_F(EdlTest, MissingFileLeavesAnInvalidScene) {
    KLEdlEvent event("shots/none.gltf", CueTime(), CueTime(), CueTime(), CueTime());
    event.OpenWire();
    ASSERT_NE(event.wire, nullptr);
    EXPECT_FALSE(event.wire->Valid());
    EXPECT_EQ(event.dagList, nullptr);
    CerrCapture err;
    EXPECT_EQ(event.StoreWire(dir->File("x.gltf").c_str()), 0);
    EXPECT_FALSE(KLFilePath::Exists(dir->File("x.gltf").c_str()));
}

TEST_F(EdlTest, DeleteEventFreesNameAndExtra) {
    KLEdlEvent event("shots/a.gltf", CueTime(), CueTime(), CueTime(), CueTime());
    event.extra = std::make_shared<int>(5);
    event.OpenWire();
    KLEdlEvent::DeleteEvent(&event);
    EXPECT_EQ(event.WireFile(), nullptr);
    EXPECT_EQ(event.extra, nullptr);
    EXPECT_NE(event.wire, nullptr) << "the open scene is not closed";
}

}  // namespace
