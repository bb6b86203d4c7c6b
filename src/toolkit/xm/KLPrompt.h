#pragma once

#include <string>

#include <X11/Intrinsic.h>

// A modal one-line text question (a prompt dialog made once under a parent). Closing it from
// the window manager answers as Cancel.
class KLPrompt {
  public:
    KLPrompt(Widget parent, const char* name);
    KLPrompt(const KLPrompt&) = delete;
    KLPrompt& operator=(const KLPrompt&) = delete;

    // Asks `question` with `defaultText` in the field; 1 when accepted (OK or Return), 0 when
    // cancelled. The answer is then ResponseText().
    int Prompt(const char* question, const char* defaultText);
    const char* ResponseText() const { return response_.c_str(); }

    Widget GetDialog() const { return dialog_; }
    bool Waiting() const { return waiting_; }

  private:
    static void answer_cb(Widget widget, XtPointer clientData, XtPointer callData);
    static void close_cb(Widget widget, XtPointer clientData, XtPointer callData);

    Widget dialog_ = nullptr;
    std::string response_;
    int answer_ = -1;
    bool waiting_ = false;
};
