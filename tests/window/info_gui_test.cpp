// The information bar, the window's messages and questions, and the error flag.
#include <gtest/gtest.h>

#include <Xm/MessageB.h>
#include <Xm/TextF.h>
#include <Xm/Xm.h>

#include <fstream>
#include <string>
#include <vector>

#include "guitest/AnswerScript.h"
#include "guitest/GuiTest.h"
#include "testkit/TempDir.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLString.h"
#include "toolkit/xm/KLAlert.h"
#include "toolkit/xm/KLImageView.h"
#include "window/Gnome.h"
#include "window/WindowTestUtil.h"
#include "workspace/Imp.h"

namespace {

using windowtest::Label;

class InfoTest : public ::testing::Test {
  protected:
    void SetUp() override { gnome = &windowtest::TheWindow(); }
    // Runs `action`, answering every "Attention" alert it shows with `button`; the last told.
    std::string Answer(const std::function<void()>& action, int button = 0) {
        std::string told = windowtest::AnswerAlerts(gnome->attentionAlert.get(), action, button);
        EXPECT_NE(told, "") << "nothing was told";
        return told;
    }
    Gnome* gnome = nullptr;
};

// The information bar shows time and fractional frame, the duration and the reference offset;
// status reports show in the status line.
TEST_F(InfoTest, InformationBarAndStatusLine) {
    CueTime::default_fps = 30;
    gnome->DisplayTimecode(CueTime::FromTicks(300));  // one and a half frames
    EXPECT_EQ(Label("infoFrameValue"), "1.5");
    EXPECT_EQ(Label("infoTimeValue"), "1.5");
    gnome->DisplayDuration(CueTime::FromTicks(6000 * 5));
    EXPECT_EQ(Label("infoDurationValue"), "150");
    gnome->DisplayReferenceOffset(CueTime::FromTicks(2400));
    EXPECT_EQ(Label("refAdjust"), "Set Reference Time [12]");
    KLStatus("Parsing keyset description.");
    EXPECT_EQ(Label("statusLine"), "Parsing keyset description.");
}

// The version is told with OK; Confirm asks in the window; a file that fails to load is told
// in the window, which goes on.
TEST_F(InfoTest, VersionConfirmAndFailedLoadsAreAskedInTheWindow) {
    EXPECT_EQ(Answer([] { Gnome::version_cb(nullptr, XtPointer(2), nullptr); }),
              "Tessel|Marlin Parlando and Facial Animation Version 2.0 (9704300208)");
    int answer = -1;
    EXPECT_EQ(Answer([&] { answer = gnome->Confirm("Go on?", "Yes", "No"); }, 1), "Go on?");
    EXPECT_EQ(answer, 0);
    testkit::TempDir dir;
    const std::string missing = dir / "missing.track";
    EXPECT_EQ(Answer([&] { answer = theImp.LoadTrack(missing.c_str()); }),
              "Failed to open track file [" + missing + "].");
    EXPECT_EQ(answer, 0);
}

// A logged error makes the flag solid; viewing the log (what the log holds is the workspace's
// business) clears it.
TEST_F(InfoTest, ErrorFlagTurnsSolidOnALoggedErrorAndClearsWhenTheLogIsViewed) {
    testkit::TempDir dir;
    theImp.SetErrorFilename((dir / "errlog.vx").c_str());
    Widget flag = KLXmGnome::FindWidget("errorFlag");
    ASSERT_NE(flag, nullptr);
    Pixel foreground = 0, background = 0, parentBackground = 0;
    XtVaGetValues(flag, XmNforeground, &foreground, nullptr);
    XtVaGetValues(XtParent(flag), XmNbackground, &parentBackground, nullptr);
    KLError("Something went wrong in a test.\n");
    XtVaGetValues(flag, XmNbackground, &background, nullptr);
    EXPECT_EQ(background, foreground);
    guitest::Screenshot("window-error-flag");
    // Viewed with a viewer that does nothing.
    setenv("TESSEL_USER_ERROR_READER", "true", 1);
    Gnome::view_errors_cb(nullptr, nullptr, nullptr);
    unsetenv("TESSEL_USER_ERROR_READER");
    XtVaGetValues(flag, XmNbackground, &background, nullptr);
    EXPECT_EQ(background, parentBackground);
}

TEST_F(InfoTest, AdjustRelLoadFillsTheDialogAndCopiesBackTheAnswer) {
    char* prefix = KLNewString("shots/take.");
    char* ext = KLNewString("png");
    int start = 1, end = 24, by = 1, zoom = 2;
    Widget ok = KLXmGnome::FindWidget("refLoadOk");
    guitest::AnswerScript script({[&] {
        if (!guitest::Viewable(ok))
            return false;
        guitest::Settle();
        XmTextFieldSetString(KLXmGnome::FindWidget("refPrefix"), const_cast<char*>("pix/ref."));
        XmTextFieldSetString(KLXmGnome::FindWidget("refEnd"), const_cast<char*>("48"));
        XmTextFieldSetString(KLXmGnome::FindWidget("refBy"), const_cast<char*>("3"));
        guitest::Screenshot("window-reference-dialog");
        return guitest::ClickWhenViewable(ok);
    }});
    EXPECT_EQ(gnome->AdjustRelLoad(&prefix, &ext, &start, &end, &by, &zoom), 1);
    EXPECT_TRUE(script.Finished());
    EXPECT_STREQ(prefix, "pix/ref.");
    EXPECT_EQ(end, 48);
    EXPECT_EQ(by, 1);
    EXPECT_EQ(zoom, 3);
    EXPECT_EQ(gnome->refImageView->Zoom(), 3);
    delete[] prefix;
    delete[] ext;
}

}  // namespace
