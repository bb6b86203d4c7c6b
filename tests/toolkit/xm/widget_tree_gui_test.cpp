// The widget-table builder, the name and fiend registries and the menu helpers, on the test
// display.
// GoogleTest first: the X headers define macros (None, Bool) that its names collide with.
#include <gtest/gtest.h>

#include <Xm/CascadeBG.h>
#include <Xm/Form.h>
#include <Xm/Label.h>
#include <Xm/PushBG.h>
#include <Xm/RowColumn.h>
#include <Xm/SeparatoG.h>

#include "guitest/GuiTest.h"
#include "toolkit/xm/KLFiend.h"
#include "toolkit/xm/KLXmGnome.h"

namespace {

// A fiend whose top widget is a label, made from a table row like the sync chart is.
class LabelFiend : public KLFiend {
  public:
    static int alive;
    LabelFiend(Widget parent, const char* name) : KLFiend(parent, name) {
        alive++;
        attach_widget(XmCreateLabel(parent, const_cast<char*>(name), nullptr, 0));
    }
    ~LabelFiend() override { alive--; }
    static Widget Create(Widget parent, String name, ArgList, Cardinal) {
        return (new LabelFiend(parent, name))->GetWidget();
    }
};
int LabelFiend::alive = 0;

const KLWidgetSpec kTable[] = {
    {"+", "testForm", XmCreateForm},
    {".+", "testBar", XmCreateMenuBar},
    {"..+", "testFile", XmCreateCascadeButtonGadget},
    {"..-", "testFileMenu", XmCreatePulldownMenu},
    {"...+", "testOpen", XmCreatePushButtonGadget},
    {"...+", "sepMenu", XmCreateSeparatorGadget},
    {"...+", "testQuit", XmCreatePushButtonGadget},
    {"..+", "testEdit", XmCreateCascadeButtonGadget},
    {"..-", "testEditMenu", XmCreatePulldownMenu},
    {"...+", "sepMenu", XmCreateSeparatorGadget},
    {".-", "testHidden", XmCreateLabel},
    {".+", "testFiend", LabelFiend::Create},
    {nullptr, nullptr, nullptr},
};

class WidgetTreeTest : public ::testing::Test {
  protected:
    static void SetUpTestSuite() {
        Widget shell = guitest::Shell();
        ASSERT_NE(shell, nullptr);
        top = XtVaAppCreateShell("treeTest", "Chirrup", topLevelShellWidgetClass,
                                 XtDisplay(shell), nullptr);
        KLXmGnome::BuildWidgetTree(top, kTable);
        XtRealizeWidget(top);
    }
    static Widget top;
};
Widget WidgetTreeTest::top = nullptr;

TEST_F(WidgetTreeTest, RowsHangUnderTheParentTheirDepthGivesAndAreManagedByMarker) {
    Widget form = KLXmGnome::FindWidget("testForm");
    ASSERT_NE(form, nullptr);
    EXPECT_EQ(XtParent(form), top);
    EXPECT_EQ(XtParent(KLXmGnome::FindWidget("testBar")), form);
    EXPECT_TRUE(XtIsManaged(KLXmGnome::FindWidget("testBar")));
    Widget hidden = KLXmGnome::FindWidget("testHidden");
    ASSERT_NE(hidden, nullptr);
    EXPECT_EQ(XtParent(hidden), form);
    EXPECT_FALSE(XtIsManaged(hidden));
}

TEST_F(WidgetTreeTest, PulldownsHangFromTheirCascadeAndHoldTheirItems) {
    Widget cascade = KLXmGnome::FindWidget("testFile");
    Widget menu = KLXmGnome::FindWidget("testFileMenu");
    ASSERT_NE(cascade, nullptr);
    ASSERT_NE(menu, nullptr);
    Widget subMenu = nullptr;
    XtVaGetValues(cascade, XmNsubMenuId, &subMenu, nullptr);
    EXPECT_EQ(subMenu, menu);
    EXPECT_EQ(XtParent(KLXmGnome::FindWidget("testOpen")), menu);
    EXPECT_EQ(XtParent(KLXmGnome::FindWidget("testQuit")), menu);
    Widget editSub = nullptr;
    XtVaGetValues(KLXmGnome::FindWidget("testEdit"), XmNsubMenuId, &editSub, nullptr);
    EXPECT_EQ(editSub, KLXmGnome::FindWidget("testEditMenu"));
}

TEST_F(WidgetTreeTest, FindWidgetTakesTheFirstOfRepeatedNamesAndHonoursTheRoot) {
    Widget first = KLXmGnome::FindWidget("sepMenu");
    ASSERT_NE(first, nullptr);
    EXPECT_EQ(XtParent(first), KLXmGnome::FindWidget("testFileMenu"));
    Widget underEdit = KLXmGnome::FindWidget("sepMenu", KLXmGnome::FindWidget("testEditMenu"));
    ASSERT_NE(underEdit, nullptr);
    EXPECT_NE(underEdit, first);
    EXPECT_EQ(KLXmGnome::FindWidget("testOpen", KLXmGnome::FindWidget("testEditMenu")), nullptr);
    EXPECT_EQ(KLXmGnome::FindWidget("noSuchWidget"), nullptr);
    EXPECT_EQ(KLXmGnome::FindWidget(nullptr), nullptr);
}

TEST_F(WidgetTreeTest, FiendsAreFoundByNameAndDieWithTheirWidget) {
    KLFiend* fiend = KLXmGnome::FindFiend("testFiend");
    ASSERT_NE(fiend, nullptr);
    EXPECT_EQ(fiend->Name(), "testFiend");
    EXPECT_EQ(KLXmGnome::FindFiend("testForm"), nullptr);
    int before = LabelFiend::alive;
    XtDestroyWidget(fiend->GetWidget());
    guitest::Settle();
    EXPECT_EQ(LabelFiend::alive, before - 1);
    EXPECT_EQ(KLXmGnome::FindFiend("testFiend"), nullptr);
    EXPECT_EQ(KLXmGnome::FindWidget("testFiend"), nullptr);
}

void count_cb(Widget, XtPointer clientData, XtPointer) { ++*static_cast<int*>(clientData); }

TEST_F(WidgetTreeTest, MenuEntriesAreAddedAndEmptiedKeepingTheFirstOnes) {
    Widget menu = KLXmGnome::FindWidget("testEditMenu");
    int calls = 0;
    Widget a = KLXmGnome::AddMenuEntry(menu, "alpha", count_cb, &calls);
    KLXmGnome::AddMenuEntry(menu, "beta", count_cb, &calls);
    ASSERT_NE(a, nullptr);
    XtCallCallbacks(a, XmNactivateCallback, nullptr);
    EXPECT_EQ(calls, 1);
    Cardinal count = 0;
    XtVaGetValues(menu, XmNnumChildren, &count, nullptr);
    EXPECT_EQ(count, 3u);
    KLXmGnome::EmptyMenu(menu, 1);
    guitest::Settle();
    XtVaGetValues(menu, XmNnumChildren, &count, nullptr);
    EXPECT_EQ(count, 1u);
    EXPECT_NE(KLXmGnome::FindWidget("sepMenu", menu), nullptr);
}

TEST_F(WidgetTreeTest, AddCallbackFindsTheWidgetByNameAndIgnoresUnknownNames) {
    int calls = 0;
    KLXmGnome::AddCallback("testOpen", XmNactivateCallback, count_cb, &calls);
    KLXmGnome::AddCallback("noSuchWidget", XmNactivateCallback, count_cb, &calls);
    XtCallCallbacks(KLXmGnome::FindWidget("testOpen"), XmNactivateCallback, nullptr);
    EXPECT_EQ(calls, 1);
}

}  // namespace
