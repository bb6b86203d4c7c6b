#pragma once

#include <map>
#include <string>
#include <vector>

#include <X11/Intrinsic.h>
#include <X11/Xft/Xft.h>

// The sync chart's text: one Xft font (the first font of a form's render table, else
// "DejaVu Sans") drawn onto pixmaps and windows in pixel colours. Owns the font, the Xft
// drawing context and the colours it allocates.
class KLChartText {
  public:
    // Opens the font of `form`'s render table. `fontFound` tells whether the render table
    // yielded a font (the fallback font is used otherwise).
    KLChartText(Widget form, bool* fontFound);
    ~KLChartText();
    KLChartText(const KLChartText&) = delete;
    KLChartText& operator=(const KLChartText&) = delete;

    bool Usable() const { return font_ != nullptr; }
    // Width in pixels of the text, 0 without a font.
    int Width(const char* text, int length) const;
    int Ascent() const;
    int Descent() const;

    // Draws the text with its baseline's left end at (x, y).
    void Draw(Drawable drawable, unsigned long pixel, int x, int y, const char* text, int length);
    // Draws single characters at their own positions, in one request.
    void DrawLetters(Drawable drawable, unsigned long pixel,
                     const std::vector<XftCharSpec>& letters);
    // Draws the text on a filled rectangle of `background` as high as the font.
    void DrawImage(Drawable drawable, GC gc, unsigned long pixel, unsigned long background, int x,
                   int y, const char* text, int length);

    // Lets go of the drawable last drawn on, before it is freed.
    void Forget();

    const std::string& FontName() const { return fontName_; }

  private:
    const XftColor* colour(unsigned long pixel);
    bool target(Drawable drawable);

    Display* display_;
    Visual* visual_;
    Colormap colormap_;
    XftFont* font_ = nullptr;
    XftDraw* draw_ = nullptr;
    Drawable drawable_ = 0;
    std::map<unsigned long, XftColor> colours_;
    std::string fontName_;
    mutable int widths_[256];  // widths of single characters, -1 until measured
};
