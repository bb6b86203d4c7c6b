#pragma once

#include <string>

#include <X11/Intrinsic.h>

// A modal message box with up to three buttons, made once under a parent and used again for
// every question. Questions run a nested event loop until answered; closing the box from the
// window manager answers as its last button (cancel or dismiss) and keeps the box for reuse.
class KLAlert {
  public:
    KLAlert(Widget parent, const char* title);
    ~KLAlert();
    KLAlert(const KLAlert&) = delete;
    KLAlert& operator=(const KLAlert&) = delete;

    // Shows `text` without buttons and returns at once (a notice during long work).
    void Show(const char* text);
    // Shows `text` with one button and waits for it.
    void Notify(const char* text, const char* button);
    // Two buttons: 1 for `yes`, 0 for `no` (or a window-manager close).
    int Confirm(const char* text, const char* yes, const char* no);
    // Three buttons: 1 for the first, 2 for the second, 0 for the third (or a close).
    int Confirm3(const char* text, const char* b1, const char* b2, const char* b3);
    // Takes the box off the screen.
    void Hide();

    Widget GetDialog() const { return dialog_; }
    // The push button of the box that stands in position 0, 1 or 2 (for tests).
    Widget Button(int position) const;
    bool Waiting() const { return waiting_; }

  private:
    // Shows `text` with the given buttons (null: not shown) and waits; the chosen position.
    int ask(const char* text, const char* b1, const char* b2, const char* b3);
    void set_text(const char* text);
    static void answer_cb(Widget widget, XtPointer clientData, XtPointer callData);
    static void close_cb(Widget widget, XtPointer clientData, XtPointer callData);
    static void forget_cb(Widget widget, XtPointer clientData, XtPointer callData);

    Widget dialog_ = nullptr;
    int answer_ = -1;
    int lastButton_ = 0;
    bool waiting_ = false;
};
