// Apply inside the program: the apply event of the apply dialog and ApplyWire over keysets
// of one name.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>

#include "WorkspaceTestUtil.h"
#include "model/KLEdlEvent.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "scene/KLWireSource.h"
#include "workspace/Imp.h"

using namespace wstest;
using ::testing::ElementsAre;

namespace {

class ApplyTest : public ::testing::Test {
  protected:
    void SetUp() override {
        for (const char* sub : {"misc_data", "wire"})
            std::filesystem::create_directory(dir / sub);
        WriteFile(dir / "wire/face.gltf", FaceSceneJson());
        // Two keysets named "mouth": the first samples the whole face, the second only "lip".
        WriteFile(dir / "misc_data/face.kset",
                  "wire face.gltf\n"
                  "begin keyset mouth\n key rest 0\n key open 10\n key wide 20\nend\n"
                  "begin keyset other\n key rest 0\n key wide 20\nend\n"
                  "begin keyset mouth lip\n key rest 0\n key wide 20\nend\n");
        ResetWorkspace();
        theImp.batchMode = 1;  // two keysets drive lip: no verification dialog
        testing::internal::CaptureStderr();
        ASSERT_EQ(theImp.LoadKeyset((dir / "misc_data/face.kset").c_str()), 1);
        testing::internal::GetCapturedStderr();
        theImp.batchMode = 0;
        ghost.calls.clear();
    }
    void TearDown() override { ResetWorkspace(); }
    void Key(int keyset, double frame, int shape, float value) {
        KLKeySet* set = theImp.GetKeySet(keyset);
        theImp.GetKeyTrack(keyset)->InsertKey(shape, CueTime::FromFrames(frame),
                                              set->GetKeyShape(shape), 1, value);
    }

    TempDir dir;
    ScopedEnv project{"TESSEL_PROJECT", dir.path().c_str()};
    RecordingGhost ghost;
    GhostScope scope{&ghost};
};

TEST_F(ApplyTest, OpenApplyWireMakesAnEventOverTheWholeWorkspace) {
    theImp.SetDuration(CueTime(0, 0, 4, 0, 0));
    ghost.calls.clear();
    theImp.OpenApplyWire((dir / "wire/face.gltf").c_str());
    ASSERT_NE(theImp.applyEvent, nullptr);
    EXPECT_STREQ(theImp.applyEvent->WireFile(), "face.gltf") << "held below the wire directory";
    EXPECT_EQ(theImp.applyEvent->sourceIn, CueTime());
    EXPECT_EQ(theImp.applyEvent->sourceOut.Ticks(), 24000);
    EXPECT_EQ(theImp.applyEvent->destIn, CueTime());
    EXPECT_EQ(theImp.applyEvent->destOut.Ticks(), 24000);
    EXPECT_THAT(ghost.calls, ElementsAre("UpdateApplyDialog(face.gltf)"));
    theImp.OpenApplyWire("/elsewhere/b.gltf");
    EXPECT_STREQ(theImp.applyEvent->WireFile(), "/elsewhere/b.gltf");
}

TEST_F(ApplyTest, EveryKeysetOfTheNameIsAppliedInSlotOrder) {
    Key(0, 0, 0, 1.0f);
    Key(0, 6, 2, 1.0f);  // first "mouth": wide, lip TX 5, jaw TY 2
    Key(2, 6, 1, 0.5f);  // second "mouth": half of wide on lip only, lip TX 2.5
    theImp.OpenApplyWire((dir / "wire/face.gltf").c_str());
    theImp.applyEvent->OpenWire();
    KLWireSource* target = theImp.applyEvent->wire.get();
    ASSERT_TRUE(target && target->Valid());
    EXPECT_EQ(theImp.ApplyWire(target, "mouth", "head", CueTime(), theImp.duration, CueTime()), 1);
    EXPECT_EQ(KLWireSource::Active(), theImp.wireSource.get()) << "the workspace's scene again";
    const std::string out = dir / "wire/out.gltf";
    ASSERT_EQ(theImp.applyEvent->StoreWire(out.c_str()), 1);
    EXPECT_NEAR(*EvalChannel(out, "jaw", 1, 6), 2.0, 1e-4) << "from the first keyset";
    EXPECT_NEAR(*EvalChannel(out, "lip", 0, 6), 2.5, 1e-4) << "the second one wrote last";
}

TEST_F(ApplyTest, TheResultIsThatOfTheLastApply) {
    Key(0, 3, 1, 1.0f);
    theImp.OpenApplyWire((dir / "wire/face.gltf").c_str());
    theImp.applyEvent->OpenWire();
    KLWireSource* target = theImp.applyEvent->wire.get();
    EXPECT_EQ(theImp.ApplyWire(target, "other", "head", CueTime(), theImp.duration, CueTime()), 1);
    EXPECT_EQ(theImp.ApplyWire(target, "nobody", "head", CueTime(), theImp.duration, CueTime()), 0);
    ghost.calls.clear();
    EXPECT_EQ(theImp.ApplyWire(target, "mouth", "nothere", CueTime(), theImp.duration, CueTime()),
              0);
    EXPECT_THAT(ghost.calls,
                ElementsAre("Inform(Cannot find base dag [nothere] for apply ...|Dismiss)",
                            "Inform(Cannot find base dag [nothere] for apply ...|Dismiss)"));
    EXPECT_EQ(theImp.ApplyWire(nullptr, "mouth", "head", CueTime(), theImp.duration, CueTime()), 0);
}

}  // namespace
