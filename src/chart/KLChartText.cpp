#include "chart/KLChartText.h"

#include <Xm/Xm.h>

namespace {
// The family name (or XLFD) and point size of the first font of the form's render table.
bool render_table_font(Widget form, std::string* name, double* size, bool* xlfd) {
    XmRenderTable table = nullptr;
    XtVaGetValues(form, XmNlabelRenderTable, &table, nullptr);
    if (!table)
        XtVaGetValues(form, XmNbuttonRenderTable, &table, nullptr);
    if (!table)
        return false;
    XmStringTag* tags = nullptr;
    int count = XmRenderTableGetTags(table, &tags);
    bool found = false;
    for (int i = 0; i < count && !found; i++) {
        XmRendition rendition = XmRenderTableGetRendition(table, tags[i]);
        if (!rendition)
            continue;
        XmFontType type = XmFONT_IS_FONT;
        char* fontName = nullptr;
        int fontSize = 0;
        Arg args[3];
        XtSetArg(args[0], XmNfontType, &type);
        XtSetArg(args[1], XmNfontName, &fontName);
        XtSetArg(args[2], XmNfontSize, &fontSize);
        XmRenditionRetrieve(rendition, args, 3);
        if (fontName && fontName != reinterpret_cast<char*>(XmAS_IS) && fontName[0]) {
            *name = fontName;
            *size = fontSize;
            *xlfd = type != XmFONT_IS_XFT;
            found = true;
        }
        XmRenditionFree(rendition);
    }
    for (int i = 0; i < count; i++)
        XtFree(tags[i]);
    XtFree(reinterpret_cast<char*>(tags));
    return found;
}
}  // namespace

KLChartText::KLChartText(Widget form, bool* fontFound) {
    for (int& w : widths_)
        w = -1;
    display_ = XtDisplay(form);
    const int screen = XScreenNumberOfScreen(XtScreen(form));
    visual_ = DefaultVisual(display_, screen);
    colormap_ = 0;
    XtVaGetValues(form, XmNcolormap, &colormap_, nullptr);
    if (!colormap_)
        colormap_ = DefaultColormap(display_, screen);

    std::string name;
    double size = 0.0;
    bool xlfd = false;
    *fontFound = render_table_font(form, &name, &size, &xlfd);
    if (*fontFound) {
        if (xlfd) {
            font_ = XftFontOpenXlfd(display_, screen, name.c_str());
        } else if (size > 0) {
            font_ = XftFontOpen(display_, screen, XFT_FAMILY, XftTypeString, name.c_str(), XFT_SIZE,
                                XftTypeDouble, size, nullptr);
        } else {
            font_ = XftFontOpenName(display_, screen, name.c_str());
        }
        fontName_ = name;
    }
    if (!font_) {
        fontName_ = "DejaVu Sans";
        font_ = XftFontOpen(display_, screen, XFT_FAMILY, XftTypeString, fontName_.c_str(),
                            XFT_PIXEL_SIZE, XftTypeDouble, 12.0, nullptr);
    }
}

KLChartText::~KLChartText() {
    if (draw_)
        XftDrawDestroy(draw_);
    for (auto& [pixel, c] : colours_)
        XftColorFree(display_, visual_, colormap_, &c);
    if (font_)
        XftFontClose(display_, font_);
}

int KLChartText::Width(const char* text, int length) const {
    if (!font_ || length <= 0)
        return 0;
    XGlyphInfo extents;
    XftTextExtents8(display_, font_, reinterpret_cast<const FcChar8*>(text), length, &extents);
    return extents.xOff;
}

int KLChartText::Ascent() const {
    return font_ ? font_->ascent : 0;
}
int KLChartText::Descent() const {
    return font_ ? font_->descent : 0;
}

const XftColor* KLChartText::colour(unsigned long pixel) {
    auto found = colours_.find(pixel);
    if (found != colours_.end())
        return &found->second;
    XColor x;
    x.pixel = pixel;
    XQueryColor(display_, colormap_, &x);
    XRenderColor render{x.red, x.green, x.blue, 0xffff};
    XftColor c;
    if (!XftColorAllocValue(display_, visual_, colormap_, &render, &c))
        return nullptr;
    // Draw in exactly the pixel asked for, as the core drawing does.
    c.pixel = pixel;
    return &colours_.emplace(pixel, c).first->second;
}

bool KLChartText::target(Drawable drawable) {
    if (!font_ || !drawable)
        return false;
    if (!draw_) {
        draw_ = XftDrawCreate(display_, drawable, visual_, colormap_);
    } else if (drawable_ != drawable) {
        XftDrawChange(draw_, drawable);
    }
    drawable_ = drawable;
    return draw_ != nullptr;
}

void KLChartText::Draw(Drawable drawable, unsigned long pixel, int x, int y, const char* text,
                       int length) {
    if (length <= 0 || !target(drawable))
        return;
    const XftColor* c = colour(pixel);
    if (!c)
        return;
    XftDrawString8(draw_, c, font_, x, y, reinterpret_cast<const FcChar8*>(text), length);
}

void KLChartText::DrawImage(Drawable drawable, GC gc, unsigned long pixel, unsigned long background,
                            int x, int y, const char* text, int length) {
    if (length <= 0 || !font_)
        return;
    XSetForeground(display_, gc, background);
    XFillRectangle(display_, drawable, gc, x, y - font_->ascent, unsigned(Width(text, length)),
                   unsigned(font_->ascent + font_->descent));
    Draw(drawable, pixel, x, y, text, length);
}

void KLChartText::Forget() {
    if (draw_)
        XftDrawDestroy(draw_);
    draw_ = nullptr;
    drawable_ = 0;
}

void KLChartText::DrawLetters(Drawable drawable, unsigned long pixel,
                              const std::vector<XftCharSpec>& letters) {
    if (letters.empty() || !target(drawable))
        return;
    const XftColor* c = colour(pixel);
    if (!c)
        return;
    XftDrawCharSpec(draw_, c, font_, letters.data(), int(letters.size()));
}
