// GoogleTest first: the X headers define macros (None, Bool) that its names collide with.
#include <gtest/gtest.h>

#include <cstring>
#include <filesystem>
#include <functional>

#include "guitest/GuiTest.h"
#include "scene/KLPoseSource.h"
#include "scene/KLScene.h"
#include "scene/KLWireSource.h"
#include "scene/gl/KLSceneView.h"
#include "scene/gl/SceneRenderer.h"
#include "scene/gl/TestScenes.h"
#include "scene/gl/ViewPair.h"
#include "toolkit/KLImageSGI.h"

namespace {

constexpr int kWidth = 240, kHeight = 180;

// Sets one channel of one node unless held (as a static hook holds it).
class SwitchablePose : public KLPoseSource {
  public:
    SwitchablePose(int node, int channel, double value)
        : node_(node), channel_(channel), value_(value) {}
    void Pose(KLWireSource*, CueTime, ScenePose* pose) override {
        if (!held)
            pose->Set(node_, channel_, value_);
    }
    bool held = false;

  private:
    int node_, channel_;
    double value_;
};

// Pixels of a picture that are not the views' background.
struct Coverage {
    explicit Coverage(const KLImageSGI& image) {
        const uint8_t bg[3] = {uint8_t(SceneRenderer::kBackground[0] * 255 + 0.5f),
                               uint8_t(SceneRenderer::kBackground[1] * 255 + 0.5f),
                               uint8_t(SceneRenderer::kBackground[2] * 255 + 0.5f)};
        height = image.Height();
        top.assign(size_t(image.Width()), image.Height());
        for (int y = 0; y < image.Height(); ++y) {
            for (int x = 0; x < image.Width(); ++x) {
                const uint8_t* p =
                    image.Pixels() + (size_t(y) * size_t(image.Width()) + size_t(x)) * 4;
                if (std::abs(p[0] - bg[0]) + std::abs(p[1] - bg[1]) + std::abs(p[2] - bg[2]) > 6) {
                    ++count;
                    sumX += x;
                    top[size_t(x)] = std::min(top[size_t(x)], y);
                    firstRow = std::min(firstRow, y);
                    lastRow = std::max(lastRow, y);
                }
            }
        }
    }
    double CentreX() const { return count ? sumX / double(count) : -1; }
    // The column at `fraction` of the way across the covered columns.
    size_t Across(double fraction) const {
        int first = -1, last = -1;
        for (size_t x = 0; x < top.size(); ++x) {
            if (top[x] < height) {
                last = int(x);
                first = first < 0 ? int(x) : first;
            }
        }
        return size_t(first + (last - first) * fraction);
    }
    // The row at `fraction` of the way down the covered rows.
    int Down(double fraction) const { return firstRow + int((lastRow - firstRow) * fraction); }
    long count = 0;
    double sumX = 0;
    int height = 0;
    int firstRow = 1 << 20, lastRow = -1;
    std::vector<int> top;  // per column, the first covered row (height when none)
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
            view->SetEvaluationHooks(nullptr, nullptr, nullptr);
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
    // `room`: the camera backs away by that much from the framed distance.
    void Show(const char* path, float room = 1.5f) {
        wire = std::make_unique<KLWireSource>(path);
        ASSERT_TRUE(wire->Valid()) << wire->ErrorText();
        scene = std::make_unique<KLScene>();
        scene->LoadGeometry(wire.get());
        for (KLSceneView* view : views) {
            view->SetScene(nullptr);
            view->Camera() = KLCamera();
            view->SetScene(scene.get());
            view->Camera().distance *= room;  // room for what the tests lift
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

// Seen from behind, a one-sided sheet is dots, a wire frame, nothing (back faces culled) and
// a filled sheet (both sides) in the four styles; seen from the front the two filled styles
// agree.
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

// A raised joint lifts its half of the sheet; an active morph target lifts its band.
TEST_F(SceneViewTest, SkinnedAndMorphedSheetsDrawnPosed) {
    testscenes::Sheet sheet;
    sheet.columns = 8;
    sheet.joints = 2;
    Show(sheet);
    const Coverage rest(*Grab());
    scene->SetPoseSource(std::make_unique<SwitchablePose>(2, 1, 0.6));  // joint1 TY
    const Coverage raised(*Grab());
    ASSERT_GT(rest.count, 0);
    const size_t right = rest.Across(0.9), left = rest.Across(0.2);
    EXPECT_LT(raised.top[right], rest.top[right] - 10) << "right side up";
    EXPECT_EQ(raised.top[left], rest.top[left]) << "left side stays";

    testscenes::Sheet morphed;
    morphed.columns = 8;
    morphed.morphTargets = 1;
    morphed.morphLift = 0.6f;
    Show(morphed);
    const Coverage flat(*Grab());
    const KLCamera camera = views[0]->Camera();
    morphed.morphWeights = {1.0f};
    Show(morphed);
    views[0]->Camera() = camera;
    const Coverage lifted(*Grab());
    EXPECT_LT(lifted.top[flat.Across(0.1)], flat.top[flat.Across(0.1)] - 10)
        << "the band at the left lifted";
    EXPECT_EQ(lifted.top[flat.Across(0.8)], flat.top[flat.Across(0.8)]);
}

// The base-colour texture shows unless switched off or playing; a corrupt one leaves the
// base colour.
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
        return textured->Pixels() +
               (size_t(covered.Down(down)) * kWidth + covered.Across(across)) * 4;
    };
    EXPECT_GT(texel(0.25, 0.25)[0], 2 * texel(0.25, 0.25)[2]) << "top left texel is red";
    EXPECT_GT(texel(0.75, 0.25)[2], 2 * texel(0.75, 0.25)[0]) << "top right texel is blue";
    sheet.texture = false;
    sheet.corruptTexture = true;
    Show(sheet);
    EXPECT_GT(Coverage(*Grab()).count, 0);
}

// A step at the anchor moves nothing; steps away from it turn, dolly and pan as expected;
// look-at frames again; a stored camera is where look-at returns.
TEST_F(SceneViewTest, CameraSteps) {
    testscenes::Sheet sheet;
    sheet.columns = 4;
    Show(sheet);
    KLSceneView& view = *views[0];
    const auto framed = Grab();
    for (int i = 0; i < 20; ++i) {
        view.CameraTumble(0, 0, 0);
        view.CameraMove(0, 0);
        view.CameraZoom(0, 0);
    }
    EXPECT_TRUE(SamePixels(*framed, *Grab()));
    const Coverage before(*framed);
    // The drag's work procedure steps many times a second.
    const auto steps = [](const std::function<void()>& step) {
        for (int i = 0; i < 50; ++i)
            step();
    };
    steps([&] { view.CameraZoom(-200, 0); });
    EXPECT_LT(Coverage(*Grab()).count, before.count) << "zoomed out";
    view.LookAt();
    steps([&] { view.CameraMove(200, 0); });
    EXPECT_GT(Coverage(*Grab()).CentreX(), before.CentreX() + 5) << "moved right";
    view.LookAt();
    EXPECT_NEAR(Coverage(*Grab()).CentreX(), before.CentreX(), 1.0);
    steps([&] { view.CameraTumble(300, 0, 0); });
    const auto turned = Grab();
    EXPECT_FALSE(SamePixels(*framed, *turned));
    view.StoreCamera();
    steps([&] { view.CameraTumble(0, 200, 0); });
    view.CameraEnd();
    view.LookAt();
    EXPECT_TRUE(SamePixels(*turned, *Grab())) << "back to the stored camera";
    view.ForgetCamera();
    steps([&] { view.CameraTumble(0, 200, 0); });
    view.LookAt();
    EXPECT_FALSE(SamePixels(*turned, *Grab())) << "framed from the new direction";
    EXPECT_EQ(view.DragsEnded(), 1);
}

// The evaluation hooks run around every draw: a view whose hook holds the animation shows the
// rest pose while the other view shows the animation.
TEST_F(SceneViewTest, HooksHoldTheKeyViewAtRest) {
    testscenes::Sheet sheet;
    sheet.columns = 4;
    sheet.joints = 2;
    Show(sheet);
    const auto rest = Grab(views[1]);
    auto pose = std::make_unique<SwitchablePose>(2, 1, 0.6);
    SwitchablePose* source = pose.get();
    scene->SetPoseSource(std::move(pose));
    views[0]->SetEvaluationHooks([](void* s) { static_cast<SwitchablePose*>(s)->held = true; },
                                 [](void* s) { static_cast<SwitchablePose*>(s)->held = false; },
                                 source);
    EXPECT_TRUE(SamePixels(*rest, *Grab(views[0])));
    EXPECT_FALSE(source->held) << "released after the draw";
    EXPECT_FALSE(SamePixels(*rest, *Grab(views[1])));
}

// The demo face in both views, filled and as a wire frame: the face covers a good part of
// the view, and the styles differ. Screenshots for people to look at.
TEST_F(SceneViewTest, DemoFaceInBothViews) {
    Show(CHIRRUP_SOURCE_DIR "/resources/demo/face.glb", 1.0f);
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
