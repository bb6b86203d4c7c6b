#include "toolkit/xm/KLFiend.h"

#include <unordered_map>

#include <X11/StringDefs.h>

namespace {
// Top widget -> fiend, for every attached fiend of the process.
std::unordered_map<Widget, KLFiend*>& registry() {
    static std::unordered_map<Widget, KLFiend*> fiends;
    return fiends;
}
}  // namespace

void KLFiendCallback::Call(KLFiend* fiend) const {
    if (function)
        function(fiend ? fiend->GetWidget() : nullptr, clientData, fiend);
}

KLFiend::KLFiend(Widget parent, const char* name) : parent_(parent), name_(name ? name : "") {}

KLFiend::~KLFiend() {
    if (!widget_)
        return;
    registry().erase(widget_);
    if (!widgetGone_) {
        // Deleted by its owner rather than through the widget: the widget goes too, but must
        // not delete the object a second time.
        XtRemoveCallback(widget_, XtNdestroyCallback, destroy_cb, this);
        XtDestroyWidget(widget_);
    }
}

bool KLFiend::SetFiendCallback(const char*, KLFiendProc, XtPointer) {
    return false;
}

KLFiend* KLFiend::FromWidget(Widget widget) {
    if (!widget)
        return nullptr;
    auto found = registry().find(widget);
    return found == registry().end() ? nullptr : found->second;
}

void KLFiend::attach_widget(Widget widget) {
    if (widget_) {
        registry().erase(widget_);
        XtRemoveCallback(widget_, XtNdestroyCallback, destroy_cb, this);
    }
    widget_ = widget;
    if (!widget_)
        return;
    registry()[widget_] = this;
    XtAddCallback(widget_, XtNdestroyCallback, destroy_cb, this);
}

void KLFiend::destroy_cb(Widget, XtPointer clientData, XtPointer) {
    auto* fiend = static_cast<KLFiend*>(clientData);
    fiend->widgetGone_ = true;
    delete fiend;
}
