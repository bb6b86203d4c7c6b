// Reference and playblast image sequences: name parsing, range search, the load dialog, zoom
// sizes and the frame shown at a time. The image files are generated in a temporary
// directory: frame N is filled with the grey level N so that each slot can be checked.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <OpenImageIO/imageio.h>
#include <filesystem>

#include "WorkspaceTestUtil.h"
#include "toolkit/CuePrefs.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLImageSGI.h"
#include "toolkit/KLString.h"
#include "workspace/Ghost.h"
#include "workspace/Imp.h"

namespace fs = std::filesystem;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

namespace {

// Records the dialog's arguments and answers it as told.
class DialogGhost : public wstest::RecordingGhost {
  public:
    int AdjustRelLoad(char** prefix, char** ext, int* start, int* end, int* by,
                      int* zoom) override {
        ++dialogs;
        shownPrefix = *prefix;
        shownExt = *ext;
        shownStart = *start, shownEnd = *end, shownBy = *by, shownZoom = *zoom;
        // The strings are new[] arrays that the dialog may replace.
        if (!newPrefix.empty())
            replace(prefix, newPrefix);
        if (!newExt.empty())
            replace(ext, newExt == "-" ? "" : newExt);
        if (newStart >= -100)
            *start = newStart;
        if (newEnd >= -100)
            *end = newEnd;
        if (newZoom >= -100)
            *zoom = newZoom;
        return answer;
    }
    // What the dialog does: its answer and the values it puts back (-1000: leave as shown;
    // "-" as the extension: clear it).
    int answer = 1;
    std::string newPrefix, newExt;
    int newStart = -1000, newEnd = -1000, newZoom = -1000;

    int dialogs = 0;
    std::string shownPrefix, shownExt;
    int shownStart = 0, shownEnd = 0, shownBy = 0, shownZoom = 0;

  private:
    static void replace(char** text, const std::string& value) {
        char* old = *text;
        delete[] old;
        *text = KLNewString(value.c_str());
    }
};

void collect_status(const char* message, void* data) {
    static_cast<std::vector<std::string>*>(data)->push_back(message);
}

}  // namespace

class ReferenceTest : public ::testing::Test {
  protected:
    void SetUp() override {
        reset_workspace();
        ghost.calls.clear();
        KLErrHandler::SetStatusHook(collect_status, &status);
    }
    void TearDown() override {
        KLErrHandler::SetStatusHook(nullptr, nullptr);
        reset_workspace();
        CueTime::default_fps = 30;
    }
    static void reset_workspace() {
        theImp.DeleteReference();
        theImp.DeletePlayblast();
        theImp.referenceZoom = 2;
    }

    // Writes frame `n` as `name` (in the temporary directory): 8 x 6 pixels of grey level n.
    // The file is written as PNG under a temporary name and renamed, so that the format does
    // not depend on the name.
    void frame(const std::string& name, int n) {
        const std::string tmp = (dir / "tmp-frame.png").string();
        auto out = OIIO::ImageOutput::create(tmp);
        ASSERT_TRUE(out);
        const OIIO::ImageSpec spec(8, 6, 3, OIIO::TypeDesc::UINT8);
        ASSERT_TRUE(out->open(tmp, spec));
        std::vector<unsigned char> pixels(8 * 6 * 3, static_cast<unsigned char>(n));
        ASSERT_TRUE(out->write_image(OIIO::TypeDesc::UINT8, pixels.data()));
        out->close();
        fs::create_directories((dir / name).parent_path());
        fs::rename(tmp, dir / name);
    }
    // Frames first..last named with `format` (one %d or %0Nd) in the temporary directory.
    void frames(const char* format, int first, int last) {
        for (int n = first; n <= last; ++n)
            frame(KLFmt(format, n), n);
    }
    std::string path(const std::string& name) const { return (dir / name).string(); }

    static int grey(const KLImageSGI* image) { return image ? image->Pixels()[0] : -1; }
    // The grey level of every reference slot (-1 for an empty one).
    static std::vector<int> reference_greys() {
        std::vector<int> out;
        for (int i = 0; i < theImp.referenceCount; ++i)
            out.push_back(grey(theImp.referenceImages[size_t(i)].get()));
        return out;
    }

    wstest::ScopedEnv noProject{"TESSEL_PROJECT", nullptr};
    wstest::TempDir tmp;
    const fs::path dir{tmp.path()};
    DialogGhost ghost;
    wstest::GhostScope scope{&ghost};
    std::vector<std::string> status;
};

// --- name forms

struct NameCase {
    const char* label;
    std::vector<const char*> files;  // printf formats of the files present
    std::vector<std::pair<int, int>> ranges;
    const char* given;   // the name given to LoadReference
    const char* prefix;  // expected in the dialog (below the temporary directory)
    const char* ext;
    int start, end;
};

