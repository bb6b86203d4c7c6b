// The reference-load dialog on the rows of the main window's table that hold it.
#include <gtest/gtest.h>

#include <Xm/Form.h>
#include <Xm/Label.h>
#include <Xm/PushB.h>
#include <Xm/Separator.h>
#include <Xm/TextF.h>
#include <Xm/Xm.h>

#include <string>

#include "dialogs/RefLoadDialog.h"
#include "guitest/AnswerScript.h"
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
    // Shows the dialog and, once `widget` is on the screen, runs `answer` on it.
    static int ShowAndAnswer(Widget widget, void (*answer)(Widget)) {
        guitest::AnswerScript script({[&] {
            if (!guitest::Viewable(widget))
                return false;
            guitest::Settle();  // the form's layout is final before the click
            answer(widget);
            return true;
        }});
        int result = dialog->Show();
        EXPECT_TRUE(script.Finished());
        return result;
    }
    static void press(Widget button) { guitest::Click(button); }
    static RefLoadDialog* dialog;
};
RefLoadDialog* RefLoadDialogTest::dialog = nullptr;

// The step is always 1 and the zoom travels in refBy; numbers that do not read are 0; Prefix
// gives a fresh string each call.
TEST_F(RefLoadDialogTest, FieldsHoldTheValues) {
    dialog->SetPrefix("shots/take1.");
    std::string first = dialog->Prefix();
    dialog->SetPrefix("two");
    EXPECT_EQ(first, "shots/take1.");
    EXPECT_STREQ(dialog->Prefix(), "two");
    dialog->SetBy(5);
    dialog->SetZoom(2);
    EXPECT_EQ(dialog->By(), 1);
    char* text = XmTextFieldGetString(KLXmGnome::FindWidget("refBy"));
    EXPECT_STREQ(text, "2");
    XtFree(text);
    XmTextFieldSetString(dialog->startField, const_cast<char*>("abc"));
    EXPECT_EQ(dialog->Start(), 0);
    XmTextFieldSetString(dialog->endField, const_cast<char*>("42frames"));
    EXPECT_EQ(dialog->End(), 42);
}

// OK answers 1; Cancel and the window manager's close answer 0 and leave the fields alone.
TEST_F(RefLoadDialogTest, OkCancelAndCloseAnswerTheModalShow) {
    EXPECT_EQ(ShowAndAnswer(dialog->okButton, press), 1);
    EXPECT_FALSE(XtIsManaged(dialog->dialog));
    dialog->SetStart(7);
    EXPECT_EQ(ShowAndAnswer(dialog->cancelButton, press), 0);
    EXPECT_EQ(dialog->Start(), 7);
    EXPECT_EQ(ShowAndAnswer(XtParent(dialog->dialog),
                            [](Widget) { guitest::CloseFromWindowManager(dialog->dialog); }),
              0);
}

}  // namespace
