// Reference image sequences: name parsing, range search, the load dialog and the frame shown
// at a time. Frame N is an image filled with the grey level N, so that each slot can be checked.
#include <gtest/gtest.h>

#include <OpenImageIO/imageio.h>
#include <filesystem>

#include "WorkspaceTestUtil.h"
#include "toolkit/KLImageSGI.h"
#include "workspace/Imp.h"

namespace fs = std::filesystem;
using namespace wstest;

namespace {

// Records what the load dialog shows and answers it with OK, putting back the values set here
// (-1000: leave as shown; "-" as the extension: clear it).
class DialogGhost : public RecordingGhost {
  public:
    int AdjustRelLoad(char** prefix, char** ext, int* start, int* end, int* by,
                      int* zoom) override {
        ++dialogs;
        shown = {*prefix, *ext};
        shownRange = {*start, *end, *by, *zoom};
        for (auto [text, value] :
             {std::pair<char**, std::string>{prefix, newPrefix}, {ext, newExt}})
            if (!value.empty())
                delete[] * text, *text = KLNewString(value == "-" ? "" : value.c_str());
        for (auto [from, to] :
             {std::pair<int, int*>{newStart, start}, {newEnd, end}, {newZoom, zoom}})
            if (from >= -100)
                *to = from;
        return 1;
    }
    int dialogs = 0;
    std::string newPrefix, newExt;
    int newStart = -1000, newEnd = -1000, newZoom = -1000;
    std::vector<std::string> shown;  // prefix, extension
    std::vector<int> shownRange;     // start, end, by, zoom
};

class ReferenceTest : public ::testing::Test {
  protected:
    void SetUp() override { theImp.referenceZoom = 2; }
    void TearDown() override {
        theImp.DeleteReference();
        theImp.DeletePlayblast();
        theImp.referenceZoom = 2;
        CueTime::default_fps = 30;
    }
    // Frames first..last named with `format` (one %d or %0Nd): 8 x 6 PNG pixels of grey N.
    void frames(const char* format, int first, int last) {
        const std::string tmp = dir / "tmp-frame.png";
        for (int n = first; n <= last; ++n) {
            auto out = OIIO::ImageOutput::create(tmp);
            ASSERT_TRUE(out && out->open(tmp, OIIO::ImageSpec(8, 6, 3, OIIO::TypeDesc::UINT8)));
            const std::vector<unsigned char> pixels(8 * 6 * 3, static_cast<unsigned char>(n));
            ASSERT_TRUE(out->write_image(OIIO::TypeDesc::UINT8, pixels.data()));
            out->close();
            const fs::path name = dir / KLFmt(format, n);
            fs::create_directories(name.parent_path());
            fs::rename(tmp, name);
        }
    }
    std::string path(const std::string& name) const { return dir / name; }
    static int grey(const KLImageSGI* image) { return image ? image->Pixels()[0] : -1; }
    static int at(double frames) { return grey(theImp.GetReference(CueTime::FromFrames(frames))); }
    static std::vector<int> reference_greys() {  // -1 for an empty slot
        std::vector<int> out;
        for (int i = 0; i < theImp.referenceCount; ++i)
            out.push_back(grey(theImp.referenceImages[size_t(i)].get()));
        return out;
    }

