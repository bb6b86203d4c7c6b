#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

// The image library (OpenImageIO and the many libraries it pulls in) is loaded on first use
// from a small module beside the program (lib/chirrup/chirrup_image.so, next to bin/), so that
// runs that never read or write a picture do not pay for loading it. Every call reports
// failure with a message when the module cannot be loaded.
class ImageLibrary {
  public:
    // The first four channels of the image in `path` as 8-bit RGBA, top row first; refuses
    // pictures over `maxPixels` pixels. False with `error` set on failure.
    static bool Read(const std::string& path, long long maxPixels, int* width, int* height,
                     std::vector<uint8_t>* rgba, std::string* error);
    // Filtered resample of an RGBA picture into `width` x `height`.
    static bool Resize(const uint8_t* rgba, int fromWidth, int fromHeight, uint8_t* out, int width,
                       int height, std::string* error);
    // Writes an RGBA picture to `path` as an SGI image file.
    static bool WriteSgi(const std::string& path, const uint8_t* rgba, int width, int height,
                         std::string* error);
};
