// GoogleTest first: the X headers define macros (None, Bool) that its names collide with.
#include <gtest/gtest.h>

#include <cstring>
#include <filesystem>

#include "guitest/GuiTest.h"
#include "scene/KLScene.h"
#include "scene/KLWireSource.h"
#include "scene/gl/KLSceneView.h"
#include "scene/gl/SceneRenderer.h"
#include "scene/gl/TestScenes.h"
#include "scene/gl/ViewPair.h"
#include "toolkit/KLImageSGI.h"

namespace {

constexpr int kWidth = 240, kHeight = 180;

// Pixels of a picture that are not the views' background, and the box around them.
struct Coverage {
    explicit Coverage(const KLImageSGI& image) {
        int bg[3];
        for (int c = 0; c < 3; ++c)
            bg[c] = int(SceneRenderer::kBackground[c] * 255 + 0.5f);
        for (int y = 0; y < image.Height(); ++y) {
            for (int x = 0; x < image.Width(); ++x) {
                const uint8_t* p =
                    image.Pixels() + (size_t(y) * size_t(image.Width()) + size_t(x)) * 4;
                if (std::abs(p[0] - bg[0]) + std::abs(p[1] - bg[1]) + std::abs(p[2] - bg[2]) > 6) {
                    ++count;
                    lo[0] = std::min(lo[0], x), hi[0] = std::max(hi[0], x);
                    lo[1] = std::min(lo[1], y), hi[1] = std::max(hi[1], y);
                }
            }
        }
    }
    // The column (axis 0) or row (1) at `fraction` of the way across the covered ones.
    size_t At(int axis, double fraction) const {
        return size_t(lo[axis] + (hi[axis] - lo[axis]) * fraction);
    }
    long count = 0;
    int lo[2] = {1 << 20, 1 << 20}, hi[2] = {-1, -1};
};

bool SamePixels(const KLImageSGI& a, const KLImageSGI& b) {
    return a.Width() == b.Width() && a.Height() == b.Height() &&
           std::memcmp(a.Pixels(), b.Pixels(), size_t(a.Width()) * size_t(a.Height()) * 4) == 0;
}

// Two views side by side in a form on the test display, shared by every test.
class SceneViewTest : public ::testing::Test {
  protected:
    static void SetUpTestSuite() {
        Widget shell = guitest::Shell();
        ASSERT_TRUE(shell);
        testscenes::MakeViewPair(shell, kWidth, kHeight, views);
        XtRealizeWidget(shell);
        ASSERT_TRUE(guitest::WaitMapped(shell));
    }
    void SetUp() override {
        ASSERT_TRUE(views[0] && views[0]->HasGL()) << "the test display offers no GL";
        const auto* info = ::testing::UnitTest::GetInstance()->current_test_info();
        dir = std::string(CHIRRUP_BINARY_DIR) + "/test-tmp/scene-view/" + info->name();
        std::filesystem::remove_all(dir);
        std::filesystem::create_directories(dir);
    }
    void TearDown() override {
        for (KLSceneView* view : views) {
            view->SetScene(nullptr);
            view->ForgetCamera();
            view->Draw();
        }
        if (!getenv("CHIRRUP_VIEW_TEST_DUMP"))
            std::filesystem::remove_all(dir);
    }
    // Loads `sheet` into the scene and shows it in the key view, framed.
    void Show(const testscenes::Sheet& sheet) {
        ASSERT_TRUE(testscenes::WriteSheet(dir + "/sheet.gltf", sheet));
        Show((dir + "/sheet.gltf").c_str());
    }
    void Show(const char* path) {
        wire = std::make_unique<KLWireSource>(path);
        ASSERT_TRUE(wire->Valid()) << wire->ErrorText();
        scene = std::make_unique<KLScene>();
        scene->LoadGeometry(wire.get());
        for (KLSceneView* view : views) {
            view->SetScene(nullptr);
            view->Camera() = KLCamera();
            view->SetScene(scene.get());
        }
    }
    std::unique_ptr<KLImageSGI> Grab(KLSceneView* view = views[0]) {
        auto image = view->DrawPix(kWidth, kHeight);
        if (image && getenv("CHIRRUP_VIEW_TEST_DUMP"))  // for looking at a failure
            image->Store((dir + "/grab" + std::to_string(grabs++) + ".sgi").c_str());
        EXPECT_TRUE(image);
        return image ? std::move(image) : std::make_unique<KLImageSGI>(kWidth, kHeight);
    }
    static KLSceneView* views[2];
    std::string dir;
    std::unique_ptr<KLWireSource> wire;
    std::unique_ptr<KLScene> scene;
    int grabs = 0;
};
KLSceneView* SceneViewTest::views[2] = {nullptr, nullptr};

// From behind, a one-sided sheet is dots, a wire frame, nothing (culled) and filled (both
// sides) in the four styles; from the front the two filled styles agree.
TEST_F(SceneViewTest, FeedbackStylesDiffer) {
    testscenes::Sheet sheet;
    sheet.columns = sheet.rows = 6;
    Show(sheet);
    views[0]->Camera().yaw = 180;
    views[0]->LookAt();
    long covered[4];
    for (int style = 0; style < 4; ++style) {
        scene->Feedback(style);
        covered[style] = Coverage(*Grab()).count;
    }
    EXPECT_GT(covered[0], 0);
    EXPECT_LT(covered[0], covered[1]) << "points against lines";
    EXPECT_EQ(covered[2], 0) << "back faces culled";
    EXPECT_GT(covered[3], covered[1]) << "both sides filled";
    views[0]->Camera().yaw = 0;
    scene->Feedback(2);
    const long front = Coverage(*Grab()).count;
    scene->Feedback(3);
    EXPECT_EQ(Coverage(*Grab()).count, front);
}

// The base-colour texture shows unless switched off or playing.
TEST_F(SceneViewTest, TexturesOnOffAndWhilePlaying) {
    testscenes::Sheet sheet;
    sheet.texture = true;
    Show(sheet);
    const auto textured = Grab();
    views[0]->showTextures = 0;
    const auto plain = Grab();
    views[0]->showTextures = 1;
    views[0]->playing = 1;
    const auto fast = Grab();
    views[0]->playing = 0;
    EXPECT_FALSE(SamePixels(*textured, *plain));
    EXPECT_TRUE(SamePixels(*plain, *fast));
    const Coverage covered(*textured);
    const auto texel = [&](double across, double down) {
        return textured->Pixels() + (covered.At(1, down) * kWidth + covered.At(0, across)) * 4;
    };
    EXPECT_GT(texel(0.25, 0.25)[0], 2 * texel(0.25, 0.25)[2]) << "top left texel is red";
    EXPECT_GT(texel(0.75, 0.25)[2], 2 * texel(0.75, 0.25)[0]) << "top right texel is blue";
}

// The demo face in both views, filled and as a wire frame: the face covers a good part of
// the view, and the styles differ. Screenshots for people to look at.
TEST_F(SceneViewTest, DemoFaceInBothViews) {
    Show(CHIRRUP_SOURCE_DIR "/resources/demo/face.glb");
    EXPECT_TRUE(scene->LoadMessages().empty()) << scene->LoadMessages()[0];
    const char* names[] = {"points", "lines", "polygons", "polygonsboth"};
    long covered[4];
    for (int style : {2, 1}) {
        scene->Feedback(style);
        covered[style] = Coverage(*Grab()).count;
        for (KLSceneView* view : views)
            view->Draw();
        guitest::Settle();
        guitest::Screenshot(std::string("scene-views-demo-") + names[style]);
    }
    EXPECT_GT(covered[2], kWidth * kHeight / 8);
    EXPECT_LT(covered[1], covered[2]);
    // The on-screen view shows the face too: its centre is not background.
    const unsigned long centre = guitest::PixelAt(views[1]->GetWidget(), kWidth / 2, kHeight / 2);
    const unsigned long background = guitest::PixelAt(views[1]->GetWidget(), 2, 2);
    EXPECT_NE(centre, background);
}

}  // namespace
