// Alerts, the file browser base, image views and image buttons on the test display.
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

#include "guitest/GuiTest.h"
#include "toolkit/KLImageSGI.h"
#include "toolkit/xm/KLAlert.h"
#include "toolkit/xm/KLFileManager.h"
#include "toolkit/xm/KLImageButton.h"
#include "toolkit/xm/KLImageView.h"
#include "toolkit/xm/KLResourceLines.h"
#include "toolkit/xm/KLXmGnome.h"

namespace fs = std::filesystem;

namespace {

using guitest::Viewable;

// Runs `step` every 20 ms, also inside modal loops, until it returns true.
class Poll {
  public:
    explicit Poll(std::function<bool()> step) : step_(std::move(step)) { arm(); }
    ~Poll() {
        if (id_)
            XtRemoveTimeOut(id_);
    }
    bool Done() const { return done_; }

  private:
    void arm() { id_ = XtAppAddTimeOut(KLXmGnome::AppContext(), 20, tick, this); }
    static void tick(XtPointer self, XtIntervalId*) {
        auto* p = static_cast<Poll*>(self);
        p->id_ = 0;
        if (p->step_())
            p->done_ = true;
        else
            p->arm();
    }
    std::function<bool()> step_;
    XtIntervalId id_ = 0;
    bool done_ = false;
};

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

TEST_F(ToolkitTest, Confirm3AnswersByButtonAndCloseIsTheLast) {
    KLAlert alert(form, "Attention");
    for (int position : {0, 1, 2}) {
        Poll press([&] { return alert.Waiting() && PressWhenShown(alert.Button(position)); });
        int answer = alert.Confirm3("Save?", "Save", "Don't Save", "Cancel");
        EXPECT_EQ(answer, position == 0 ? 1 : position == 1 ? 2 : 0);
    }
    Poll close([&] {
        if (!alert.Waiting() || !Viewable(alert.Button(0)))
            return false;
        guitest::CloseFromWindowManager(alert.GetDialog());
        return true;
    });
    EXPECT_EQ(alert.Confirm3("Save?", "Save", "Don't Save", "Cancel"), 0);
    Poll yes([&] { return alert.Waiting() && PressWhenShown(alert.Button(0)); });
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
    int StoreFile(const char* name) override {
        stored = name;
        std::ofstream(name) << "stored\n";
        return 1;
    }
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
        dir = fs::temp_directory_path() / ("chirrup-fm-" + std::to_string(getpid()));
        fs::create_directories(dir + "/sub");
        std::ofstream(dir + "/a.tst") << "a\n";
        std::ofstream(dir + "/skip.tst") << "s\n";
    }
    void TearDown() override { fs::remove_all(dir); }
    // Types `path` into the browser and presses OK, once it is up.
    static bool Choose(KLFileManager& m, const std::string& path) {
        if (!m.Waiting())
            return false;
        Widget ok = XmFileSelectionBoxGetChild(m.Browser(), XmDIALOG_OK_BUTTON);
        if (!Viewable(ok))
            return false;
        XmTextFieldSetString(XmFileSelectionBoxGetChild(m.Browser(), XmDIALOG_TEXT),
                             const_cast<char*>(path.c_str()));
        guitest::Settle();
        guitest::Click(ok);
        return true;
    }
    // The names in the browser's file list.
    static std::vector<std::string> Listed(KLFileManager& m) {
        XmStringTable items = nullptr;
        int count = 0;
        XtVaGetValues(m.Browser(), XmNfileListItems, &items, XmNfileListItemCount, &count, nullptr);
        std::vector<std::string> listed;
        for (int i = 0; i < count; i++) {
            char* text = nullptr;
            XmStringGetLtoR(items[i], const_cast<char*>(XmFONTLIST_DEFAULT_TAG), &text);
            listed.push_back(text ? text : "");
            XtFree(text);
        }
        return listed;
    }
    // The browser's own alert (made under the same parent), or null.
    static Widget Notice() {
        Widget w = XtNameToWidget(form, "*Attention");
        return w && XtIsManaged(w) ? w : nullptr;
    }
    // Presses `button` of the browser's own alert once it is up, noting its message.
    static bool Answer(unsigned char button, std::string* told = nullptr) {
        Widget notice = Notice();
        if (!notice || !Viewable(XmMessageBoxGetChild(notice, button)))
            return false;
        if (told)
            *told = guitest::XmText(notice, XmNmessageString);
        return PressWhenShown(XmMessageBoxGetChild(notice, button));
    }
    std::string dir;
};

