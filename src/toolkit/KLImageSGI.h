#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

// A picture held in memory as 8-bit RGBA pixels, rows stored from the top down. Loads any
// file that OpenImageIO reads (SGI, PNG, JPEG, TIFF, EXR, ...), resizes with a proper
// filter, and stores SGI image files, the program's own picture format.
class KLImageSGI {
public:
    KLImageSGI(int width, int height);

    // The picture in `path`, or null when the file is missing or is not an image; the
    // reason is then in *error when given ("Could not read image [path]: ...").
    static std::unique_ptr<KLImageSGI> Load(const char* path, std::string* error = nullptr);

    std::unique_ptr<KLImageSGI> Copy() const;
    // Scales the picture to width x height (both at least 1) with a filtered resample.
    void Resize(int width, int height);
    // Writes the picture to `path` as an SGI image file; true on success.
    bool Store(const char* path, std::string* error = nullptr) const;

    int Width() const { return width_; }
    int Height() const { return height_; }
    // width * height * 4 bytes, RGBA, top row first.
    const uint8_t* Pixels() const { return pixels_.data(); }
    uint8_t* Pixels() { return pixels_.data(); }

private:
    int width_;
    int height_;
    std::vector<uint8_t> pixels_;
};
