// Reference and playblast image sequences: name parsing, range search, the load dialog, zoom
// sizes and the frame shown at a time. Frame N is generated filled with the grey level N, so
// that each slot can be checked.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <OpenImageIO/imageio.h>
#include <cstdio>
#include <filesystem>
#include <sstream>

#include "WorkspaceTestUtil.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLImageSGI.h"
#include "toolkit/KLString.h"
#include "workspace/Imp.h"

namespace fs = std::filesystem;
using namespace wstest;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

namespace {

// Records the dialog's arguments and answers it as told: its answer and the values it puts
// back (-1000: leave as shown; "-" as the extension: clear it).
class DialogGhost : public RecordingGhost {
  public:
    int AdjustRelLoad(char** prefix, char** ext, int* start, int* end, int* by,
                      int* zoom) override {
        ++dialogs;
        shownPrefix = *prefix, shownExt = *ext;
        shownStart = *start, shownEnd = *end, shownBy = *by, shownZoom = *zoom;
        // The strings are new[] arrays that the dialog may replace.
        auto replace = [](char** text, const std::string& value) {
            delete[] * text;
            *text = KLNewString(value.c_str());
        };
        if (!newPrefix.empty())
            replace(prefix, newPrefix);
        if (!newExt.empty())
            replace(ext, newExt == "-" ? "" : newExt);
        for (auto [from, to] :
             {std::pair<int, int*>{newStart, start}, {newEnd, end}, {newZoom, zoom}})
            if (from >= -100)
                *to = from;
        return answer;
    }
    int answer = 1;
    std::string newPrefix, newExt;
    int newStart = -1000, newEnd = -1000, newZoom = -1000;

    int dialogs = 0;
    std::string shownPrefix, shownExt;
    int shownStart = 0, shownEnd = 0, shownBy = 0, shownZoom = 0;
};

void collect_status(const char* message, void* data) {
    static_cast<std::vector<std::string>*>(data)->push_back(message);
}

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
    // Frames first..last named with `format` (one %d or %0Nd) below the temporary directory,
    // 8 x 6 PNG pixels of grey level N each, whatever the name says.
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
    // The grey level of every reference slot (-1 for an empty one).
    static std::vector<int> reference_greys() {
        std::vector<int> out;
        for (int i = 0; i < theImp.referenceCount; ++i)
            out.push_back(grey(theImp.referenceImages[size_t(i)].get()));
        return out;
    }
    std::vector<std::string> Informs() const { return ghost.Calls("Inform("); }

    ScopedEnv noProject{"TESSEL_PROJECT", nullptr};
    TempDir dir;
    DialogGhost ghost;
    GhostScope scope{&ghost};
    std::vector<std::string> status;
};

// --- name forms

struct NameCase {
    const char* label;
    const char* files;   // "FORMAT FIRST LAST" runs, separated by ";"
    const char* given;   // the name given to LoadReference
    const char* prefix;  // expected in the dialog (below the temporary directory)
    const char* ext;
    int start, end;
    friend void PrintTo(const NameCase& c, std::ostream* os) { *os << c.label; }
};
class ReferenceNames : public ReferenceTest, public ::testing::WithParamInterface<NameCase> {};

TEST_P(ReferenceNames, FindsTheRunAndNamesItsParts) {
    const NameCase& c = GetParam();
    std::istringstream runs(c.files);
    for (std::string run; std::getline(runs, run, ';');) {
        char format[64];
        int first = 0, last = 0;
        ASSERT_EQ(std::sscanf(run.c_str(), "%63s %d %d", format, &first, &last), 3);
        frames(format, first, last);
    }
    ASSERT_EQ(theImp.LoadReference(path(c.given).c_str()), 1);
    EXPECT_EQ(ghost.shownPrefix, path(c.prefix));
    EXPECT_EQ(ghost.shownExt, c.ext);
    EXPECT_EQ(ghost.shownStart, c.start);
    EXPECT_EQ(ghost.shownEnd, c.end);
    EXPECT_EQ(ghost.shownBy, 1);
    EXPECT_EQ(ghost.shownZoom, 2);
    ASSERT_EQ(theImp.referenceLoaded, 1);
    std::vector<int> expected;
    for (int n = c.start; n <= c.end; ++n)
        expected.push_back(n);
    EXPECT_EQ(reference_greys(), expected);
    EXPECT_EQ(theImp.referenceOffset, CueTime::FromFrames(c.start));
    EXPECT_THAT(Informs(), IsEmpty());
}

INSTANTIATE_TEST_SUITE_P(
    Forms, ReferenceNames,
    ::testing::Values(
        NameCase{"PaddedWithExtension", "take.%04d.png 10 13;take.%d.png 14 16", "take.0010.png",
                 "take", "png", 10, 13},
        NameCase{"UnpaddedWithoutExtension", "take.%d 10 12", "take.10", "take", "", 10, 12},
        NameCase{"SearchStartsAtTheNumberGiven", "take.%d 3 5", "take.4", "take", "", 4, 5},
        NameCase{"SearchGoesUpFromAMissingNumber", "take.%03d.png 7 8", "take.002.png", "take",
                 "png", 7, 8},
        NameCase{"ZeroMeansNoPadding", "clip.%d.png 3 4;clip.%02d.png 5 5", "clip.0.png", "clip",
                 "png", 3, 4},
        NameCase{"NoNumberStartsAtZero", "face.%d.sgi 0 2", "face.sgi", "face", "sgi", 0, 2},
        NameCase{"EmptyNumberCountsAsDigits", "face.%d 0 1", "face.", "face", "", 0, 1},
        NameCase{"StopsAtTheFirstGap", "take.%02d.png 5 7;take.%02d.png 9 9", "take.05.png", "take",
                 "png", 5, 7},
        NameCase{"LongPadding", "take.%012d 1 2", "take.000000000001", "take", "", 1, 2},
        NameCase{"PointsInTheDirectoryDoNotCount", "shot.2/face.%d 0 1", "shot.2/face",
                 "shot.2/face", "", 0, 1}),
    ByLabel());

