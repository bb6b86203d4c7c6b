#include "toolkit/xm/KLImageButton.h"

#include <X11/Xutil.h>
#include <Xm/DrawingA.h>
#include <Xm/Xm.h>

#include <cstdlib>

#include "toolkit/KLImageSGI.h"

namespace {
constexpr int kFrame = 4;  // pixels of frame around the picture

unsigned long to_pixel(Visual* visual, const uint8_t* rgba) {
    auto put = [](unsigned v, unsigned long mask) {
        if (!mask)
            return 0ul;
        int shift = 0, bits = 0;
        unsigned long m = mask;
        while (!(m & 1))
            m >>= 1, shift++;
        while (m & 1)
            m >>= 1, bits++;
        unsigned long x = bits >= 8 ? (v << (bits - 8)) : (v >> (8 - bits));
        return (x << shift) & mask;
    };
    return put(rgba[0], visual->red_mask) | put(rgba[1], visual->green_mask) |
           put(rgba[2], visual->blue_mask);
}
}  // namespace

KLImageButton::KLImageButton(Widget parent, const char* name) : KLFiend(parent, name) {
    Arg args[2];
    XtSetArg(args[0], XmNwidth, 80 + 2 * kFrame);
    XtSetArg(args[1], XmNheight, 60 + 2 * kFrame);
    Widget w = XmCreateDrawingArea(parent, const_cast<char*>(name), args, 2);
    XtAddCallback(w, XmNinputCallback, input_cb, this);
    XtAddCallback(w, XmNexposeCallback, expose_cb, this);
    attach_widget(w);
}

Widget KLImageButton::Create(Widget parent, String name, ArgList, Cardinal) {
    return (new KLImageButton(parent, name))->GetWidget();
}

void KLImageButton::SetImage(KLImageSGI* image) {
    image_ = image;
    if (image_)
        XtVaSetValues(GetWidget(), XmNwidth, Dimension(image_->Width() + 2 * kFrame), XmNheight,
                      Dimension(image_->Height() + 2 * kFrame), nullptr);
    Redraw();
}

void KLImageButton::SetState(int set) {
    state_ = set ? 1 : 0;
    Redraw();
}

void KLImageButton::SetButtonStyle(int style) {
    style_ = style;
    Redraw();
}

void KLImageButton::SetPressCallback(XtCallbackProc function, XtPointer clientData) {
    press_ = function;
    pressData_ = clientData;
}

void KLImageButton::SetDoubleClickCallback(XtCallbackProc function, XtPointer clientData) {
    double_ = function;
    doubleData_ = clientData;
}

void KLImageButton::Pressed(Time time) {
    Widget w = GetWidget();
    int multi = XtGetMultiClickTime(XtDisplay(w));
    bool isDouble = lastPress_ && time >= lastPress_ && time - lastPress_ <= Time(multi);
    lastPress_ = isDouble ? 0 : time;
    if (press_)
        press_(w, pressData_, this);
    if (isDouble && double_)
        double_(w, doubleData_, this);
}

void KLImageButton::input_cb(Widget, XtPointer clientData, XtPointer callData) {
    auto* cbs = static_cast<XmDrawingAreaCallbackStruct*>(callData);
    if (cbs->event && cbs->event->type == ButtonPress && cbs->event->xbutton.button == Button1)
        static_cast<KLImageButton*>(clientData)->Pressed(cbs->event->xbutton.time);
}

void KLImageButton::expose_cb(Widget, XtPointer clientData, XtPointer) {
    static_cast<KLImageButton*>(clientData)->Redraw();
}

void KLImageButton::Redraw() {
    Widget w = GetWidget();
    if (!w || !XtIsRealized(w))
        return;
    Display* dpy = XtDisplay(w);
    Window win = XtWindow(w);
    int screen = DefaultScreen(dpy);
    GC gc = DefaultGC(dpy, screen);
    XClearWindow(dpy, win);
    Dimension width = 0, height = 0;
    Pixel fg = 0, top = 0, bottom = 0;
    XtVaGetValues(w, XmNwidth, &width, XmNheight, &height, XmNforeground, &fg, XmNtopShadowColor,
                  &top, XmNbottomShadowColor, &bottom, nullptr);
    if (image_ && image_->Width() > 0 && image_->Height() > 0) {
        Visual* visual = DefaultVisual(dpy, screen);
        XImage* img = XCreateImage(dpy, visual, DefaultDepth(dpy, screen), ZPixmap, 0, nullptr,
                                   image_->Width(), image_->Height(), 32, 0);
        if (img) {
            img->data = static_cast<char*>(malloc(size_t(img->bytes_per_line) * img->height));
            const uint8_t* p = image_->Pixels();
            for (int y = 0; y < image_->Height(); y++)
                for (int x = 0; x < image_->Width(); x++)
                    XPutPixel(img, x, y,
                              to_pixel(visual, p + (size_t(y) * image_->Width() + x) * 4));
            XPutImage(dpy, win, gc, img, 0, 0, kFrame, kFrame, image_->Width(), image_->Height());
            XDestroyImage(img);
        }
    }
    // The set state is a solid frame in the foreground colour; style 1 adds a raised edge.
    XGCValues values;
    values.line_width = state_ ? kFrame : 1;
    values.foreground = state_ ? fg : (style_ ? top : fg);
    XChangeGC(dpy, gc, GCLineWidth | GCForeground, &values);
    int inset = values.line_width / 2;
    XDrawRectangle(dpy, win, gc, inset, inset, width - 1 - 2 * inset, height - 1 - 2 * inset);
    values.line_width = 0;
    values.foreground = BlackPixel(dpy, screen);
    XChangeGC(dpy, gc, GCLineWidth | GCForeground, &values);
    (void)bottom;
}