    ScopedEnv noProject{"TESSEL_PROJECT", nullptr};
    TempDir dir;
    DialogGhost ghost;
    GhostScope scope{&ghost};
};

// Each case in a directory of its own: the frames made, the name given to LoadReference, and
// the prefix, extension and run the dialog shows, loaded as they are.
TEST_F(ReferenceTest, NameFormsFindTheRunAndNameItsParts) {
    const auto finds = [this](const std::string& given, const std::string& prefix, const char* ext,
                              int start, int end) {
        SCOPED_TRACE(given);
        ASSERT_EQ(theImp.LoadReference(path(given).c_str()), 1);
        EXPECT_THAT(ghost.shown, ElementsAre(path(prefix), ext));
        EXPECT_THAT(ghost.shownRange, ElementsAre(start, end, 1, 2));
        ASSERT_EQ(theImp.referenceLoaded, 1);
        std::vector<int> expected;
        for (int n = start; n <= end; ++n)
            expected.push_back(n);
        EXPECT_EQ(reference_greys(), expected);
        EXPECT_EQ(theImp.referenceOffset, CueTime::FromFrames(start));
    };
    frames("a/take.%04d.png", 10, 13), frames("a/take.%d.png", 14, 16);  // padding changes
    finds("a/take.0010.png", "a/take", "png", 10, 13);
    frames("b/take.%d", 10, 12);
    finds("b/take.10", "b/take", "", 10, 12);
    frames("c/take.%03d.png", 7, 8);  // the search goes up from the number given
    finds("c/take.002.png", "c/take", "png", 7, 8);
    frames("d/face.%d.sgi", 0, 2);  // no number given
    finds("d/face.sgi", "d/face", "sgi", 0, 2);
    frames("e/take.%02d.png", 5, 7), frames("e/take.%02d.png", 9, 9);  // a gap
    finds("e/take.05.png", "e/take", "png", 5, 7);
    frames("f/shot.2/face.%d", 0, 1);
    finds("f/shot.2/face", "f/shot.2/face", "", 0, 1);
}

TEST_F(ReferenceTest, TheDialogMayChooseTheRangeOrRename) {
    EXPECT_EQ(theImp.LoadReference(""), 0);
    EXPECT_EQ(theImp.LoadReference(nullptr), 0);
    EXPECT_EQ(ghost.dialogs, 0);
    frames("take.%03d.png", 1, 4);
    frames("alt.%03d", 1, 3);
    ghost.newStart = 3;
    ghost.newEnd = 6;
    ASSERT_EQ(theImp.LoadReference(path("take.001.png").c_str()), 1);
    EXPECT_THAT(reference_greys(), ElementsAre(3, 4, -1, -1)) << "missing frames: empty slots";
    EXPECT_THAT(ghost.Calls("DisplayReferenceOffset("), ElementsAre("DisplayReferenceOffset(600)"));

    ghost.newStart = 5;
    ghost.newEnd = 4;
    EXPECT_EQ(theImp.LoadReference(path("take.001.png").c_str()), 1);
    EXPECT_THAT(reference_greys(), ElementsAre(3, 4, -1, -1)) << "an empty range keeps it";

    ghost.newStart = ghost.newEnd = -1000;
    ghost.newPrefix = path("alt");
    ghost.newExt = "-";
    ASSERT_EQ(theImp.LoadReference(path("take.001.png").c_str()), 1);
    EXPECT_THAT(reference_greys(), ElementsAre(1, 2, 3, -1)) << "the range found, the new names";
}

TEST_F(ReferenceTest, FrameIndexIsWholeFramesFromTheOffsetAtTheWorkspaceRate) {
    frames("take.%04d.png", 10, 13);
    ASSERT_EQ(theImp.LoadReference(path("take.0010.png").c_str()), 1);
    EXPECT_EQ(at(10), 10);
    EXPECT_EQ(at(10.9), 10);
    EXPECT_EQ(at(13.99), 13);
    EXPECT_EQ(at(14), -1);
    EXPECT_EQ(at(9.5), 10);  // -0.5 frames truncates to frame 0
    EXPECT_EQ(at(9), -1);
    EXPECT_EQ(theImp.ReferenceEnd(), CueTime::FromFrames(14));

    CueTime::default_fps = 24;
    theImp.SetReferenceOffset(CueTime::FromFrames(10));
    EXPECT_EQ(grey(theImp.GetReference(CueTime::FromSeconds(0.5))), 12) << "12 frames at 24";
    CueTime::default_fps = 30;

    ghost.calls.clear();
    theImp.DeleteReference();
    EXPECT_THAT(ghost.calls, ElementsAre("DisplayReferenceOffset(0)"));
    EXPECT_EQ(at(10), -1);
}

}  // namespace
