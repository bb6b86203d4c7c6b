#include "toolkit/xm/KLImageView.h"

#include <X11/Xutil.h>
#include <Xm/DrawingA.h>
#include <Xm/Xm.h>

#include <algorithm>
#include <vector>

#include "toolkit/KLImageSGI.h"

namespace {
// Position of the lowest set bit of a colour mask and the mask's width.
void mask_shift(unsigned long mask, int* shift, int* bits) {
    *shift = 0;
    *bits = 0;
    if (!mask)
        return;
    while (!(mask & 1))
        mask >>= 1, ++*shift;
    while (mask & 1)
        mask >>= 1, ++*bits;
}

unsigned long channel(unsigned value, unsigned long mask) {
    int shift, bits;
    mask_shift(mask, &shift, &bits);
    unsigned long v = bits >= 8 ? (value << (bits - 8)) : (value >> (8 - bits));
    return (v << shift) & mask;
}
}  // namespace

KLImageView::KLImageView(Widget parent, const char* name, ArgList args, Cardinal count)
    : KLFiend(parent, name) {
    Widget w = XmCreateDrawingArea(parent, const_cast<char*>(name), args, count);
    XtAddCallback(w, XmNexposeCallback, expose_cb, this);
    attach_widget(w);
}

Widget KLImageView::Create(Widget parent, String name, ArgList args, Cardinal count) {
    return (new KLImageView(parent, name, args, count))->GetWidget();
}

void KLImageView::SetImage(KLImageSGI* image) {
    SetImages(image, nullptr, 0.0f);
}

void KLImageView::SetImages(KLImageSGI* a, KLImageSGI* b, float fade) {
    a_ = a;
    b_ = b;
    fade_ = std::clamp(fade, 0.0f, 1.0f);
    Redraw();
}

void KLImageView::SetFade(float fade) {
    fade_ = std::clamp(fade, 0.0f, 1.0f);
    Redraw();
}

void KLImageView::SetZoom(int zoom) {
    zoom_ = std::clamp(zoom, 1, 4);
    Redraw();
}

long KLImageView::MixedPixel(int x, int y) const {
    const KLImageSGI* base = a_ ? a_ : b_;
    if (!base || x < 0 || y < 0 || x >= base->Width() || y >= base->Height())
        return -1;
    auto sample = [x, y](const KLImageSGI* img, int c) -> float {
        if (!img || x >= img->Width() || y >= img->Height())
            return 0.0f;
        return img->Pixels()[(size_t(y) * img->Width() + x) * 4 + c];
    };
    float wb = b_ ? fade_ : 0.0f;
    if (!a_)
        wb = fade_;
    long rgb = 0;
    for (int c = 0; c < 3; c++) {
        float v = sample(a_, c) * (1.0f - wb) + sample(b_, c) * wb;
        rgb = (rgb << 8) | std::clamp(int(v + 0.5f), 0, 255);
    }
    return rgb;
}

void KLImageView::Redraw() {
    Widget w = GetWidget();
    if (!w || !XtIsRealized(w))
        return;
    Display* dpy = XtDisplay(w);
    Window win = XtWindow(w);
    XClearWindow(dpy, win);
    const KLImageSGI* base = a_ ? a_ : b_;
    if (!base)
        return;
    Dimension width = 0, height = 0;
    XtVaGetValues(w, XmNwidth, &width, XmNheight, &height, nullptr);
    int iw = base->Width() * zoom_, ih = base->Height() * zoom_;
    int ox = (int(width) - iw) / 2, oy = (int(height) - ih) / 2;
    // Only the visible part of the zoomed picture is converted.
    int x0 = std::max(0, -ox), y0 = std::max(0, -oy);
    int x1 = std::min(iw, int(width) - ox), y1 = std::min(ih, int(height) - oy);
    if (x1 <= x0 || y1 <= y0)
        return;
    Visual* visual = DefaultVisual(dpy, DefaultScreen(dpy));
    int depth = DefaultDepth(dpy, DefaultScreen(dpy));
    XImage* img = XCreateImage(dpy, visual, depth, ZPixmap, 0, nullptr, x1 - x0, y1 - y0, 32, 0);
    if (!img)
        return;
    img->data = static_cast<char*>(malloc(size_t(img->bytes_per_line) * img->height));
    for (int y = y0; y < y1; y++) {
        for (int x = x0; x < x1; x++) {
            long rgb = MixedPixel(x / zoom_, y / zoom_);
            if (rgb < 0)
                rgb = 0;
            unsigned long pixel = channel((rgb >> 16) & 255, visual->red_mask) |
                                  channel((rgb >> 8) & 255, visual->green_mask) |
                                  channel(rgb & 255, visual->blue_mask);
            XPutPixel(img, x - x0, y - y0, pixel);
        }
    }
    GC gc = DefaultGC(dpy, DefaultScreen(dpy));
    XPutImage(dpy, win, gc, img, 0, 0, ox + x0, oy + y0, x1 - x0, y1 - y0);
    XDestroyImage(img);
}

void KLImageView::expose_cb(Widget, XtPointer clientData, XtPointer) {
    static_cast<KLImageView*>(clientData)->Redraw();
}
