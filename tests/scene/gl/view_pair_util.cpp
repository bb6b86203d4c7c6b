#include <Xm/Form.h>
#include <Xm/Xm.h>

#include "scene/gl/KLSceneView.h"
#include "scene/gl/ViewPair.h"

namespace testscenes {

void MakeViewPair(Widget parent, int width, int height, KLSceneView* views[2]) {
    Widget form = XmCreateForm(parent, const_cast<char*>("views"), nullptr, 0);
    for (int i = 0; i < 2; ++i) {
        Arg args[6];
        Cardinal n = 0;
        XtSetArg(args[n], XmNwidth, width), ++n;
        XtSetArg(args[n], XmNheight, height), ++n;
        XtSetArg(args[n], XmNtopAttachment, XmATTACH_FORM), ++n;
        XtSetArg(args[n], XmNleftAttachment, i ? XmATTACH_WIDGET : XmATTACH_FORM), ++n;
        XtSetArg(args[n], XmNleftWidget, i ? views[0]->GetWidget() : nullptr), ++n;
        Widget w = KLSceneView::Create(form, const_cast<char*>(i ? "mixScn" : "keyScn"), args, n);
        views[i] = KLSceneView::FromWidget(w);
        XtManageChild(w);
    }
    XtManageChild(form);
}

}  // namespace testscenes
