#pragma once

#include <string>

#include <X11/Intrinsic.h>

class KLFiend;

// A toolkit callback held in a resource of type "FiendCallback": a function and its client
// data, called with (the fiend's top widget, client data, the fiend).
using KLFiendProc = void (*)(Widget widget, XtPointer clientData, KLFiend* fiend);

struct KLFiendCallback {
    KLFiendProc function = nullptr;
    XtPointer clientData = nullptr;

    // Calls the function when one is set.
    void Call(KLFiend* fiend) const;
};

// The resource type name of KLFiendCallback values.
#define KLRFiendCallback "FiendCallback"

// The base of every object that owns a widget tree of its own: the sync chart, the scene
// views, the image views and image buttons. The fiend is bound to its top widget by
// attach_widget; from then on KLXmGnome::FindFiend finds it by that widget's name, and
// destroying the widget deletes the fiend (the widget tree owns the object, so that a
// fiend made by a widget-table creation function lives exactly as long as its widget).
class KLFiend {
  public:
    KLFiend(Widget parent, const char* name);
    virtual ~KLFiend();
    KLFiend(const KLFiend&) = delete;
    KLFiend& operator=(const KLFiend&) = delete;

    // The top widget (null until attach_widget).
    Widget GetWidget() const { return widget_; }
    Widget GetParent() const { return parent_; }
    const std::string& Name() const { return name_; }

    // Sets the callback resource `resourceName` of this fiend; false when it has none of
    // that name. The default has none.
    virtual bool SetFiendCallback(const char* resourceName, KLFiendProc function,
                                  XtPointer clientData);

    // The fiend bound to `widget`, or null.
    static KLFiend* FromWidget(Widget widget);

  protected:
    // Binds the object to its top widget.
    void attach_widget(Widget widget);

  private:
    static void destroy_cb(Widget widget, XtPointer clientData, XtPointer callData);

    Widget parent_;
    Widget widget_ = nullptr;
    std::string name_;
    bool widgetGone_ = false;
};