class ReferenceNames : public ReferenceTest, public ::testing::WithParamInterface<NameCase> {};

TEST_P(ReferenceNames, FindsTheRunAndNamesItsParts) {
    const NameCase& c = GetParam();
    for (size_t i = 0; i < c.files.size(); ++i)
        frames(c.files[i], c.ranges[i].first, c.ranges[i].second);
    ASSERT_EQ(theImp.LoadReference(path(c.given).c_str()), 1);
    EXPECT_EQ(ghost.shownPrefix, path(c.prefix));
    EXPECT_EQ(ghost.shownExt, c.ext);
    EXPECT_EQ(ghost.shownStart, c.start);
    EXPECT_EQ(ghost.shownEnd, c.end);
    EXPECT_EQ(ghost.shownBy, 1);
    EXPECT_EQ(ghost.shownZoom, 2);
    ASSERT_EQ(theImp.referenceLoaded, 1);
    ASSERT_EQ(theImp.referenceCount, c.end - c.start + 1);
    for (int i = 0; i < theImp.referenceCount; ++i)
        EXPECT_EQ(grey(theImp.referenceImages[size_t(i)].get()), c.start + i) << "slot " << i;
    EXPECT_EQ(theImp.referenceOffset, CueTime::FromFrames(c.start));
    EXPECT_THAT(ghost.Calls("Inform("), IsEmpty());
}

INSTANTIATE_TEST_SUITE_P(
    Forms, ReferenceNames,
    ::testing::Values(
        NameCase{"PaddedWithExtension",
                 {"take.%04d.png", "take.%d.png"},
                 {{10, 13}, {14, 16}},
                 "take.0010.png",
                 "take",
                 "png",
                 10,
                 13},
        NameCase{
            "UnpaddedWithoutExtension", {"take.%d"}, {{10, 12}}, "take.10", "take", "", 10, 12},
        NameCase{"SearchStartsAtTheNumberGiven", {"take.%d"}, {{3, 5}}, "take.4", "take", "", 4, 5},
        NameCase{"SearchGoesUpFromAMissingNumber",
                 {"take.%03d.png"},
                 {{7, 8}},
                 "take.002.png",
                 "take",
                 "png",
                 7,
                 8},
        NameCase{"ZeroMeansNoPadding",
                 {"clip.%d.png", "clip.%02d.png"},
                 {{3, 4}, {5, 5}},
                 "clip.0.png",
                 "clip",
                 "png",
                 3,
                 4},
        NameCase{
            "NoNumberStartsAtZero", {"face.%d.sgi"}, {{0, 2}}, "face.sgi", "face", "sgi", 0, 2},
        NameCase{"EmptyNumberCountsAsDigits", {"face.%d"}, {{0, 1}}, "face.", "face", "", 0, 1},
        NameCase{"StopsAtTheFirstGap",
                 {"take.%02d.png"},
                 {{5, 7}, {9, 9}},
                 "take.05.png",
                 "take",
                 "png",
                 5,
                 7},
        NameCase{"LongPadding", {"take.%012d"}, {{1, 2}}, "take.000000000001", "take", "", 1, 2},
        NameCase{"PointsInTheDirectoryDoNotCount",
                 {"shot.2/face.%d"},
                 {{0, 1}},
                 "shot.2/face",
                 "shot.2/face",
                 "",
                 0,
                 1}),
    [](const auto& info) { return std::string(info.param.label); });

// --- messages, the dialog and the limits

TEST_F(ReferenceTest, StatusReportsTheSearchAndEveryFrame) {
    frames("take.%04d.png", 10, 11);
    ASSERT_EQ(theImp.LoadReference(path("take.0010.png").c_str()), 1);
    EXPECT_THAT(status,
                ElementsAre("Computing available frame range...",
                            "Loading [" + path("take.0010.png") + "] from [10] to [11] ...",
                            "Loading [" + path("take.0011.png") + "] from [10] to [11] ..."));
}

TEST_F(ReferenceTest, NoFramesGivesTheFailureDialog) {
    frames("other.%d.png", 0, 2);
    theImp.referenceLoaded = 1;  // a sequence held before is no longer taken as loaded
    EXPECT_EQ(theImp.LoadReference(path("take.0010.png").c_str()), 0);
    EXPECT_THAT(ghost.Calls("Inform("),
                ElementsAre("Inform(Failed to find any reference frames.|Dismiss)"));
    EXPECT_EQ(theImp.referenceLoaded, 0);
    EXPECT_EQ(ghost.dialogs, 0);
}

