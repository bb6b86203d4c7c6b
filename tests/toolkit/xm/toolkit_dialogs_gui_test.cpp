// Alerts and the file browser base on the test display.
#include <gtest/gtest.h>

#include <Xm/FileSB.h>
#include <Xm/Form.h>
#include <Xm/MessageB.h>
#include <Xm/TextF.h>
#include <Xm/Xm.h>

#include <cstring>
#include <filesystem>
#include <fstream>
#include <functional>
#include <string>
#include <vector>

#include "guitest/AnswerScript.h"
#include "guitest/GuiTest.h"
#include "testkit/TempDir.h"
#include "toolkit/xm/KLAlert.h"
#include "toolkit/xm/KLFileManager.h"
#include "toolkit/xm/KLXmGnome.h"

namespace fs = std::filesystem;

namespace {

using guitest::AnswerScript;
using guitest::Viewable;

bool PressWhenShown(Widget button) {
    if (!Viewable(button))
        return false;
    guitest::Settle();
    guitest::Click(button);
    return true;
}

class ToolkitTest : public ::testing::Test {
  protected:
    static void SetUpTestSuite() {
        Widget shell = guitest::Shell();
        ASSERT_NE(shell, nullptr);
        if (!form) {
            form = XmCreateForm(shell, const_cast<char*>("toolkitForm"), nullptr, 0);
            XtVaSetValues(form, XmNwidth, 400, XmNheight, 300, nullptr);
            XtManageChild(form);
            XtRealizeWidget(shell);
            guitest::WaitMapped(shell);
        }
    }
    static Widget form;
};
Widget ToolkitTest::form = nullptr;

// Closing the question from the window manager is its last answer (Cancel); what each button
// answers is checked through the window's quit questions.
TEST_F(ToolkitTest, ClosingAnAlertIsItsLastAnswer) {
    KLAlert alert(form, "Attention");
    AnswerScript close({[&] {
        if (!alert.Waiting() || !Viewable(alert.Button(0)))
            return false;
        guitest::CloseFromWindowManager(alert.GetDialog());
        return true;
    }});
    EXPECT_EQ(alert.Confirm3("Save?", "Save", "Don't Save", "Cancel"), 0);
    AnswerScript yes({[&] { return alert.Waiting() && PressWhenShown(alert.Button(0)); }});
    EXPECT_EQ(alert.Confirm("Go on?", "Yes", "No"), 1);
    EXPECT_FALSE(XtIsManaged(alert.GetDialog())) << "answered alerts leave the screen";
}

// A browser that records what it was asked to open and store, and lists only the names
// without "skip" in them (after Motif's own search).
class RecordingManager : public KLFileManager {
  public:
    RecordingManager(Widget parent, std::string dir)
        : KLFileManager(parent), dir_(std::move(dir)) {}
    int RetrieveFile(const char* name) override { return retrieved = name, 1; }
    int StoreFile(const char* name) override { return stored = name, 1; }
    const char* DefaultDirectory() override { return dir_.c_str(); }
    const char* FileTypeName() override { return "Testfile"; }
    const char* Extension() override { return "tst"; }
    int DoPostFilter() override { return 1; }
    int FilterFileList(int count, char** names) override {
        int kept = 0;
        for (int i = 0; i < count; i++)
            if (!std::strstr(names[i], "skip"))
                names[kept++] = names[i];
        return kept;
    }
    std::string retrieved, stored;

  private:
    std::string dir_;
};

class FileManagerTest : public ToolkitTest {
  protected:
    void SetUp() override {
        fs::create_directories(temp / "sub");
        std::ofstream(temp / "a.tst") << "a\n";
        std::ofstream(temp / "skip.tst") << "s\n";
    }
    // Once the browser is up: notes the names in its file list, types `leaf` and presses OK.
    std::function<bool()> Choose(KLFileManager& m, const std::string& leaf) {
        return [this, &m, path = dir + "/" + leaf] {
            Widget ok = XmFileSelectionBoxGetChild(m.Browser(), XmDIALOG_OK_BUTTON);
            if (!m.Waiting() || !Viewable(ok))
                return false;
            XmStringTable items = nullptr;
            int count = 0;
            XtVaGetValues(m.Browser(), XmNfileListItems, &items, XmNfileListItemCount, &count,
                          nullptr);
            listed.clear();
            for (int i = 0; i < count; i++) {
                char* text = nullptr;
                XmStringGetLtoR(items[i], const_cast<char*>(XmFONTLIST_DEFAULT_TAG), &text);
                listed.push_back(text ? text : "");
                XtFree(text);
            }
            XmTextFieldSetString(XmFileSelectionBoxGetChild(m.Browser(), XmDIALOG_TEXT),
                                 const_cast<char*>(path.c_str()));
            guitest::Settle();
            guitest::Click(ok);
            return true;
        };
    }
    // Presses `button` of the browser's own alert (made under the same parent) once it is up.
    static std::function<bool()> Answer(unsigned char button) {
        return [button] {
            Widget notice = XtNameToWidget(form, "*Attention");
            return notice && XtIsManaged(notice) &&
                   PressWhenShown(XmMessageBoxGetChild(notice, button));
        };
    }
    testkit::TempDir temp;
    const std::string dir = temp.path();
    std::vector<std::string> listed;
};

// The list leaves out what the post-filter drops; retrieving remembers the folder and
// refuses folders; storing over a file asks first ("Cancel" goes back to the browser,
// cancelling it stores nothing); a new name asks nothing (the window's quit test stores one).
TEST_F(FileManagerTest, RetrieveAndStoreAs) {
    RecordingManager m(form, dir);
    EXPECT_EQ(KLFileManager::FilterMask(m.Pattern(), m.Extension()), "*.tst");
    {
        AnswerScript script({Choose(m, "a.tst")});
        EXPECT_EQ(m.Retrieve(), 1);
    }
    EXPECT_EQ(listed, std::vector<std::string>{dir + "/a.tst"});
    EXPECT_EQ(m.retrieved, dir + "/a.tst");
    EXPECT_EQ(m.LastDirectory(), dir);
    EXPECT_EQ(m.LastName(), "a.tst");
    m.retrieved.clear();
    {
        AnswerScript script({Choose(m, "sub"), Answer(XmDIALOG_OK_BUTTON)});
        EXPECT_EQ(m.Retrieve(), -1);
        EXPECT_TRUE(script.Finished()) << "a folder is refused with a notice";
    }
    EXPECT_TRUE(m.retrieved.empty());
    m.ResetDirectory();
    EXPECT_EQ(m.LastDirectory(), "");
    {
        AnswerScript script({Choose(m, "a.tst"), Answer(XmDIALOG_CANCEL_BUTTON), [&] {
                                 return m.Waiting() && PressWhenShown(XmFileSelectionBoxGetChild(
                                                           m.Browser(), XmDIALOG_CANCEL_BUTTON));
                             }});
        EXPECT_EQ(m.StoreAs(1), -1);
        EXPECT_TRUE(script.Finished()) << "the replace question was asked";
    }
    EXPECT_TRUE(m.stored.empty());
    {
        AnswerScript script({Choose(m, "a.tst"), Answer(XmDIALOG_OK_BUTTON)});
        EXPECT_EQ(m.StoreAs(1), 1);
        EXPECT_TRUE(script.Finished());
    }
    EXPECT_EQ(m.stored, dir + "/a.tst");
}

}  // namespace
