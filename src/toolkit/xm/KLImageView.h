#pragma once

#include <X11/Intrinsic.h>

#include "toolkit/xm/KLFiend.h"

class KLImageSGI;

// A drawing area that shows a picture at an integer zoom (each picture pixel a zoom x zoom
// block), centred, or a dissolve between two pictures by a fade amount; with no picture it
// shows its background. The pictures are borrowed: the caller keeps them alive while shown.
class KLImageView : public KLFiend {
  public:
    KLImageView(Widget parent, const char* name, ArgList args, Cardinal count);

    // The creation function of a widget-table row.
    static Widget Create(Widget parent, String name, ArgList args, Cardinal count);

    // Shows `image` (null: none).
    void SetImage(KLImageSGI* image);
    // Shows `a` and `b` mixed: fade 0 is all `a`, 1 all `b` (a missing one counts as the
    // background).
    void SetImages(KLImageSGI* a, KLImageSGI* b, float fade);
    void SetFade(float fade);
    // Zoom 1 to 4; other values are clamped.
    void SetZoom(int zoom);
    int Zoom() const { return zoom_; }
    KLImageSGI* ImageA() const { return a_; }
    KLImageSGI* ImageB() const { return b_; }
    float Fade() const { return fade_; }

    // The RGB colour (0xRRGGBB) shown at picture pixel (x, y) for the current images and
    // fade, without a display; -1 outside the picture.
    long MixedPixel(int x, int y) const;

    void Redraw();

  private:
    static void expose_cb(Widget, XtPointer clientData, XtPointer);

    KLImageSGI* a_ = nullptr;
    KLImageSGI* b_ = nullptr;
    float fade_ = 0.0f;
    int zoom_ = 1;
};
