#include "toolkit/xm/KLAlert.h"

#include <Xm/MessageB.h>
#include <Xm/Protocols.h>
#include <Xm/Xm.h>

#include "toolkit/xm/KLXmGnome.h"

namespace {
const unsigned char kChildren[3] = {XmDIALOG_OK_BUTTON, XmDIALOG_CANCEL_BUTTON,
                                    XmDIALOG_HELP_BUTTON};

void set_label(Widget w, const char* text) {
    XmString s = XmStringCreateLocalized(const_cast<char*>(text));
    XtVaSetValues(w, XmNlabelString, s, nullptr);
    XmStringFree(s);
}
}  // namespace

KLAlert::KLAlert(Widget parent, const char* title) {
    Arg args[3];
    Cardinal n = 0;
    XmString t = XmStringCreateLocalized(const_cast<char*>(title));
    XtSetArg(args[n], XmNdialogTitle, t), n++;
    XtSetArg(args[n], XmNdialogStyle, XmDIALOG_FULL_APPLICATION_MODAL), n++;
    XtSetArg(args[n], XmNautoUnmanage, False), n++;
    dialog_ = XmCreateMessageDialog(parent, const_cast<char*>(title), args, n);
    XmStringFree(t);
    XtAddCallback(dialog_, XmNokCallback, answer_cb, this);
    XtAddCallback(dialog_, XmNcancelCallback, answer_cb, this);
    XtAddCallback(dialog_, XmNhelpCallback, answer_cb, this);
    XtAddCallback(dialog_, XmNdestroyCallback, forget_cb, this);
    Widget shell = XtParent(dialog_);
    XtVaSetValues(shell, XmNdeleteResponse, XmDO_NOTHING, nullptr);
    Atom wmDelete = XmInternAtom(XtDisplay(shell), const_cast<char*>("WM_DELETE_WINDOW"), False);
    XmAddWMProtocolCallback(shell, wmDelete, close_cb, this);
}

KLAlert::~KLAlert() {
    // The dialog goes with the alert, unless its widget tree went first.
    if (dialog_) {
        XtRemoveCallback(dialog_, XmNdestroyCallback, forget_cb, this);
        XtDestroyWidget(XtParent(dialog_));
    }
}

void KLAlert::forget_cb(Widget, XtPointer clientData, XtPointer) {
    static_cast<KLAlert*>(clientData)->dialog_ = nullptr;
}

Widget KLAlert::Button(int position) const {
    if (position < 0 || position > 2)
        return nullptr;
    return XmMessageBoxGetChild(dialog_, kChildren[position]);
}

void KLAlert::set_text(const char* text) {
    XmString s = XmStringCreateLocalized(const_cast<char*>(text ? text : ""));
    XtVaSetValues(dialog_, XmNmessageString, s, nullptr);
    XmStringFree(s);
}

void KLAlert::Show(const char* text) {
    set_text(text);
    for (int i = 0; i < 3; i++)
        XtUnmanageChild(Button(i));
    XtManageChild(dialog_);
    KLXmGnome::ProcessPending();
}

void KLAlert::Notify(const char* text, const char* button) {
    ask(text, button, nullptr, nullptr);
}

int KLAlert::Confirm(const char* text, const char* yes, const char* no) {
    return ask(text, yes, no, nullptr) == 0 ? 1 : 0;
}

int KLAlert::Confirm3(const char* text, const char* b1, const char* b2, const char* b3) {
    switch (ask(text, b1, b2, b3)) {
        case 0:
            return 1;
        case 1:
            return 2;
        default:
            return 0;
    }
}

void KLAlert::Hide() {
    if (XtIsManaged(dialog_))
        XtUnmanageChild(dialog_);
}

int KLAlert::ask(const char* text, const char* b1, const char* b2, const char* b3) {
    set_text(text);
    const char* labels[3] = {b1, b2, b3};
    lastButton_ = 0;
    for (int i = 0; i < 3; i++) {
        Widget b = Button(i);
        if (labels[i]) {
            set_label(b, labels[i]);
            XtManageChild(b);
            lastButton_ = i;
        } else {
            XtUnmanageChild(b);
        }
    }
    answer_ = -1;
    waiting_ = true;
    XtManageChild(dialog_);
    KLXmGnome::ProcessUntil([this] { return answer_ >= 0; });
    waiting_ = false;
    Hide();
    return answer_;
}

void KLAlert::answer_cb(Widget, XtPointer clientData, XtPointer callData) {
    auto* alert = static_cast<KLAlert*>(clientData);
    auto* cbs = static_cast<XmAnyCallbackStruct*>(callData);
    switch (cbs->reason) {
        case XmCR_OK:
            alert->answer_ = 0;
            break;
        case XmCR_CANCEL:
            alert->answer_ = 1;
            break;
        default:
            alert->answer_ = 2;
            break;
    }
}

void KLAlert::close_cb(Widget, XtPointer clientData, XtPointer) {
    auto* alert = static_cast<KLAlert*>(clientData);
    if (alert->waiting_)
        alert->answer_ = alert->lastButton_;
    else
        alert->Hide();
}
