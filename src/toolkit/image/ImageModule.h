#pragma once

// The C interface of the image module (chirrup_image.so), looked up by ImageLibrary. Each
// function returns 1 on success; on failure 0 with a one-line message in `error`
// (`errorSize` bytes, always terminated).
#define CHIRRUP_IMAGE_API __attribute__((visibility("default")))

extern "C" {
// Reads the first four channels of `path` as 8-bit RGBA into a buffer allocated with malloc
// (freed by the caller with free); pictures over `maxPixels` pixels are refused.
CHIRRUP_IMAGE_API int chirrup_image_read(const char* path, long long maxPixels, int* width,
                                         int* height, unsigned char** rgba, char* error,
                                         unsigned long errorSize);
CHIRRUP_IMAGE_API int chirrup_image_resize(const unsigned char* rgba, int fromWidth, int fromHeight,
                                           unsigned char* out, int width, int height, char* error,
                                           unsigned long errorSize);
CHIRRUP_IMAGE_API int chirrup_image_write_sgi(const char* path, const unsigned char* rgba,
                                              int width, int height, char* error,
                                              unsigned long errorSize);
}
