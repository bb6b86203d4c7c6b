#include "toolkit/xm/KLPrompt.h"

#include <Xm/Protocols.h>
#include <Xm/SelectioB.h>
#include <Xm/Xm.h>

#include "toolkit/xm/KLXmGnome.h"

KLPrompt::KLPrompt(Widget parent, const char* name) {
    Arg args[2];
    Cardinal n = 0;
    XtSetArg(args[n], XmNdialogStyle, XmDIALOG_FULL_APPLICATION_MODAL), n++;
    XtSetArg(args[n], XmNautoUnmanage, False), n++;
    dialog_ = XmCreatePromptDialog(parent, const_cast<char*>(name), args, n);
    XtUnmanageChild(XmSelectionBoxGetChild(dialog_, XmDIALOG_HELP_BUTTON));
    XtAddCallback(dialog_, XmNokCallback, answer_cb, this);
    XtAddCallback(dialog_, XmNcancelCallback, answer_cb, this);
    Widget shell = XtParent(dialog_);
    XtVaSetValues(shell, XmNdeleteResponse, XmDO_NOTHING, nullptr);
    Atom wmDelete = XmInternAtom(XtDisplay(shell), const_cast<char*>("WM_DELETE_WINDOW"), False);
    XmAddWMProtocolCallback(shell, wmDelete, close_cb, this);
}

int KLPrompt::Prompt(const char* question, const char* defaultText) {
    XmString q = XmStringCreateLocalized(const_cast<char*>(question ? question : ""));
    XmString d = XmStringCreateLocalized(const_cast<char*>(defaultText ? defaultText : ""));
    XtVaSetValues(dialog_, XmNselectionLabelString, q, XmNtextString, d, nullptr);
    XmStringFree(q);
    XmStringFree(d);
    answer_ = -1;
    waiting_ = true;
    XtManageChild(dialog_);
    KLXmGnome::ProcessUntil([this] { return answer_ >= 0; });
    waiting_ = false;
    XtUnmanageChild(dialog_);
    return answer_;
}

void KLPrompt::answer_cb(Widget, XtPointer clientData, XtPointer callData) {
    auto* prompt = static_cast<KLPrompt*>(clientData);
    auto* cbs = static_cast<XmSelectionBoxCallbackStruct*>(callData);
    if (cbs->reason == XmCR_OK) {
        char* text = nullptr;
        XmStringGetLtoR(cbs->value, const_cast<char*>(XmFONTLIST_DEFAULT_TAG), &text);
        prompt->response_ = text ? text : "";
        XtFree(text);
        prompt->answer_ = 1;
    } else {
        prompt->answer_ = 0;
    }
}

void KLPrompt::close_cb(Widget, XtPointer clientData, XtPointer) {
    auto* prompt = static_cast<KLPrompt*>(clientData);
    if (prompt->waiting_)
        prompt->answer_ = 0;
}
