// The key and mix views in the main window on the demo: camera drags with real pointer input,
// the feedback toggles, the key-shape pictures, redraws, the playblast and missing geometry.
#include <gtest/gtest.h>

#include <X11/extensions/XTest.h>
#include <Xm/ToggleB.h>
#include <Xm/Xm.h>

#include <cstring>

#include "guitest/GuiTest.h"
#include "model/KLKey.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "scene/KLScene.h"
#include "scene/gl/KLSceneView.h"
#include "toolkit/KLImageSGI.h"
#include "window/EventPump.h"
#include "window/Gnome.h"
#include "window/WindowTestUtil.h"
#include "workspace/Imp.h"

namespace {

using windowtest::W;

bool SamePixels(const KLImageSGI& a, const KLImageSGI& b) {
    return a.Width() == b.Width() && a.Height() == b.Height() &&
           std::memcmp(a.Pixels(), b.Pixels(), size_t(a.Width()) * size_t(a.Height()) * 4) == 0;
}

bool SameCamera(const KLCamera& a, const KLCamera& b) {
    return a.yaw == b.yaw && a.pitch == b.pitch && a.distance == b.distance &&
           a.centre.x == b.centre.x && a.centre.y == b.centre.y && a.centre.z == b.centre.z;
}

// The demo keyset loaded once with its geometry; each test starts with framed views.
class ViewsTest : public ::testing::Test {
  protected:
    void SetUp() override {
        gnome = &windowtest::TheDemoWindow();
        ASSERT_TRUE(gnome->keyScene && gnome->mixScene);
        ASSERT_TRUE(gnome->keyScene->HasGL()) << "the test display offers no GL";
        ASSERT_EQ(gnome->keyScene->GetScene(), theImp.scene.get());
        for (KLSceneView* view : {gnome->keyScene, gnome->mixScene}) {
            view->ForgetCamera();
            view->Camera() = KLCamera();
            view->time = CueTime();
        }
        gnome->CenterKeyView();
        gnome->CenterMixView();
    }
    // Runs the event loop as the program does (work procedures run while it waits) until
    // the view has drawn `count` more times, for at most five seconds.
    bool Steps(KLSceneView* view, int count) {
        const int until = view->Draws() + count;
        return windowtest::Pump([&] { return view->Draws() >= until; });
    }
    void PointerAt(int x, int y) {
        XTestFakeMotionEvent(guitest::GetDisplay(), -1, x, y, CurrentTime);
        guitest::Settle();
    }
    // Presses `button` over a drag widget and waits for the drag to start.
    void StartDrag(const char* widget, int button) {
        guitest::MoveTo(W(widget));
        guitest::Press(button);
        ASSERT_TRUE(guitest::WaitFor([&] { return gnome->dragging == 1; }));
    }
    void EndDrag(int button) {
        guitest::Release(button);
        ASSERT_TRUE(guitest::WaitFor([&] { return gnome->dragging == 0; }));
    }
    Gnome* gnome = nullptr;
};

// Camera drags with real pointer input: held at the anchor the camera stays, moved off it, it
// turns continuously until release; the middle button turns only about the vertical axis, the
// right one only tilts; a second button neither starts nor ends a drag.
TEST_F(ViewsTest, CameraDrags) {
    KLSceneView* view = gnome->keyScene;
    const KLCamera start = view->Camera();
    const int ended = view->DragsEnded();
    StartDrag("keyVuTumble", 1);
    ASSERT_TRUE(Steps(view, 10));
    EXPECT_TRUE(SameCamera(view->Camera(), start)) << "the pointer rests at the anchor";
    PointerAt(gnome->anchorX + 60, gnome->anchorY);
    ASSERT_TRUE(Steps(view, 3));
    const float yaw = view->Camera().yaw;
    EXPECT_NE(yaw, start.yaw);
    ASSERT_TRUE(Steps(view, 3));
    EXPECT_NE(view->Camera().yaw, yaw) << "turns on while held";
    EXPECT_EQ(view->Camera().pitch, start.pitch);
    EndDrag(1);
    EXPECT_EQ(view->DragsEnded(), ended + 1);
    const KLCamera after = view->Camera();
    guitest::Settle();
    EXPECT_TRUE(SameCamera(view->Camera(), after)) << "stops at release";

    for (int button : {2, 3}) {
        const KLCamera before = gnome->mixScene->Camera();
        StartDrag("mixVuTumble", button);
        PointerAt(gnome->anchorX + 50, gnome->anchorY + 50);
        ASSERT_TRUE(Steps(gnome->mixScene, 5));
        const KLCamera& now = gnome->mixScene->Camera();
        EXPECT_EQ(now.yaw != before.yaw, button == 2);
        EXPECT_EQ(now.pitch != before.pitch, button == 3);
        guitest::Press(1);
        guitest::Release(1);
        guitest::Settle();
        EXPECT_TRUE(gnome->dragging == 1 && gnome->dragButton == button) << "button 1 ended it";
        EndDrag(button);
    }
}

// The feedback toggles set the scene's style (each style's drawing is the scene view's tests').
TEST_F(ViewsTest, FeedbackToggles) {
    const char* names[] = {"points", "lines", "polygons"};
    for (int style : {1, 0, 2}) {
        XmToggleButtonSetState(W(names[style]), True, True);
        EXPECT_EQ(theImp.scene->Feedback(), style);
    }
    guitest::Screenshot("window-views-polygons");
}

// Every key shape of the active keyset has a picture and an icon, grabbed from the key view
// (also while the key image view stands in its place); different shapes give different pictures.
TEST_F(ViewsTest, KeyImagesAreGrabbedFromTheKeyView) {
    gnome->keyViewOn = 1;
    gnome->keyViewMode = 0;
    gnome->SetViewStatus();
    ASSERT_FALSE(XtIsManaged(gnome->keyScene->GetWidget()));
    gnome->MakeKeysetImages();
    gnome->keyViewMode = 1;
    gnome->SetViewStatus();
    KLKeySet* set = gnome->shownKeyset;
    ASSERT_TRUE(set);
    ASSERT_GE(set->keyShapeCount, 3);
    for (int i = 0; i < set->keyShapeCount; i++)
        ASSERT_TRUE(set->GetKeyShape(i)->image && set->GetKeyShape(i)->GetIcon()) << i;
    EXPECT_FALSE(SamePixels(*set->GetKeyShape(0)->image, *set->GetKeyShape(1)->image));
    EXPECT_EQ(set->imagesChanged, 1);
    EXPECT_FALSE(theImp.GetKeyTrack(gnome->GetActiveKeyset())->vuKeyFrames)
        << "the track is back on its events";
    gnome->keyViewOn = gnome->keyViewMode = gnome->mixViewOn = 1;
    gnome->SetViewStatus();
}

// Keys edited on the active track show in both views at once, without a call to draw. Played
// forward to a playblast, each frame of the mix view becomes a playblast frame of the view's
// size, shown in the reference view from the region's start.
TEST_F(ViewsTest, EditedKeysRedrawAndPlayblastFramesAreTheMixViews) {
    for (KLSceneView* view : {gnome->keyScene, gnome->mixScene})
        view->time = CueTime::FromFrames(11);
    guitest::Settle();
    const int keyDraws = gnome->keyScene->Draws(), mixDraws = gnome->mixScene->Draws();
    KLKeyTrack* mouth = theImp.GetKeyTrack(gnome->GetActiveKeyset());
    KLKeySet* set = gnome->shownKeyset;
    mouth->InsertKey(1, CueTime::FromFrames(10), set->GetKeyShape(1), KLKeyEvent::kLinear, 1.0f);
    mouth->InsertKey(3, CueTime::FromFrames(12), set->GetKeyShape(3), KLKeyEvent::kLinear, 1.0f);
    theImp.PrepareKeyFrames(gnome->GetActiveKeyset());
    EXPECT_TRUE(guitest::WaitFor([&] {
        return gnome->keyScene->Draws() > keyDraws && gnome->mixScene->Draws() > mixDraws;
    }));
    theImp.playblastImages = std::make_unique<std::unique_ptr<KLImageSGI>[]>(3);
    theImp.playblastCount = 3;
    const CueTime start = CueTime::FromFrames(10);
    for (int i = 0; i < 3; i++) {
        gnome->mixScene->time = start + CueTime::FromFrames(i);
        gnome->mixScene->Draw();
        gnome->grab_playblast_frame(i);
    }
    gnome->show_playblast(start);
    Dimension width = 0, height = 0;
    XtVaGetValues(gnome->mixScene->GetWidget(), XmNwidth, &width, XmNheight, &height, nullptr);
    const KLImageSGI* frame = theImp.playblastImages[1].get();
    ASSERT_TRUE(frame && theImp.playblastImages[0] && theImp.playblastImages[2]);
    EXPECT_EQ(std::pair(frame->Width(), frame->Height()), std::pair(int(width), int(height)));
    EXPECT_FALSE(SamePixels(*theImp.playblastImages[0], *theImp.playblastImages[2]))
        << "the mouth moved from one key shape to the other";
    EXPECT_EQ(gnome->playblastViewOn, 1);
    EXPECT_EQ(gnome->refViewOn, 0);
    EXPECT_EQ(theImp.GetPlayblast(start + CueTime::FromFrames(1)), theImp.playblastImages[1].get());
    Gnome::toggle_ref_view_cb(nullptr, XtPointer(0), nullptr);
    gnome->DisplayReference(start);  // lets go of the playblast picture
    theImp.DeletePlayblast();
}

// ClearViews leaves both views without a scene, showing the keyset gives it back; loaded
// without geometry, the views get no scene and no key-shape pictures are grabbed; loaded with
// it again, both come back.
TEST_F(ViewsTest, ClearedOrWithoutGeometryTheViewsStayEmpty) {
    const auto scenes = [&](KLScene* scene) {
        return gnome->keyScene->GetScene() == scene && gnome->mixScene->GetScene() == scene;
    };
    gnome->ClearViews();
    EXPECT_TRUE(scenes(nullptr));
    EXPECT_EQ(gnome->shownKeyset, nullptr);
    gnome->SetActiveKeyset(0);
    EXPECT_TRUE(scenes(theImp.scene.get()));
    const std::string kset = windowtest::DemoProject() + "/misc_data/demo.kset";
    theImp.loadGeometry = 0;
    ASSERT_EQ(theImp.LoadKeyset(kset.c_str()), 1);
    EXPECT_EQ(theImp.geometryActive, 0);
    EXPECT_TRUE(scenes(nullptr));
    ASSERT_TRUE(gnome->shownKeyset);
    gnome->MakeKeysetImages();
    EXPECT_FALSE(gnome->shownKeyset->GetKeyShape(1)->image) << "nothing grabbed";
    theImp.loadGeometry = 1;
    ASSERT_EQ(theImp.LoadKeyset(kset.c_str()), 1);
    EXPECT_TRUE(scenes(theImp.scene.get()));
    EXPECT_TRUE(gnome->shownKeyset->GetKeyShape(1)->image);
}

}  // namespace
