#pragma once

#include <X11/Intrinsic.h>

// The modal dialog in which a numbered picture sequence is named: prefix, extension, first
// and last frame numbers and the zoom. Its widgets belong to the main window's widget tree
// ("refDialog" and its fields) and are only looked up here. The field "refBy" carries the
// zoom; the frame step is always 1.
class RefLoadDialog {
  public:
    RefLoadDialog();
    RefLoadDialog(const RefLoadDialog&) = delete;
    RefLoadDialog& operator=(const RefLoadDialog&) = delete;

    // Manages the dialog and processes events until OK or Cancel (or a window-manager
    // close, which is Cancel); 1 for OK, 0 for Cancel.
    int Show();

    void SetPrefix(const char* text);
    // The field's text; valid until the next call of Prefix (one string is kept).
    char* Prefix();
    void SetExt(const char* text);
    char* Ext();
    void SetStart(int n);
    int Start();
    void SetEnd(int n);
    int End();
    void SetBy(int) {}
    int By() { return 1; }
    void SetZoom(int n);
    int Zoom();

    static void response_cb(Widget widget, XtPointer clientData, XtPointer callData);

    Widget dialog = nullptr;
    Widget prefixField = nullptr;
    Widget extensionField = nullptr;
    Widget startField = nullptr;
    Widget endField = nullptr;
    Widget byField = nullptr;
    Widget okButton = nullptr;
    Widget cancelButton = nullptr;
    int result = 0;
    int done = 0;

  private:
    static void close_cb(Widget widget, XtPointer clientData, XtPointer callData);
};
