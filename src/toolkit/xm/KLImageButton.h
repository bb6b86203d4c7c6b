#pragma once

#include <X11/Intrinsic.h>

#include "toolkit/xm/KLFiend.h"

class KLImageSGI;

// A button that shows a picture (borrowed; the caller keeps it alive) and has a set/clear
// state drawn as a thick frame around the picture. A press calls the press callback; a
// second press within the display's multi-click time calls the double-click callback as
// well. Callbacks get (the button's widget, their client data, this button).
class KLImageButton : public KLFiend {
  public:
    KLImageButton(Widget parent, const char* name);
    static Widget Create(Widget parent, String name, ArgList args, Cardinal count);

    void SetImage(KLImageSGI* image);
    KLImageSGI* Image() const { return image_; }
    void SetState(int set);
    int GetState() const { return state_; }
    // Style 0: flat; 1: raised frame around the picture.
    void SetButtonStyle(int style);
    void SetPressCallback(XtCallbackProc function, XtPointer clientData);
    void SetDoubleClickCallback(XtCallbackProc function, XtPointer clientData);

    // The button's own handling of a press at `time` (milliseconds of the server clock):
    // the press callback, and the double-click callback when the previous press was recent.
    void Pressed(Time time);
    void Redraw();

  private:
    static void input_cb(Widget, XtPointer clientData, XtPointer callData);
    static void expose_cb(Widget, XtPointer clientData, XtPointer);

    KLImageSGI* image_ = nullptr;
    int state_ = 0;
    int style_ = 0;
    Time lastPress_ = 0;
    XtCallbackProc press_ = nullptr;
    XtPointer pressData_ = nullptr;
    XtCallbackProc double_ = nullptr;
    XtPointer doubleData_ = nullptr;
};