TEST_F(ReferenceTest, EmptyNameDoesNothing) {
    EXPECT_EQ(theImp.LoadReference(""), 0);
    EXPECT_EQ(theImp.LoadReference(nullptr), 0);
    EXPECT_THAT(status, IsEmpty());
    EXPECT_THAT(ghost.Calls("Inform("), IsEmpty());
}

TEST_F(ReferenceTest, FrameLimitIsNeverUsed) {
    frames("take.%d", 9997, 9999);
    ASSERT_EQ(theImp.LoadReference(path("take.9997").c_str()), 1);
    EXPECT_EQ(ghost.shownEnd, 9998);
    EXPECT_EQ(theImp.LoadReference(path("take.9999").c_str()), 0);
    EXPECT_THAT(ghost.Calls("Inform("),
                ElementsAre("Inform(Failed to find any reference frames.|Dismiss)"));
}

TEST_F(ReferenceTest, RelativeNameIsTakenUnderThePictureDirectory) {
    fs::create_directories(dir / "pix");
    frames("pix/take.%d.png", 1, 2);
    {
        wstest::ScopedEnv project("TESSEL_PROJECT", dir.c_str());
        EXPECT_EQ(theImp.LoadReference("take.1.png"), 1);
    }
    EXPECT_EQ(ghost.shownPrefix, path("pix/take"));
    EXPECT_EQ(theImp.referenceCount, 2);
}

TEST_F(ReferenceTest, CancelLoadsNothing) {
    frames("take.%d", 1, 3);
    ghost.answer = 0;
    ghost.newZoom = 1;
    EXPECT_EQ(theImp.LoadReference(path("take.1").c_str()), 1);
    EXPECT_EQ(ghost.dialogs, 1);
    EXPECT_EQ(theImp.referenceLoaded, 0);
    EXPECT_EQ(theImp.referenceCount, 0);
    EXPECT_EQ(theImp.referenceZoom, 2);
    EXPECT_THAT(ghost.Calls("DisplayReferenceOffset("), IsEmpty());
}

TEST_F(ReferenceTest, DialogChoosesRangeAndMissingFramesLeaveEmptySlots) {
    frames("take.%03d.png", 1, 4);
    ghost.newStart = 3;
    ghost.newEnd = 6;
    ASSERT_EQ(theImp.LoadReference(path("take.001.png").c_str()), 1);
    EXPECT_THAT(reference_greys(), ElementsAre(3, 4, -1, -1));
    EXPECT_THAT(ghost.Calls("DisplayReferenceOffset("), ElementsAre("DisplayReferenceOffset(600)"));
    EXPECT_EQ(theImp.referenceLoaded, 1);
}

TEST_F(ReferenceTest, DialogMayRenameTheSequence) {
    frames("take.%02d.png", 1, 2);
    frames("alt.%02d", 1, 3);
    ghost.newPrefix = path("alt");
    ghost.newExt = "-";
    ASSERT_EQ(theImp.LoadReference(path("take.01.png").c_str()), 1);
    EXPECT_THAT(reference_greys(), ElementsAre(1, 2));  // the range found, the new names
    EXPECT_EQ(theImp.referenceLoaded, 1);
}

TEST_F(ReferenceTest, EmptyRangeFromTheDialogKeepsTheHeldSequence) {
    frames("take.%d", 1, 2);
    ASSERT_EQ(theImp.LoadReference(path("take.1").c_str()), 1);
    ghost.newStart = 5;
    ghost.newEnd = 4;
    EXPECT_EQ(theImp.LoadReference(path("take.1").c_str()), 1);
    EXPECT_THAT(reference_greys(), ElementsAre(1, 2));
}

// --- zoom

struct ZoomCase {
    int zoom, width, height, kept;
};

class ReferenceZoom : public ReferenceTest, public ::testing::WithParamInterface<ZoomCase> {};

TEST_P(ReferenceZoom, ResizesByTheZoomTable) {
    frames("take.%d", 1, 1);
    ghost.newZoom = GetParam().zoom;
    ASSERT_EQ(theImp.LoadReference(path("take.1").c_str()), 1);
    const KLImageSGI* image = theImp.GetReference(CueTime::FromFrames(1));
    ASSERT_TRUE(image);
    EXPECT_EQ(image->Width(), GetParam().width);
    EXPECT_EQ(image->Height(), GetParam().height);
    EXPECT_EQ(theImp.referenceZoom, GetParam().kept);
    EXPECT_EQ(grey(image), 1);
}

INSTANTIATE_TEST_SUITE_P(Levels, ReferenceZoom,
                         ::testing::Values(ZoomCase{1, 320, 242, 1}, ZoomCase{2, 160, 121, 2},
                                           ZoomCase{3, 106, 80, 3}, ZoomCase{4, 80, 60, 4},
                                           ZoomCase{7, 80, 60, 4}, ZoomCase{0, 80, 60, 4},
                                           ZoomCase{-2, 80, 60, 4}));

