// The widget-table builder, the name and fiend registries and the menu helpers.
// GoogleTest first: the X headers define macros (None, Bool) that its names collide with.
#include <gtest/gtest.h>

#include <Xm/CascadeBG.h>
#include <Xm/Form.h>
#include <Xm/Label.h>
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
    {"...+", "sepMenu", XmCreateSeparatorGadget},
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
        top = XtVaAppCreateShell("treeTest", "Chirrup", topLevelShellWidgetClass, XtDisplay(shell),
                                 nullptr);
        KLXmGnome::BuildWidgetTree(top, kTable);
        XtRealizeWidget(top);
    }
    static Widget top;
};
Widget WidgetTreeTest::top = nullptr;

Widget Find(const char* name, Widget root = nullptr) {
    return KLXmGnome::FindWidget(name, root);
}

// Rows hang under the parent their depth gives, managed by their marker; pulldowns hang from
// their cascade; FindWidget takes the first of repeated names under the root it is given.
// Menu entries are added and emptied keeping the first ones.
TEST_F(WidgetTreeTest, RowsPulldownsNamesAndMenuEntries) {
    Widget form = Find("testForm"), hidden = Find("testHidden"), menu = Find("testEditMenu");
    ASSERT_TRUE(form && hidden && menu);
    EXPECT_EQ(XtParent(form), top);
    EXPECT_TRUE(XtIsManaged(Find("testBar")));
    EXPECT_EQ(XtParent(hidden), form);
    EXPECT_FALSE(XtIsManaged(hidden));
    Widget fileMenu = nullptr;
    XtVaGetValues(Find("testFile"), XmNsubMenuId, &fileMenu, nullptr);
    EXPECT_EQ(fileMenu, Find("testFileMenu"));
    EXPECT_EQ(XtParent(Find("sepMenu")), fileMenu);
    EXPECT_EQ(XtParent(Find("sepMenu", menu)), menu);
    EXPECT_EQ(Find("testFile", menu), nullptr);
    EXPECT_EQ(Find("noSuchWidget"), nullptr);
    EXPECT_EQ(Find(nullptr), nullptr);

    int calls = 0;
    auto count = [](Widget, XtPointer n, XtPointer) { ++*static_cast<int*>(n); };
    Widget a = KLXmGnome::AddMenuEntry(menu, "alpha", count, &calls);
    KLXmGnome::AddMenuEntry(menu, "beta", count, &calls);
    ASSERT_NE(a, nullptr);
    XtCallCallbacks(a, XmNactivateCallback, nullptr);
    EXPECT_EQ(calls, 1);
    EXPECT_EQ(guitest::Children(menu).size(), 3u);
    KLXmGnome::EmptyMenu(menu, 1);
    guitest::Settle();
    EXPECT_EQ(guitest::Children(menu), std::vector<Widget>{Find("sepMenu", menu)});
}

TEST_F(WidgetTreeTest, FiendsAreFoundByNameAndDieWithTheirWidget) {
    KLFiend* fiend = KLXmGnome::FindFiend("testFiend");
    ASSERT_NE(fiend, nullptr);
    EXPECT_EQ(KLXmGnome::FindFiend("testForm"), nullptr);
    int before = LabelFiend::alive;
    XtDestroyWidget(fiend->GetWidget());
    guitest::Settle();
    EXPECT_EQ(LabelFiend::alive, before - 1);
    EXPECT_EQ(KLXmGnome::FindFiend("testFiend"), nullptr);
    EXPECT_EQ(Find("testFiend"), nullptr);
}

}  // namespace
