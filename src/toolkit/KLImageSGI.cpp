#include "toolkit/KLImageSGI.h"

#include <algorithm>

#include "toolkit/ImageLibrary.h"
#include "toolkit/SafeFile.h"

namespace {

// Pictures larger than this many pixels are refused as damaged or not meant for this
// program (a key-shape picture is 160 x 121, reference frames are video-sized).
constexpr long long kMaxPixels = 1LL << 26;

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
    int width = 0, height = 0;
    std::vector<uint8_t> pixels;
    std::string why;
    if (!ImageLibrary::Read(name, kMaxPixels, &width, &height, &pixels, &why)) {
        set_error(error, prefix + why);
        return nullptr;
    }
    auto image = std::make_unique<KLImageSGI>(0, 0);
    image->width_ = width;
    image->height_ = height;
    image->pixels_ = std::move(pixels);
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
    if (width_ > 0 && height_ > 0 &&
        !ImageLibrary::Resize(pixels_.data(), width_, height_, result.data(), width, height,
                              nullptr))
        std::fill(result.begin(), result.end(), 0);  // as before: a blank picture on failure
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
    // The image library writes only to a named file: it writes into the SafeFile's own.
    std::string why;
    if (!ImageLibrary::WriteSgi(file.DescriptorPath(), pixels_.data(), width_, height_, &why)) {
        set_error(error, prefix + why);
        return false;
    }
    if (!file.Commit()) {
        set_error(error, prefix + file.ErrorText());
        return false;
    }
    return true;
}