// The list leaves out what the post-filter drops; retrieving remembers the folder and
// refuses folders; storing over a file asks first ("Cancel" goes back to the browser,
// cancelling it stores nothing), a new name does not.
TEST_F(FileManagerTest, RetrieveAndStoreAs) {
    RecordingManager m(form, dir);
    EXPECT_EQ(KLFileManager::FilterMask(m.Pattern(), m.Extension()), "*.tst");
    std::vector<std::string> listed;
    Poll choose([&] {
        if (listed.empty() && m.Waiting() &&
            Viewable(XmFileSelectionBoxGetChild(m.Browser(), XmDIALOG_OK_BUTTON)))
            listed = Listed(m);
        return Choose(m, dir + "/a.tst");
    });
    EXPECT_EQ(m.Retrieve(), 1);
    EXPECT_EQ(listed, std::vector<std::string>{dir + "/a.tst"});
    EXPECT_EQ(m.retrieved, dir + "/a.tst");
    EXPECT_EQ(m.LastDirectory(), dir);
    EXPECT_EQ(m.LastName(), "a.tst");
    m.retrieved.clear();
    std::string told;
    int step = 0;
    Poll folder([&] {
        return step == 0 ? Choose(m, dir + "/sub") && (++step, false)
                         : Answer(XmDIALOG_OK_BUTTON, &told);
    });
    EXPECT_EQ(m.Retrieve(), -1);
    EXPECT_TRUE(folder.Done());
    EXPECT_TRUE(m.retrieved.empty());
    EXPECT_EQ(told, dir + "/sub is a folder; choose a Testfile file.");
    m.ResetDirectory();
    EXPECT_EQ(m.LastDirectory(), "");

    step = 0;
    Poll refuse([&] {
        if (step == 0)
            return Choose(m, dir + "/a.tst") && (++step, false);
        if (step == 1)
            return Answer(XmDIALOG_CANCEL_BUTTON, &told) && (++step, false);
        return m.Waiting() &&
               PressWhenShown(XmFileSelectionBoxGetChild(m.Browser(), XmDIALOG_CANCEL_BUTTON));
    });
    EXPECT_EQ(m.StoreAs(1), -1);
    EXPECT_EQ(told, dir + "/a.tst already exists. Replace it?");
    EXPECT_TRUE(m.stored.empty());
    step = 0;
    Poll replace([&] {
        return step == 0 ? Choose(m, dir + "/a.tst") && (++step, false)
                         : Answer(XmDIALOG_OK_BUTTON);
    });
    EXPECT_EQ(m.StoreAs(1), 1);
    EXPECT_EQ(m.stored, dir + "/a.tst");
    Poll fresh([&] { return Choose(m, dir + "/new.tst"); });
    EXPECT_EQ(m.StoreAs(1), 1);
    EXPECT_EQ(m.stored, dir + "/new.tst");
}

TEST_F(ToolkitTest, ImageViewFadesAndImageButtonDoubleClicks) {
    KLImageView* view = dynamic_cast<KLImageView*>(
        KLFiend::FromWidget(KLImageView::Create(form, const_cast<char*>("view"), nullptr, 0)));
    ASSERT_NE(view, nullptr);
    XtVaSetValues(view->GetWidget(), XmNwidth, 200, XmNheight, 100, nullptr);
    XtManageChild(view->GetWidget());
    KLImageSGI red(10, 10), blue(10, 10);
    for (int i = 0; i < 100; i++) {
        red.Pixels()[i * 4] = 255;
        blue.Pixels()[i * 4 + 2] = 255;
    }
    EXPECT_EQ(view->MixedPixel(0, 0), -1);
    view->SetImage(&red);
    EXPECT_EQ(view->MixedPixel(3, 3), 0xff0000);
    EXPECT_EQ(view->MixedPixel(10, 3), -1);
    view->SetImages(&red, &blue, 0.25f);
    EXPECT_EQ(view->MixedPixel(0, 0), 0xbf0040);
    view->SetFade(3.0f);  // clamped to 1: all the second picture
    EXPECT_EQ(view->MixedPixel(0, 0), 0x0000ff);
    view->SetZoom(9);
    EXPECT_EQ(view->Zoom(), 4);
    // On screen: the zoomed picture in the middle, background at the edge.
    view->SetImage(&red);
    guitest::Settle();
    Widget w = view->GetWidget();
    Pixel background = 0;
    XtVaGetValues(w, XmNbackground, &background, nullptr);
    EXPECT_EQ(guitest::PixelAt(w, 100, 50), guitest::NamedPixel("red"));
    EXPECT_EQ(guitest::PixelAt(w, 2, 2), background);
    view->SetImage(nullptr);
    guitest::Settle();
    EXPECT_EQ(guitest::PixelAt(w, 100, 50), background);
    XtDestroyWidget(w);

    // An image button: a click presses it; two presses close together are a double click.
    auto* button = dynamic_cast<KLImageButton*>(
        KLFiend::FromWidget(KLImageButton::Create(form, const_cast<char*>("tile"), nullptr, 0)));
    ASSERT_NE(button, nullptr);
    XtManageChild(button->GetWidget());
    int presses = 0, doubles = 0;
    button->SetPressCallback([](Widget, XtPointer d, XtPointer) { ++*static_cast<int*>(d); },
                             &presses);
    button->SetDoubleClickCallback([](Widget, XtPointer d, XtPointer) { ++*static_cast<int*>(d); },
                                   &doubles);
    guitest::Settle();
    guitest::Click(button->GetWidget());
    guitest::WaitFor([&] { return presses == 1; });
    EXPECT_EQ(doubles, 0);
    guitest::Settle();
    // Far apart in time: no double click; close together: one.
    button->Pressed(1000);
    button->Pressed(100000);
    EXPECT_EQ(doubles, 0);
    button->Pressed(100050);
    EXPECT_EQ(doubles, 1);
    button->Pressed(100060);  // a third press starts a new pair
    EXPECT_EQ(doubles, 1);
    XtDestroyWidget(button->GetWidget());
}

TEST(ResourceLines, CommentsBlankLinesAndContinuations) {
    KLResourceLines lines(
        "! comment\n\n*a.labelString: A\n  ! indented comment\n*b.translations: #override \\n\\\n"
        "<Key>x: Arm()\n*c: trailing\\\\\n*d: D\r\n");
    ASSERT_EQ(lines.Count(), 4u);
    EXPECT_EQ(lines.Line(0), "*a.labelString: A");
    EXPECT_EQ(lines.Line(1), "*b.translations: #override \\n<Key>x: Arm()");
    EXPECT_EQ(lines.Line(2), "*c: trailing\\\\");
    EXPECT_EQ(lines.Line(3), "*d: D");
    EXPECT_EQ(lines.Lines()[4], nullptr);
}

}  // namespace