// --- messages, the dialog and the limits

TEST_F(ReferenceTest, StatusReportsTheSearchAndEveryFrame) {
    frames("take.%04d.png", 10, 11);
    ASSERT_EQ(theImp.LoadReference(path("take.0010.png").c_str()), 1);
    EXPECT_THAT(status,
                ElementsAre("Computing available frame range...",
                            "Loading [" + path("take.0010.png") + "] from [10] to [11] ...",
                            "Loading [" + path("take.0011.png") + "] from [10] to [11] ..."));
}

TEST_F(ReferenceTest, NoFramesBelowTheLimitGiveTheFailureDialog) {
    EXPECT_EQ(theImp.LoadReference(""), 0);
    EXPECT_EQ(theImp.LoadReference(nullptr), 0);
    EXPECT_THAT(status, IsEmpty()) << "an empty name does nothing";
    EXPECT_THAT(Informs(), IsEmpty());
    frames("take.%d", 9997, 9999);
    ASSERT_EQ(theImp.LoadReference(path("take.9997").c_str()), 1);
    EXPECT_EQ(ghost.shownEnd, 9998) << "frame 9999 is never used";
    EXPECT_EQ(theImp.LoadReference(path("take.9999").c_str()), 0);
    EXPECT_EQ(theImp.referenceLoaded, 0) << "the sequence held before is no longer taken";
    EXPECT_THAT(Informs(), ElementsAre("Inform(Failed to find any reference frames.|Dismiss)"));
    EXPECT_EQ(ghost.dialogs, 1);
}

TEST_F(ReferenceTest, RelativeNameIsTakenUnderThePictureDirectory) {
    frames("pix/take.%d.png", 1, 2);
    {
        ScopedEnv project("TESSEL_PROJECT", dir.path().c_str());
        EXPECT_EQ(theImp.LoadReference("take.1.png"), 1);
    }
    EXPECT_EQ(ghost.shownPrefix, path("pix/take"));
    EXPECT_EQ(theImp.referenceCount, 2);
}

TEST_F(ReferenceTest, TheDialogMayCancelChooseTheRangeOrRename) {
    frames("take.%03d.png", 1, 4);
    frames("alt.%03d", 1, 3);
    ghost.answer = 0;
    ghost.newZoom = 1;
    EXPECT_EQ(theImp.LoadReference(path("take.001.png").c_str()), 1);
    EXPECT_EQ(theImp.referenceLoaded, 0) << "cancelled";
    EXPECT_EQ(theImp.referenceZoom, 2);
    EXPECT_THAT(ghost.Calls("DisplayReferenceOffset("), IsEmpty());

    ghost.answer = 1;
    ghost.newZoom = -1000;
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

// --- zoom

struct ZoomCase {
    int zoom, width, height, kept;
    friend void PrintTo(const ZoomCase& c, std::ostream* os) { *os << "zoom " << c.zoom; }
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
                                           ZoomCase{-2, 80, 60, 4}),
                         [](const auto& info) {
                             const int z = info.param.zoom;
                             return (z < 0 ? "Minus" : "") + std::to_string(z < 0 ? -z : z);
                         });

// --- lookup by time, end, delete

TEST_F(ReferenceTest, FrameIndexIsWholeFramesFromTheOffsetAtTheWorkspaceRate) {
    frames("take.%04d.png", 10, 13);
    ASSERT_EQ(theImp.LoadReference(path("take.0010.png").c_str()), 1);
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

    CueTime::default_fps = 24;
    theImp.SetReferenceOffset(CueTime::FromFrames(10));
    const CueTime t = CueTime::FromSeconds(0.5);  // 12 frames at 24 fps after frame 0
    EXPECT_EQ(grey(theImp.GetReference(t)), 12);
    CueTime::default_fps = 30;

    ghost.calls.clear();
    theImp.DeleteReference();
    EXPECT_THAT(ghost.Calls("DisplayReferenceOffset("), ElementsAre("DisplayReferenceOffset(0)"));
    EXPECT_EQ(theImp.referenceLoaded, 0);
    EXPECT_EQ(theImp.referenceImages, nullptr);
    EXPECT_EQ(at(10), -1);
    EXPECT_EQ(theImp.ReferenceEnd(), CueTime());
    theImp.DeleteReference();  // nothing held: harmless
}

// --- playblast

TEST_F(ReferenceTest, PlayblastLoadsIntoItsOwnSequence) {
    EXPECT_EQ(theImp.LoadPlayblast(path("blast.1.png").c_str()), 0);
    EXPECT_THAT(Informs(), ElementsAre("Inform(Failed to find any playblast frames.|Dismiss)"));
    frames("blast.%d.png", 5, 7);
    ghost.newZoom = 3;
    ghost.calls.clear();
    ASSERT_EQ(theImp.LoadPlayblast(path("blast.5.png").c_str()), 1);
    EXPECT_EQ(theImp.playblastLoaded, 1);
    EXPECT_EQ(theImp.playblastCount, 3);
    EXPECT_EQ(theImp.playblastOffset, CueTime::FromFrames(5));
    EXPECT_EQ(theImp.referenceLoaded, 0);
    EXPECT_THAT(ghost.Calls("DisplayReferenceOffset("), IsEmpty()) << "not displayed";
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

}  // namespace
