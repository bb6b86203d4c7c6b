// Pictures are written here with OpenImageIO in other formats, then loaded, resized and stored
// as SGI files through KLImageSGI.

#include <OpenImageIO/imageio.h>
#include <fstream>
#include <optional>

#include "toolkit/KLImageSGI.h"
#include "toolkit_test_util.h"

namespace fs = std::filesystem;

namespace {

using Bytes = std::vector<uint8_t>;

class ImageTest : public TempDirTest {
  protected:
    // Writes `pixels` (nchannels 8-bit values per pixel, top row first) in the format the
    // extension of `leaf` picks, with alpha kept as given rather than taken as premultiplied.
    std::string Write(const std::string& leaf, int w, int h, int nchannels, const Bytes& pixels) {
        const std::string path = Path(leaf);
        auto out = OIIO::ImageOutput::create(path);
        OIIO::ImageSpec layout(w, h, nchannels, OIIO::TypeDesc::UINT8);
        layout.alpha_channel = nchannels == 4 ? 3 : -1;
        layout.attribute("oiio:UnassociatedAlpha", 1);
        EXPECT_TRUE(out && out->open(path, layout) &&
                    out->write_image(OIIO::TypeDesc::UINT8, pixels.data()) && out->close());
        return path;
    }
    static Bytes Rgba(const KLImageSGI& image) {
        return Bytes(image.Pixels(), image.Pixels() + size_t(image.Width() * image.Height()) * 4);
    }
    static Bytes At(const KLImageSGI& image, int x, int y) {
        const uint8_t* p = image.Pixels() + (size_t(y) * size_t(image.Width()) + size_t(x)) * 4;
        return Bytes(p, p + 4);
    }
};

TEST_F(ImageTest, GradientLoadsTopDownStoresAsSgiAndResizesSmoothly) {
    // 64 x 32: red rises left to right (0..252), green top to bottom (0..248), blue is 77.
    Bytes gradient;
    for (int y = 0; y < 32; ++y)
        for (int x = 0; x < 64; ++x)
            gradient.insert(gradient.end(), {uint8_t(x * 4), uint8_t(y * 8), 77});
    std::string error;
    auto image = KLImageSGI::Load(Write("gradient.png", 64, 32, 3, gradient).c_str(), &error);
    ASSERT_TRUE(image) << error;
    ASSERT_EQ(std::make_pair(image->Width(), image->Height()), std::make_pair(64, 32));
    for (int y = 0; y < 32; ++y)
        for (int x = 0; x < 64; ++x)  // row 0 is the top row of the file, opaque
            ASSERT_EQ(At(*image, x, y), (Bytes{uint8_t(x * 4), uint8_t(y * 8), 77, 255}));

    image->Pixels()[3] = 17;                     // one translucent pixel: alpha must survive too
    const std::string sgi = Path("mouth.0012");  // no extension: SGI whatever the name
    ASSERT_TRUE(image->Store(sgi.c_str(), &error)) << error;
    char magic[2] = {0, 0};
    std::ifstream(sgi, std::ios::binary).read(magic, 2);
    EXPECT_EQ(std::string(magic, 2), "\x01\xDA");  // SGI image magic 474
    auto back = KLImageSGI::Load(sgi.c_str(), &error);
    ASSERT_TRUE(back) << error;
    EXPECT_EQ(Rgba(*back), Rgba(*image));

    image->Pixels()[3] = 255;
    auto big = image->Copy();
    big->Resize(160, 121);  // key-shape picture size: the middle stays near the ramp's middle
    ASSERT_EQ(std::make_pair(big->Width(), big->Height()), std::make_pair(160, 121));
    EXPECT_NEAR(At(*big, 80, 60)[0], 128, 6);
    image->Resize(0, -5);  // never below one pixel
    EXPECT_EQ(image->Width() * image->Height(), 1);
    EXPECT_NEAR(image->Pixels()[0], 126, 6);  // the mean of the ramp
}

// Colours come back as stored, even under zero alpha.
TEST_F(ImageTest, StoredAlphaIsKept) {
    const Bytes rgba = {200, 100, 50, 0, 10, 20, 30, 128};
    auto tif = KLImageSGI::Load(Write("rgba.tif", 2, 1, 4, rgba).c_str());
    ASSERT_TRUE(tif);
    EXPECT_EQ(Rgba(*tif), rgba);
}

TEST_F(ImageTest, StoreFailureSaysWhyAndLeavesNoFile) {
    const std::string path = Path("missing-dir/x.sgi");
    std::string error;
    EXPECT_FALSE(KLImageSGI(4, 4).Store(path.c_str(), &error));
    EXPECT_EQ(error.rfind("Could not write image [" + path + "]: ", 0), 0u) << error;
    EXPECT_FALSE(fs::exists(path));
    EXPECT_FALSE(KLImageSGI(0, 3).Store(Path("empty.sgi").c_str(), &error));
    EXPECT_EQ(error, "Could not write image [" + Path("empty.sgi") + "]: the picture is empty");
    EXPECT_FALSE(fs::exists(Path("empty.sgi")));
}

// Files that are not pictures (no content: no file at all) each give null and a one-line
// message naming the file; "cut.png" is a real PNG cut inside its pixel data.
TEST_F(ImageTest, NotAnImageGivesNullAndAMessage) {
    Bytes noise;  // does not compress: the pixel data is most of the file
    uint32_t seed = 1;
    for (int i = 0; i < 48 * 48 * 3; ++i)
        noise.push_back(uint8_t((seed = seed * 1664525u + 1013904223u) >> 24));
    const std::string png = Slurp(Write("whole.png", 48, 48, 3, noise));
    ASSERT_GT(png.size(), 6000u);
    ASSERT_NE(KLImageSGI::Load(Path("whole.png").c_str()), nullptr) << "the uncut file reads";
    const std::string signature("\x89PNG\r\n\x1a\n", 8);
    ASSERT_EQ(png.substr(0, 8), signature);
    const std::vector<std::pair<const char*, std::optional<std::string>>> cases = {
        {"text.sgi", "begin keyset\n"},
        {"empty.png", ""},
        {"cut.png", png.substr(0, png.size() / 2)},
        {"missing.sgi", std::nullopt},
        {"face.0001", "\x01\xDA\x01"},
    };
    for (const auto& [leaf, content] : cases) {
        const std::string path = Path(leaf);
        if (content) {
            std::ofstream(path, std::ios::binary).write(content->data(), content->size());
            ASSERT_EQ(fs::file_size(path), content->size()) << leaf;
        }
        std::string error;
        EXPECT_EQ(KLImageSGI::Load(path.c_str(), &error), nullptr) << leaf;
        const std::string head = "Could not read image [" + path + "]: ";
        EXPECT_EQ(error.rfind(head, 0), 0u) << error;
        EXPECT_GT(error.size(), head.size());
        EXPECT_EQ(error.find('\n'), std::string::npos) << error;
    }
}

}  // namespace
