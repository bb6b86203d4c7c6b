// Pictures are written here with OpenImageIO in other formats, then loaded, resized and stored
// as SGI files through KLImageSGI.

#include <gtest/gtest.h>
#include <unistd.h>

#include <OpenImageIO/imageio.h>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "toolkit/KLImageSGI.h"

namespace fs = std::filesystem;

namespace {

class ImageTest : public ::testing::Test {
  protected:
    void SetUp() override {
        dir_ = fs::temp_directory_path() /
               ("chirrup-image-" + std::to_string(getpid()) + "-" +
                ::testing::UnitTest::GetInstance()->current_test_info()->name());
        fs::remove_all(dir_);
        fs::create_directories(dir_);
    }
    void TearDown() override { fs::remove_all(dir_); }

    std::string Path(const std::string& leaf) const { return (dir_ / leaf).string(); }

    // Writes `pixels` (nchannels 8-bit values per pixel, top row first) in the format the
    // name's extension picks.
    static void Write(const std::string& path, int w, int h, int nchannels,
                      const std::vector<uint8_t>& pixels) {
        auto out = OIIO::ImageOutput::create(path);
        ASSERT_TRUE(out) << path;
        OIIO::ImageSpec spec(w, h, nchannels, OIIO::TypeDesc::UINT8);
        if (nchannels == 4 || nchannels == 2)
            spec.alpha_channel = nchannels - 1;
        // Keep alpha as given rather than taken as premultiplied.
        spec.attribute("oiio:UnassociatedAlpha", 1);
        ASSERT_TRUE(out->open(path, spec)) << out->geterror();
        ASSERT_TRUE(out->write_image(OIIO::TypeDesc::UINT8, pixels.data())) << out->geterror();
        ASSERT_TRUE(out->close());
    }

