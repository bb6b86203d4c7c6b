// The fiend registry and the menu helpers, on a tree built from a widget table (the main
// window's own table is checked by the window tests).
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
    {"..+", "testEdit", XmCreateCascadeButtonGadget},
    {"..-", "testEditMenu", XmCreatePulldownMenu},
    {"...+", "sepMenu", XmCreateSeparatorGadget},
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

// Menu entries are added and emptied keeping the first ones; names are found under the root
// given.
TEST_F(WidgetTreeTest, MenuEntriesAreAddedAndEmptied) {
    Widget menu = Find("testEditMenu");
    ASSERT_NE(menu, nullptr);
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
    EXPECT_EQ(Find("testEdit", menu), nullptr);
    EXPECT_EQ(Find(nullptr), nullptr);
}

// A tab in a label's text shows as a gap, not as nothing (as a Motif label draws it).
TEST_F(WidgetTreeTest, ATabInALabelShowsAsAGap) {
    Widget form = Find("testForm");
    ASSERT_NE(form, nullptr);
    Widget tabbed = XmCreateLabel(form, const_cast<char*>("tabbed"), nullptr, 0);
    Widget plain = XmCreateLabel(form, const_cast<char*>("plain"), nullptr, 0);
    KLXmGnome::SetLabel(tabbed, "Select\tDagnode:");
    KLXmGnome::SetLabel(plain, "SelectDagnode:");
    Dimension withTab = 0, without = 0;
    XtVaGetValues(tabbed, XmNwidth, &withTab, nullptr);
    XtVaGetValues(plain, XmNwidth, &without, nullptr);
    EXPECT_GT(withTab, without);
    XtDestroyWidget(tabbed);
    XtDestroyWidget(plain);
}

}  // namespace
