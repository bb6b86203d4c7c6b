#include "toolkit/KLImageSGI.h"

#include <OpenImageIO/imagebuf.h>
#include <OpenImageIO/imagebufalgo.h>
#include <OpenImageIO/imageio.h>
#include <algorithm>
#include <cstdio>

#include "toolkit/SafeFile.h"

namespace {

// Pictures larger than this many pixels are refused as damaged or not meant for this
// program (a key-shape picture is 160 x 121, reference frames are video-sized).
constexpr long long kMaxPixels = 1LL << 26;

// OpenImageIO's message, on one line, or `fallback` when it has none.
std::string oiio_message(std::string text, const char* fallback) {
    while (!text.empty() && (text.back() == '\n' || text.back() == ' '))
        text.pop_back();
    std::replace(text.begin(), text.end(), '\n', ' ');
    return text.empty() ? fallback : text;
}

// True when the file begins with the SGI image magic number 474 (big-endian).
bool has_sgi_magic(const std::string& path) {
    unsigned char magic[2] = {0, 0};
    FILE* f = std::fopen(path.c_str(), "rb");
    if (!f)
        return false;
    const size_t n = std::fread(magic, 1, 2, f);
    std::fclose(f);
    return n == 2 && magic[0] == 0x01 && magic[1] == 0xDA;
}

void set_error(std::string* error, const std::string& text) {
    if (error)
        *error = text;
}

}  // namespace

KLImageSGI::KLImageSGI(int width, int height)
    : width_(std::max(width, 0)),
      height_(std::max(height, 0)),
      pixels_(size_t(width_) * size_t(height_) * 4, 0) {}

std::unique_ptr<KLImageSGI> KLImageSGI::Load(const char* path, std::string* error) {
    const std::string name = path ? path : "";
    const std::string prefix = "Could not read image [" + name + "]: ";
    if (name.empty()) {
        set_error(error, prefix + "no file name given");
        return nullptr;
    }
    // Ask for alpha as it is stored, not premultiplied into the colours.
    OIIO::ImageSpec config;
    config.attribute("oiio:UnassociatedAlpha", 1);
    auto in = OIIO::ImageInput::open(name, &config);
    if (!in) {
        std::string why = oiio_message(OIIO::geterror(), "not an image file");
        // OpenImageIO picks its reader by extension; frames of a sequence ("face.0012") have
        // none, so SGI files are also recognised by their magic number.
        if (has_sgi_magic(name)) {
            in = OIIO::ImageInput::create("sgi");
            OIIO::ImageSpec opened;
            if (in && !in->open(name, opened, config)) {
                why = oiio_message(in->geterror(), "not an SGI image");
                in.reset();
            }
        }
        if (!in) {
            set_error(error, prefix + why);
            return nullptr;
        }
    }
    // Sizes, channel count and alpha are all this reader needs; the metadata is not copied.
    const OIIO::ImageSpec layout = in->spec_dimensions(0, 0);
    const long long pixels = (long long)layout.width * layout.height;
    if (layout.deep || layout.width < 1 || layout.height < 1 || layout.nchannels < 1 ||
        pixels > kMaxPixels) {
        set_error(error, prefix + "unsupported picture size or layout");
        return nullptr;
    }

    // Only the first four channels matter: grey, grey+alpha, RGB or RGBA.
    const int nch = std::min(layout.nchannels, 4);
    std::vector<uint8_t> raw(size_t(pixels) * size_t(nch));
    if (!in->read_image(0, 0, 0, nch, OIIO::TypeDesc::UINT8, raw.data())) {
        set_error(error, prefix + oiio_message(in->geterror(), "read error"));
        return nullptr;
    }
    in->close();

    auto image = std::make_unique<KLImageSGI>(layout.width, layout.height);
    const bool grey = nch < 3;
    const int alpha = (nch == 2 || nch == 4) && layout.alpha_channel == nch - 1 ? nch - 1 : -1;
    uint8_t* out = image->pixels_.data();
    for (long long i = 0; i < pixels; ++i, out += 4) {
        const uint8_t* p = &raw[size_t(i) * size_t(nch)];
        out[0] = p[0];
        out[1] = grey ? p[0] : p[1];
        out[2] = grey ? p[0] : p[2];
        out[3] = alpha >= 0 ? p[alpha] : 255;
    }
    return image;
}

std::unique_ptr<KLImageSGI> KLImageSGI::Copy() const {
    return std::make_unique<KLImageSGI>(*this);
}

void KLImageSGI::Resize(int width, int height) {
    width = std::max(width, 1);
    height = std::max(height, 1);
    if (width == width_ && height == height_)
        return;
    std::vector<uint8_t> result(size_t(width) * size_t(height) * 4, 0);
    if (width_ > 0 && height_ > 0) {
        OIIO::ImageSpec srcSpec(width_, height_, 4, OIIO::TypeDesc::UINT8);
        OIIO::ImageBuf src(srcSpec, pixels_.data());  // wraps our pixels, no copy
        // Filter into floats so that only the final conversion rounds (and clamps the
        // overshoot of the sharper filters).
        OIIO::ImageBuf dst(OIIO::ImageSpec(width, height, 4, OIIO::TypeDesc::FLOAT));
        if (OIIO::ImageBufAlgo::resize(dst, src)) {
            dst.get_pixels(OIIO::ROI(0, width, 0, height, 0, 1, 0, 4), OIIO::TypeDesc::UINT8,
                           result.data());
        }
    }
    width_ = width;
    height_ = height;
    pixels_ = std::move(result);
}

bool KLImageSGI::Store(const char* path, std::string* error) const {
    const std::string name = path ? path : "";
    const std::string prefix = "Could not write image [" + name + "]: ";
    if (name.empty()) {
        set_error(error, prefix + "no file name given");
        return false;
    }
    if (width_ < 1 || height_ < 1) {
        set_error(error, prefix + "the picture is empty");
        return false;
    }
    SafeFile file(name);
    if (!file.IsOpen()) {
        set_error(error, prefix + file.ErrorText());
        return false;
    }
    auto out = OIIO::ImageOutput::create("sgi");
    if (!out) {
        set_error(error, prefix + oiio_message(OIIO::geterror(), "no SGI writer"));
        return false;
    }
    OIIO::ImageSpec layout(width_, height_, 4, OIIO::TypeDesc::UINT8);
    layout.alpha_channel = 3;
    // The image library writes only to a named file: it writes into the SafeFile's own.
    bool ok = out->open(file.DescriptorPath(), layout) &&
              out->write_image(OIIO::TypeDesc::UINT8, pixels_.data());
    ok = out->close() && ok;
    if (!ok) {
        set_error(error, prefix + oiio_message(out->geterror(), "write error"));
        return false;
    }
    if (!file.Commit()) {
        set_error(error, prefix + file.ErrorText());
        return false;
    }
    return true;
}
