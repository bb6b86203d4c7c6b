// The reference-load dialog on the rows of the main window's table that hold it.
#include <gtest/gtest.h>

#include <Xm/Form.h>
#include <Xm/Label.h>
#include <Xm/PushB.h>
#include <Xm/Separator.h>
#include <Xm/TextF.h>
#include <Xm/Xm.h>

#include <functional>
#include <string>

#include "dialogs/RefLoadDialog.h"
#include "guitest/GuiTest.h"
#include "toolkit/xm/KLXmGnome.h"

namespace {

// The dialog's rows, as the main window's table has them.
const KLWidgetSpec kRows[] = {
    {"-", "refDialog", XmCreateFormDialog},       {".+", "refPrefixBox", XmCreateForm},
    {"..+", "refExt", XmCreateTextField},         {"..+", "refExtLabel", XmCreateLabel},
    {"..+", "refPrefixLabel", XmCreateLabel},     {"..+", "refPrefix", XmCreateTextField},
    {".+", "refRangeBox", XmCreateForm},          {"..+", "refStartLabel", XmCreateLabel},
    {"..+", "refStart", XmCreateTextField},       {"..+", "refEndLabel", XmCreateLabel},
    {"..+", "refEnd", XmCreateTextField},         {"..+", "refByLabel", XmCreateLabel},
    {"..+", "refBy", XmCreateTextField},          {".+", "refSep", XmCreateSeparator},
    {".+", "refButtonBox", XmCreateForm},         {"..+", "refLoadOk", XmCreatePushButton},
    {"..+", "refLoadCancel", XmCreatePushButton}, {nullptr, nullptr, nullptr},
};

const char* const kLayout[] = {"*refRangeBox.topAttachment: ATTACH_WIDGET",
                               "*refRangeBox.topWidget: refPrefixBox",
                               "*refButtonBox.topAttachment: ATTACH_WIDGET",
                               "*refButtonBox.topWidget: refRangeBox",
                               "*refPrefix.leftAttachment: ATTACH_WIDGET",
                               "*refPrefix.leftWidget: refPrefixLabel",
                               "*refLoadCancel.leftAttachment: ATTACH_WIDGET",
                               "*refLoadCancel.leftWidget: refLoadOk",
                               nullptr};

class RefLoadDialogTest : public ::testing::Test {
  protected:
    static void SetUpTestSuite() {
        Widget shell = guitest::Shell(kLayout);
        ASSERT_NE(shell, nullptr);
        KLXmGnome::BuildWidgetTree(shell, kRows);
        // Dialogs pop up over a realized application window.
        XtVaSetValues(shell, XmNwidth, 200, XmNheight, 100, nullptr);
        XtRealizeWidget(shell);
        dialog = new RefLoadDialog;
    }
    // Runs `step` every 20 ms (from the nested loop of the modal dialog) until it returns true.
    struct Poll {
        std::function<bool()> step;
        bool done = false;
        static void tick(XtPointer self, XtIntervalId*) {
            auto* p = static_cast<Poll*>(self);
            if (p->step())
                p->done = true;
            else
                XtAppAddTimeOut(KLXmGnome::AppContext(), 20, tick, self);
        }
        explicit Poll(std::function<bool()> f) : step(std::move(f)) {
            XtAppAddTimeOut(KLXmGnome::AppContext(), 20, tick, this);
        }
    };
    static bool viewable(Widget w) {
        XWindowAttributes a;
        return XtIsRealized(w) && XGetWindowAttributes(XtDisplay(w), XtWindow(w), &a) &&
               a.map_state == IsViewable;
    }
    // Shows the dialog and presses `button` once it is on the screen.
    int ShowAndPress(Widget button) {
        Poll press([button] {
            if (!viewable(button))
                return false;
            guitest::Settle();  // the form's layout is final before the click
            guitest::Click(button);
            return true;
        });
        int result = dialog->Show();
        EXPECT_TRUE(press.done);
        return result;
    }
    static RefLoadDialog* dialog;
};
RefLoadDialog* RefLoadDialogTest::dialog = nullptr;

TEST_F(RefLoadDialogTest, FindsItsWidgets) {
    EXPECT_EQ(dialog->dialog, KLXmGnome::FindWidget("refDialog"));
    EXPECT_EQ(dialog->byField, KLXmGnome::FindWidget("refBy"));
    EXPECT_EQ(dialog->okButton, KLXmGnome::FindWidget("refLoadOk"));
    EXPECT_EQ(dialog->cancelButton, KLXmGnome::FindWidget("refLoadCancel"));
}

TEST_F(RefLoadDialogTest, ValuesRoundTripAndZoomTravelsInRefBy) {
    dialog->SetPrefix("shots/take1.");
    dialog->SetExt("png");
    dialog->SetStart(3);
    dialog->SetEnd(120);
    dialog->SetBy(5);  // the step is always 1
    dialog->SetZoom(2);
    EXPECT_STREQ(dialog->Prefix(), "shots/take1.");
    EXPECT_STREQ(dialog->Ext(), "png");
    EXPECT_EQ(dialog->Start(), 3);
    EXPECT_EQ(dialog->End(), 120);
    EXPECT_EQ(dialog->By(), 1);
    EXPECT_EQ(dialog->Zoom(), 2);
    char* text = XmTextFieldGetString(dialog->byField);
    EXPECT_STREQ(text, "2");
    XtFree(text);
}

TEST_F(RefLoadDialogTest, GarbageAndEmptyNumbersReadAsZero) {
    for (const char* typed : {"", "abc", " "}) {
        XmTextFieldSetString(dialog->startField, const_cast<char*>(typed));
        EXPECT_EQ(dialog->Start(), 0) << "\"" << typed << "\"";
    }
    XmTextFieldSetString(dialog->endField, const_cast<char*>("42frames"));
    EXPECT_EQ(dialog->End(), 42);
}

TEST_F(RefLoadDialogTest, PrefixReturnsAFreshStringEachCall) {
    dialog->SetPrefix("one");
    std::string first = dialog->Prefix();
    dialog->SetPrefix("two");
    char* second = dialog->Prefix();
    EXPECT_EQ(first, "one");
    EXPECT_STREQ(second, "two");
}

TEST_F(RefLoadDialogTest, OkAndCancelAnswerTheModalShow) {
    EXPECT_EQ(ShowAndPress(dialog->okButton), 1);
    EXPECT_FALSE(XtIsManaged(dialog->dialog));
    dialog->SetStart(7);
    EXPECT_EQ(ShowAndPress(dialog->cancelButton), 0);
    EXPECT_EQ(dialog->Start(), 7) << "Cancel leaves the fields as they were";
}

TEST_F(RefLoadDialogTest, WindowManagerCloseIsCancel) {
    Poll close([] {
        if (!viewable(XtParent(dialog->dialog)))
            return false;
        guitest::CloseFromWindowManager(dialog->dialog);
        return true;
    });
    EXPECT_EQ(dialog->Show(), 0);
}

}  // namespace
