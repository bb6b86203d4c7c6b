#include "dialogs/RefLoadDialog.h"

#include <Xm/Protocols.h>
#include <Xm/TextF.h>
#include <Xm/Xm.h>

#include <cstdlib>
#include <string>

#include "toolkit/xm/KLXmGnome.h"

namespace {
// The strings last returned by Prefix and Ext.
char* lastPrefix = nullptr;
char* lastExt = nullptr;

void set_text(Widget field, const char* text) {
    if (field)
        XmTextFieldSetString(field, const_cast<char*>(text ? text : ""));
}

// The field's text in a string of our own (XtFree'd later by the caller's rule).
char* get_text(Widget field) {
    return field ? XmTextFieldGetString(field) : XtNewString("");
}

int get_int(Widget field) {
    char* text = get_text(field);
    int n = std::atoi(text);
    XtFree(text);
    return n;
}

void set_int(Widget field, int n) {
    set_text(field, std::to_string(n).c_str());
}
}  // namespace

RefLoadDialog::RefLoadDialog() {
    dialog = KLXmGnome::FindWidget("refDialog");
    prefixField = KLXmGnome::FindWidget("refPrefix");
    extensionField = KLXmGnome::FindWidget("refExt");
    startField = KLXmGnome::FindWidget("refStart");
    endField = KLXmGnome::FindWidget("refEnd");
    byField = KLXmGnome::FindWidget("refBy");
    okButton = KLXmGnome::FindWidget("refLoadOk");
    cancelButton = KLXmGnome::FindWidget("refLoadCancel");
    if (okButton)
        XtAddCallback(okButton, XmNactivateCallback, response_cb, this);
    if (cancelButton)
        XtAddCallback(cancelButton, XmNactivateCallback, response_cb, this);
    if (dialog) {
        Widget shell = XtParent(dialog);
        XtVaSetValues(shell, XmNdeleteResponse, XmDO_NOTHING, nullptr);
        Atom wmDelete =
            XmInternAtom(XtDisplay(shell), const_cast<char*>("WM_DELETE_WINDOW"), False);
        XmAddWMProtocolCallback(shell, wmDelete, close_cb, this);
    }
}

int RefLoadDialog::Show() {
    if (!dialog)
        return 0;
    done = 0;
    result = 0;
    XtManageChild(dialog);
    KLXmGnome::ProcessUntil([this] { return done != 0; });
    XtUnmanageChild(dialog);
    return result;
}

void RefLoadDialog::response_cb(Widget widget, XtPointer clientData, XtPointer) {
    auto* d = static_cast<RefLoadDialog*>(clientData);
    d->result = widget == d->okButton ? 1 : 0;
    d->done = 1;
}

void RefLoadDialog::close_cb(Widget, XtPointer clientData, XtPointer) {
    auto* d = static_cast<RefLoadDialog*>(clientData);
    d->result = 0;
    d->done = 1;
}

void RefLoadDialog::SetPrefix(const char* text) {
    set_text(prefixField, text);
}

char* RefLoadDialog::Prefix() {
    XtFree(lastPrefix);
    lastPrefix = get_text(prefixField);
    return lastPrefix;
}

void RefLoadDialog::SetExt(const char* text) {
    set_text(extensionField, text);
}

char* RefLoadDialog::Ext() {
    XtFree(lastExt);
    lastExt = get_text(extensionField);
    return lastExt;
}

void RefLoadDialog::SetStart(int n) {
    set_int(startField, n);
}
int RefLoadDialog::Start() {
    return get_int(startField);
}
void RefLoadDialog::SetEnd(int n) {
    set_int(endField, n);
}
int RefLoadDialog::End() {
    return get_int(endField);
}
void RefLoadDialog::SetZoom(int n) {
    set_int(byField, n);
}
int RefLoadDialog::Zoom() {
    return get_int(byField);
}
