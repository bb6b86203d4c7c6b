// The image module: picture reading, resampling and SGI writing with OpenImageIO, behind a C
// interface so that the program loads the library only when it first needs a picture.
#include "toolkit/image/ImageModule.h"

#include <OpenImageIO/imagebuf.h>
#include <OpenImageIO/imagebufalgo.h>
#include <OpenImageIO/imageio.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

namespace {
// OpenImageIO's message, on one line, or `fallback` when it has none.
std::string oiio_message(std::string text, const char* fallback) {
    while (!text.empty() && (text.back() == '\n' || text.back() == ' '))
        text.pop_back();
    std::replace(text.begin(), text.end(), '\n', ' ');
    return text.empty() ? fallback : text;
}

int fail(char* error, unsigned long size, const std::string& text) {
    if (error && size > 0) {
        std::snprintf(error, size, "%s", text.c_str());
    }
    return 0;
}

// True when the file begins with the SGI image magic number 474 (big-endian).
bool has_sgi_magic(const char* path) {
    unsigned char magic[2] = {0, 0};
    FILE* f = std::fopen(path, "rb");
    if (!f)
        return false;
    const size_t n = std::fread(magic, 1, 2, f);
    std::fclose(f);
    return n == 2 && magic[0] == 0x01 && magic[1] == 0xDA;
}
}  // namespace

extern "C" int chirrup_image_read(const char* path, long long maxPixels, int* width, int* height,
                                  unsigned char** rgba, char* error, unsigned long errorSize) {
    // Ask for alpha as it is stored, not premultiplied into the colours.
    OIIO::ImageSpec config;
    config.attribute("oiio:UnassociatedAlpha", 1);
    auto in = OIIO::ImageInput::open(path, &config);
    if (!in) {
        std::string why = oiio_message(OIIO::geterror(), "not an image file");
        // OpenImageIO picks its reader by extension; frames of a sequence ("face.0012") have
        // none, so SGI files are also recognised by their magic number.
        if (has_sgi_magic(path)) {
            in = OIIO::ImageInput::create("sgi");
            OIIO::ImageSpec opened;
            if (in && !in->open(path, opened, config)) {
                why = oiio_message(in->geterror(), "not an SGI image");
                in.reset();
            }
        }
        if (!in)
            return fail(error, errorSize, why);
    }
    // Sizes, channel count and alpha are all this reader needs; the metadata is not copied.
    const OIIO::ImageSpec layout = in->spec_dimensions(0, 0);
    const long long pixels = (long long)layout.width * layout.height;
    if (layout.deep || layout.width < 1 || layout.height < 1 || layout.nchannels < 1 ||
        pixels > maxPixels)
        return fail(error, errorSize, "unsupported picture size or layout");
    // Only the first four channels matter: grey, grey+alpha, RGB or RGBA.
    const int nch = std::min(layout.nchannels, 4);
    std::vector<unsigned char> raw(size_t(pixels) * size_t(nch));
    if (!in->read_image(0, 0, 0, nch, OIIO::TypeDesc::UINT8, raw.data()))
        return fail(error, errorSize, oiio_message(in->geterror(), "read error"));
    in->close();
    auto* out = static_cast<unsigned char*>(std::malloc(size_t(pixels) * 4));
    if (!out)
        return fail(error, errorSize, "out of memory");
    const bool grey = nch < 3;
    const int alpha = (nch == 2 || nch == 4) && layout.alpha_channel == nch - 1 ? nch - 1 : -1;
    for (long long i = 0; i < pixels; ++i) {
        const unsigned char* p = &raw[size_t(i) * size_t(nch)];
        unsigned char* o = out + i * 4;
        o[0] = p[0];
        o[1] = grey ? p[0] : p[1];
        o[2] = grey ? p[0] : p[2];
        o[3] = alpha >= 0 ? p[alpha] : 255;
    }
    *width = layout.width;
    *height = layout.height;
    *rgba = out;
    return 1;
}

extern "C" int chirrup_image_resize(const unsigned char* rgba, int fromWidth, int fromHeight,
                                    unsigned char* out, int width, int height, char* error,
                                    unsigned long errorSize) {
    OIIO::ImageSpec srcSpec(fromWidth, fromHeight, 4, OIIO::TypeDesc::UINT8);
    OIIO::ImageBuf src(srcSpec, const_cast<unsigned char*>(rgba));  // wraps, no copy
    // Filter into floats so that only the final conversion rounds (and clamps the overshoot
    // of the sharper filters).
    OIIO::ImageBuf dst(OIIO::ImageSpec(width, height, 4, OIIO::TypeDesc::FLOAT));
    if (!OIIO::ImageBufAlgo::resize(dst, src))
        return fail(error, errorSize, oiio_message(dst.geterror(), "resize failed"));
    dst.get_pixels(OIIO::ROI(0, width, 0, height, 0, 1, 0, 4), OIIO::TypeDesc::UINT8, out);
    return 1;
}

extern "C" int chirrup_image_write_sgi(const char* path, const unsigned char* rgba, int width,
                                       int height, char* error, unsigned long errorSize) {
    auto out = OIIO::ImageOutput::create("sgi");
    if (!out)
        return fail(error, errorSize, oiio_message(OIIO::geterror(), "no SGI writer"));
    OIIO::ImageSpec layout(width, height, 4, OIIO::TypeDesc::UINT8);
    layout.alpha_channel = 3;
    bool ok = out->open(path, layout) && out->write_image(OIIO::TypeDesc::UINT8, rgba);
    ok = out->close() && ok;
    if (!ok)
        return fail(error, errorSize, oiio_message(out->geterror(), "write error"));
    return 1;
}
