// GoogleTest first: the X headers define macros (None, Bool) that its names collide with.
#include <gtest/gtest.h>

#include <cstdlib>

#include "guitest/GuiTest.h"
#include "scene/KLScene.h"
#include "scene/KLWireSource.h"
#include "scene/gl/KLSceneView.h"
#include "scene/gl/SceneRenderer.h"
#include "scene/gl/ViewPair.h"
#include "toolkit/KLImageSGI.h"

namespace {

constexpr int kWidth = 240, kHeight = 180;

// Pixels of a picture that are not the views' background.
long Coverage(const KLImageSGI& image) {
    long count = 0;
    const uint8_t* p = image.Pixels();
    for (long i = 0; i < long(image.Width()) * image.Height(); ++i, p += 4) {
        int off = 0;
        for (int c = 0; c < 3; ++c)
            off += std::abs(p[c] - int(SceneRenderer::kBackground[c] * 255 + 0.5f));
        count += off > 6;
    }
    return count;
}

// The demo face in both views, filled and as a wire frame: the face covers a good part of the
// view, and the styles differ. Screenshots for people to look at.
TEST(SceneView, DemoFaceInBothViews) {
    Widget shell = guitest::Shell();
    ASSERT_TRUE(shell);
    KLSceneView* views[2];
    testscenes::MakeViewPair(shell, kWidth, kHeight, views);
    XtRealizeWidget(shell);
    ASSERT_TRUE(guitest::WaitMapped(shell));
    ASSERT_TRUE(views[0]->HasGL()) << "the test display offers no GL";
    KLWireSource wire(CHIRRUP_SOURCE_DIR "/resources/demo/face.glb");
    ASSERT_TRUE(wire.Valid()) << wire.ErrorText();
    KLScene scene;
    scene.LoadGeometry(&wire);
    EXPECT_TRUE(scene.LoadMessages().empty()) << scene.LoadMessages()[0];
    for (KLSceneView* view : views)
        view->SetScene(&scene);
    const char* names[] = {"points", "lines", "polygons"};
    long covered[3];
    for (int style : {2, 1}) {
        scene.Feedback(style);
        auto image = views[0]->DrawPix(kWidth, kHeight);
        ASSERT_TRUE(image);
        covered[style] = Coverage(*image);
        for (KLSceneView* view : views)
            view->Draw();
        guitest::Settle();
        guitest::Screenshot(std::string("scene-views-demo-") + names[style]);
    }
    EXPECT_GT(covered[2], kWidth * kHeight / 8);
    EXPECT_LT(covered[1], covered[2]);
    // The on-screen view shows the face too: its centre is not background.
    EXPECT_NE(guitest::PixelAt(views[1]->GetWidget(), kWidth / 2, kHeight / 2),
              guitest::PixelAt(views[1]->GetWidget(), 2, 2));
    for (KLSceneView* view : views)
        view->SetScene(nullptr);
}

}  // namespace
