// The error flag and the reference-load dialog of the main window.
#include <gtest/gtest.h>

#include <Xm/TextF.h>
#include <Xm/Xm.h>

#include <string>

#include "guitest/AnswerScript.h"
#include "guitest/GuiTest.h"
#include "testkit/TempDir.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLString.h"
#include "toolkit/xm/KLImageView.h"
#include "window/Gnome.h"
#include "window/WindowTestUtil.h"
#include "workspace/Imp.h"

namespace {

class InfoTest : public ::testing::Test {
  protected:
    void SetUp() override { gnome = &windowtest::TheWindow(); }
    Gnome* gnome = nullptr;
};

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
