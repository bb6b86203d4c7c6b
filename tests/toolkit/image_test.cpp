// Pictures are written here with OpenImageIO in other formats, then loaded, resized and stored
// as SGI files through KLImageSGI.

#include <gtest/gtest.h>
#include <unistd.h>

#include <OpenImageIO/imageio.h>
#include <filesystem>
#include <fstream>
#include <memory>
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
    // name's extension picks, with alpha kept as given rather than taken as premultiplied.
    static void Write(const std::string& path, int w, int h, int nchannels,
                      const std::vector<uint8_t>& pixels) {
        auto out = OIIO::ImageOutput::create(path);
        ASSERT_TRUE(out) << path;
        OIIO::ImageSpec layout(w, h, nchannels, OIIO::TypeDesc::UINT8);
        layout.alpha_channel = nchannels == 4 ? 3 : -1;
        layout.attribute("oiio:UnassociatedAlpha", 1);
        ASSERT_TRUE(out->open(path, layout)) << out->geterror();
        ASSERT_TRUE(out->write_image(OIIO::TypeDesc::UINT8, pixels.data())) << out->geterror();
        ASSERT_TRUE(out->close());
    }
    // A 64 x 32 RGB gradient: red rises left to right (0..252), green top to bottom (0..248),
    // blue is 77.
    std::unique_ptr<KLImageSGI> LoadGradient(const std::string& leaf) {
        std::vector<uint8_t> p;
        for (int y = 0; y < 32; ++y)
            for (int x = 0; x < 64; ++x)
                p.insert(p.end(), {uint8_t(x * 4), uint8_t(y * 8), 77});
        Write(Path(leaf), 64, 32, 3, p);
        std::string error;
        auto image = KLImageSGI::Load(Path(leaf).c_str(), &error);
        EXPECT_TRUE(image && image->Width() == 64 && image->Height() == 32) << error;
        return image;
    }
    static std::vector<uint8_t> Rgba(const KLImageSGI& image) {
        return std::vector<uint8_t>(image.Pixels(),
                                    image.Pixels() + size_t(image.Width() * image.Height()) * 4);
    }

    fs::path dir_;
};

const uint8_t* at(const KLImageSGI& image, int x, int y) {
    return image.Pixels() + (size_t(y) * size_t(image.Width()) + size_t(x)) * 4;
}

TEST_F(ImageTest, LoadsTopDownAndStoresSgiThatReloadsEqual) {
    auto image = LoadGradient("gradient.png");
    ASSERT_TRUE(image);
    for (int y = 0; y < 32; ++y) {
        for (int x = 0; x < 64; ++x) {
            const uint8_t* p = at(*image, x, y);
            ASSERT_EQ(std::vector<uint8_t>(p, p + 4),
                      (std::vector<uint8_t>{uint8_t(x * 4), uint8_t(y * 8), 77, 255}))
                << x << "," << y;  // row 0 is the top row of the file, opaque
        }
    }
    image->Pixels()[3] = 17;  // one translucent pixel: alpha must survive too
    // No ".sgi" extension: the format is SGI whatever the name.
    const std::string sgi = Path("mouth.0012");
    std::string error;
    ASSERT_TRUE(image->Store(sgi.c_str(), &error)) << error;
    char magic[2] = {0, 0};
    std::ifstream(sgi, std::ios::binary).read(magic, 2);
    EXPECT_EQ(std::string(magic, 2), "\x01\xDA");  // SGI image magic 474
    auto back = KLImageSGI::Load(sgi.c_str(), &error);
    ASSERT_TRUE(back) << error;
    EXPECT_EQ(back->Width(), 64);
    EXPECT_EQ(Rgba(*back), Rgba(*image));
    // Storing again replaces the file and leaves nothing else behind.
    image->Resize(8, 8);
    ASSERT_TRUE(image->Store(sgi.c_str(), &error)) << error;
    EXPECT_EQ(KLImageSGI::Load(sgi.c_str())->Width(), 8);
    EXPECT_EQ(std::distance(fs::directory_iterator(dir_), fs::directory_iterator()), 2);
}

TEST_F(ImageTest, GreyBecomesRgbAndStoredAlphaIsKept) {
    Write(Path("grey.png"), 3, 1, 1, {0, 128, 255});
    auto grey = KLImageSGI::Load(Path("grey.png").c_str());
    ASSERT_TRUE(grey);
    EXPECT_EQ(Rgba(*grey),
              (std::vector<uint8_t>{0, 0, 0, 255, 128, 128, 128, 255, 255, 255, 255, 255}));
    // Colours come back as stored, even under zero alpha.
    Write(Path("rgba.tif"), 2, 1, 4, {200, 100, 50, 0, 10, 20, 30, 128});
    auto rgba = KLImageSGI::Load(Path("rgba.tif").c_str());
    ASSERT_TRUE(rgba);
    EXPECT_EQ(Rgba(*rgba), (std::vector<uint8_t>{200, 100, 50, 0, 10, 20, 30, 128}));
}

TEST_F(ImageTest, ResizeGivesExactSizesAndKeepsAGradientSmooth) {
    auto image = LoadGradient("gradient.tif");
    ASSERT_TRUE(image);
    auto big = image->Copy();
    big->Resize(160, 121);  // key-shape picture size
    ASSERT_EQ(big->Width(), 160);
    ASSERT_EQ(big->Height(), 121);
    for (int y = 0; y < 121; ++y) {
        for (int x = 1; x < 160; ++x) {
            const int step = at(*big, x, y)[0] - at(*big, x - 1, y)[0];
            ASSERT_TRUE(step >= -1 && step <= 4) << x << "," << y;  // rising, without jumps
            ASSERT_NEAR(at(*big, x, y)[2], 77, 1);
            ASSERT_EQ(at(*big, x, y)[3], 255);
        }
    }
    // The ends stay near the ends of the ramp, the middle near its middle.
    EXPECT_NEAR(at(*big, 0, 60)[0], 0, 4);
    EXPECT_NEAR(at(*big, 159, 60)[0], 252, 4);
    EXPECT_NEAR(at(*big, 80, 60)[0], 128, 6);
    EXPECT_NEAR(at(*big, 80, 60)[1], 128, 10);
    image->Resize(0, -5);  // never below one pixel
    EXPECT_EQ(image->Width(), 1);
    EXPECT_EQ(image->Height(), 1);
    EXPECT_NEAR(image->Pixels()[0], 126, 6);  // the mean of the ramp
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

// Files that are not pictures: each gives null and a one-line message naming the file.
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