// --- lookup by time, end, delete

class ReferenceLoaded : public ReferenceTest {
  protected:
    void SetUp() override {
        ReferenceTest::SetUp();
        frames("take.%04d.png", 10, 13);
        ASSERT_EQ(theImp.LoadReference(path("take.0010.png").c_str()), 1);
    }
    static int at(double frames) { return grey(theImp.GetReference(CueTime::FromFrames(frames))); }
};

TEST_F(ReferenceLoaded, FrameIndexIsWholeFramesFromTheOffsetTruncatedTowardZero) {
    EXPECT_EQ(at(10), 10);
    EXPECT_EQ(at(10.9), 10);
    EXPECT_EQ(at(11), 11);
    EXPECT_EQ(at(13.99), 13);
    EXPECT_EQ(at(14), -1);
    EXPECT_EQ(at(9.5), 10);  // -0.5 frames truncates to frame 0
    EXPECT_EQ(at(9), -1);
    EXPECT_EQ(at(-500), -1);
    EXPECT_EQ(theImp.ReferenceEnd(), CueTime::FromFrames(14));
    EXPECT_EQ(theImp.GetPlayblast(CueTime::FromFrames(10)), nullptr);
}

TEST_F(ReferenceLoaded, LookupFollowsTheWorkspaceRate) {
    CueTime::default_fps = 24;
    const CueTime t = CueTime::FromSeconds(0.5);  // 12 frames at 24 fps after frame 0
    theImp.SetReferenceOffset(CueTime());
    EXPECT_EQ(grey(theImp.GetReference(t)), -1);
    theImp.SetReferenceOffset(CueTime::FromFrames(10));
    EXPECT_EQ(grey(theImp.GetReference(t)), 12);
}

TEST_F(ReferenceLoaded, DeleteResetsOffsetAndForgetsTheImages) {
    ghost.calls.clear();
    theImp.DeleteReference();
    EXPECT_THAT(ghost.Calls("DisplayReferenceOffset("), ElementsAre("DisplayReferenceOffset(0)"));
    EXPECT_EQ(theImp.referenceLoaded, 0);
    EXPECT_EQ(theImp.referenceImages, nullptr);
    EXPECT_EQ(at(0), -1);
    EXPECT_EQ(at(10), -1);
    EXPECT_EQ(theImp.ReferenceEnd(), CueTime());
    theImp.DeleteReference();  // nothing held: harmless
    EXPECT_EQ(theImp.referenceLoaded, 0);
}

// --- playblast

TEST_F(ReferenceTest, PlayblastLoadsIntoItsOwnSequence) {
    frames("blast.%d.png", 5, 7);
    ghost.newZoom = 3;
    ASSERT_EQ(theImp.LoadPlayblast(path("blast.5.png").c_str()), 1);
    EXPECT_EQ(theImp.playblastLoaded, 1);
    EXPECT_EQ(theImp.playblastCount, 3);
    EXPECT_EQ(theImp.playblastOffset, CueTime::FromFrames(5));
    EXPECT_EQ(theImp.referenceLoaded, 0);
    EXPECT_THAT(ghost.Calls("DisplayReferenceOffset("),
                IsEmpty());              // the playblast offset is not displayed
    EXPECT_EQ(theImp.referenceZoom, 3);  // one zoom level for both sequences
    EXPECT_EQ(grey(theImp.GetPlayblast(CueTime::FromFrames(6.5))), 6);
    EXPECT_EQ(theImp.GetPlayblast(CueTime::FromFrames(8)), nullptr);
    EXPECT_EQ(theImp.GetReference(CueTime::FromFrames(6)), nullptr);
    EXPECT_EQ(theImp.PlayblastEnd(), CueTime::FromFrames(8));
    EXPECT_EQ(theImp.GetPlayblast(CueTime::FromFrames(6))->Width(), 106);

    theImp.DeletePlayblast();
    EXPECT_EQ(theImp.playblastLoaded, 0);
    EXPECT_EQ(theImp.playblastOffset, CueTime());
    EXPECT_EQ(theImp.GetPlayblast(CueTime::FromFrames(6)), nullptr);
}

TEST_F(ReferenceTest, PlayblastWithoutFramesSaysSo) {
    EXPECT_EQ(theImp.LoadPlayblast(path("blast.1.png").c_str()), 0);
    EXPECT_THAT(ghost.Calls("Inform("),
                ElementsAre("Inform(Failed to find any playblast frames.|Dismiss)"));
    EXPECT_EQ(theImp.playblastLoaded, 0);
}