    fs::path dir_;
};

// RGB gradient: red rises left to right (0..252 over 64 columns), green rises top to bottom,
// blue is constant.
std::vector<uint8_t> gradient(int w, int h) {
    std::vector<uint8_t> p;
    for (int y = 0; y < h; ++y) {
        for (int x = 0; x < w; ++x) {
            p.push_back(uint8_t(x * 4));
            p.push_back(uint8_t(y * 8));
            p.push_back(77);
        }
    }
    return p;
}

const uint8_t* at(const KLImageSGI& image, int x, int y) {
    return image.Pixels() + (size_t(y) * size_t(image.Width()) + size_t(x)) * 4;
}

TEST_F(ImageTest, LoadsRgbPngTopDownWithOpaqueAlpha) {
    const std::string path = Path("gradient.png");
    Write(path, 64, 32, 3, gradient(64, 32));
    auto image = KLImageSGI::Load(path.c_str());
    ASSERT_TRUE(image);
    EXPECT_EQ(image->Width(), 64);
    EXPECT_EQ(image->Height(), 32);
    for (int y = 0; y < 32; ++y) {
        for (int x = 0; x < 64; ++x) {
            const uint8_t* p = at(*image, x, y);
            ASSERT_EQ(p[0], x * 4);
            ASSERT_EQ(p[1], y * 8);  // row 0 is the top row of the file
            ASSERT_EQ(p[2], 77);
            ASSERT_EQ(p[3], 255);
        }
    }
}

TEST_F(ImageTest, GreyBecomesRgbAndStoredAlphaIsKept) {
    const std::string grey = Path("grey.png");
    Write(grey, 3, 1, 1, {0, 128, 255});
    auto g = KLImageSGI::Load(grey.c_str());
    ASSERT_TRUE(g);
    const std::vector<uint8_t> expected = {0, 0, 0, 255, 128, 128, 128, 255, 255, 255, 255, 255};
    EXPECT_EQ(std::vector<uint8_t>(g->Pixels(), g->Pixels() + 12), expected);

    const std::string rgba = Path("rgba.tif");
    Write(rgba, 2, 1, 4, {200, 100, 50, 0, 10, 20, 30, 128});
    auto a = KLImageSGI::Load(rgba.c_str());
    ASSERT_TRUE(a);
    // Colours come back as stored, even under zero alpha.
    const std::vector<uint8_t> expectedRgba = {200, 100, 50, 0, 10, 20, 30, 128};
    EXPECT_EQ(std::vector<uint8_t>(a->Pixels(), a->Pixels() + 8), expectedRgba);
}

TEST_F(ImageTest, ResizeGivesExactSizesAndKeepsAGradientSmooth) {
    const std::string path = Path("gradient.tif");
    Write(path, 64, 32, 3, gradient(64, 32));
    auto image = KLImageSGI::Load(path.c_str());
    ASSERT_TRUE(image);
    auto big = image->Copy();
    big->Resize(160, 121);  // key-shape picture size
    ASSERT_EQ(big->Width(), 160);
    ASSERT_EQ(big->Height(), 121);
    for (int y = 0; y < 121; ++y) {
        for (int x = 1; x < 160; ++x) {
            const int step = at(*big, x, y)[0] - at(*big, x - 1, y)[0];
            ASSERT_GE(step, -1) << x << "," << y;  // rising, up to rounding
            ASSERT_LE(step, 4) << x << "," << y;   // without jumps
            ASSERT_NEAR(at(*big, x, y)[2], 77, 1);
            ASSERT_EQ(at(*big, x, y)[3], 255);
        }
    }
    // The ends stay near the ends of the ramp, the middle near its middle.
    EXPECT_NEAR(at(*big, 0, 60)[0], 0, 4);
    EXPECT_NEAR(at(*big, 159, 60)[0], 252, 4);
    EXPECT_NEAR(at(*big, 80, 60)[0], 128, 6);
    EXPECT_NEAR(at(*big, 80, 60)[1], 128, 10);

    image->Resize(80, 60);  // icon size
    EXPECT_EQ(image->Width(), 80);
    EXPECT_EQ(image->Height(), 60);
    image->Resize(0, -5);  // never below one pixel
    EXPECT_EQ(image->Width(), 1);
    EXPECT_EQ(image->Height(), 1);
    EXPECT_NEAR(image->Pixels()[0], 126, 6);  // the mean of the ramp
}

TEST_F(ImageTest, StoresSgiThatReloadsEqual) {
    const std::string png = Path("gradient.png");
    Write(png, 64, 32, 3, gradient(64, 32));
    auto image = KLImageSGI::Load(png.c_str());
    ASSERT_TRUE(image);
    image->Pixels()[3] = 17;  // one translucent pixel: alpha must survive too
    // No ".sgi" extension: the format is SGI whatever the name.
    const std::string sgi = Path("mouth.0012");
    std::string error;
    ASSERT_TRUE(image->Store(sgi.c_str(), &error)) << error;

    std::ifstream in(sgi, std::ios::binary);
    unsigned char magic[2] = {0, 0};
    in.read(reinterpret_cast<char*>(magic), 2);
    EXPECT_EQ(magic[0], 0x01);  // SGI image magic 474
    EXPECT_EQ(magic[1], 0xDA);

    auto back = KLImageSGI::Load(sgi.c_str(), &error);
    ASSERT_TRUE(back) << error;
    ASSERT_EQ(back->Width(), 64);
    ASSERT_EQ(back->Height(), 32);
    EXPECT_EQ(std::vector<uint8_t>(back->Pixels(), back->Pixels() + 64 * 32 * 4),
              std::vector<uint8_t>(image->Pixels(), image->Pixels() + 64 * 32 * 4));

    // Storing again replaces the file and leaves nothing else behind.
    image->Resize(8, 8);
    ASSERT_TRUE(image->Store(sgi.c_str(), &error)) << error;
    EXPECT_EQ(KLImageSGI::Load(sgi.c_str())->Width(), 8);
    EXPECT_EQ(std::distance(fs::directory_iterator(dir_), fs::directory_iterator()), 2);
}

TEST_F(ImageTest, StoreFailureSaysWhyAndLeavesNoFile) {
    KLImageSGI image(4, 4);
    const std::string path = Path("missing-dir/x.sgi");
    std::string error;
    EXPECT_FALSE(image.Store(path.c_str(), &error));
    EXPECT_EQ(error.rfind("Could not write image [" + path + "]: ", 0), 0u) << error;
    EXPECT_FALSE(fs::exists(path));

    KLImageSGI empty(0, 3);
    EXPECT_FALSE(empty.Store(Path("empty.sgi").c_str(), &error));
    EXPECT_EQ(error, "Could not write image [" + Path("empty.sgi") + "]: the picture is empty");
}

// Files that are not pictures: each gives null and a message naming the file.
struct NotAnImage {
    const char* name;
    const char* content;  // null: no file at all
};

class NotAnImageTest : public ImageTest, public ::testing::WithParamInterface<NotAnImage> {};

TEST_P(NotAnImageTest, GivesNullAndAMessage) {
    const std::string path = Path(GetParam().name);
    if (GetParam().content)
        std::ofstream(path) << GetParam().content;
    std::string error;
    EXPECT_EQ(KLImageSGI::Load(path.c_str(), &error), nullptr);
    const std::string head = "Could not read image [" + path + "]: ";
    EXPECT_EQ(error.rfind(head, 0), 0u) << error;
    EXPECT_GT(error.size(), head.size());
    EXPECT_EQ(error.find('\n'), std::string::npos);
    EXPECT_EQ(KLImageSGI::Load(path.c_str()), nullptr);  // no error string wanted
}

INSTANTIATE_TEST_SUITE_P(Files, NotAnImageTest,
                         ::testing::Values(NotAnImage{"text.sgi", "begin keyset\nend\n"},
                                           NotAnImage{"empty.png", ""},
                                           NotAnImage{"cut.png", "\x89PNG\r\n\x1a\n\0\0\0\rIHDR"},
                                           NotAnImage{"missing.sgi", nullptr},
                                           NotAnImage{"face.0001", "\x01\xDA\x01"}),
                         [](const ::testing::TestParamInfo<NotAnImage>& info) {
                             std::string name = info.param.name;
                             return name.substr(0, name.find('.'));
                         });

}  // namespace
