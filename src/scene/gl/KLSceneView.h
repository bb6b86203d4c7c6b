#pragma once

#include <memory>

#include <X11/Intrinsic.h>

#include "scene/KLCamera.h"
#include "toolkit/CueTime.h"
#include "toolkit/xm/KLFiend.h"

class KLImageSGI;
class KLScene;
class SceneRenderer;

// A 3D view of a KLScene in a Motif GL drawing area. The view draws the scene posed at its
// `time` (KLScene::Evaluate), from its own camera, in the scene's feedback style; while
// `playing` it draws in a fast mode (no textures). The view borrows the scene.
//
// The camera moves at rates (CameraTumble, CameraMove, CameraZoom: offsets in pixels from a
// drag's anchor). A view may keep a stored camera: LookAt returns to it when there is one,
// and otherwise frames the scene's bounding box at the view's time.
//
// A view on screen that is not playing draws again by itself, within a twentieth of a
// second, when its scene's content changes (a key edited, the feedback style changed).
//
// When the display offers no direct-rendering GLX visual the view says so once on the error
// stream and stays blank; every operation is then harmless.
class KLSceneView : public KLFiend {
  public:
    // A hook called around the view's evaluation of the scene (the key view holds the other
    // keysets at their default shapes with it).
    using Hook = void (*)(void* data);

    // The widget-table creation function: makes the view and returns its top widget.
    static Widget Create(Widget parent, String name, ArgList args, Cardinal count);
    KLSceneView(Widget parent, const char* name, ArgList args = nullptr, Cardinal count = 0);
    ~KLSceneView() override;

    // The view whose top widget is `widget`, or null.
    static KLSceneView* FromWidget(Widget widget);

    // Shows `scene` (borrowed; null: nothing). A first scene is framed at once.
    void SetScene(KLScene* scene);
    KLScene* GetScene() const { return scene_; }
    // Redraws now: evaluates the scene at `time` and draws it.
    void Draw();
    // Draws the scene at `time` into a width x height picture (160 x 121 by default), read
    // back from the frame buffer. Null when the view cannot draw (no scene, no GL).
    std::unique_ptr<KLImageSGI> DrawPix(int width = 160, int height = 121);

    // One step of a camera drag; the offsets are pixels from the anchor.
    void CameraTumble(float dx, float dy, int constrained);
    void CameraMove(float dx, float dy);
    void CameraZoom(float dx, float dy);
    // The end of a drag.
    void CameraEnd();
    // Looks at the subject: the stored camera when there is one, else frames the scene's
    // bounding box at the view's time. Does not redraw.
    void LookAt();
    // Keeps the current camera as the stored camera / forgets it.
    void StoreCamera();
    void ForgetCamera();
    bool HasStoredCamera() const { return storedCamera_ != nullptr; }

    // Hooks called before and after the view evaluates the scene.
    void SetEvaluationHooks(Hook before, Hook after, void* data);

    KLCamera& Camera() { return camera_; }
    // True when the view has a GL context to draw with.
    bool HasGL() const { return context_ != nullptr; }
    // Number of camera drags ended (CameraEnd) and of redraws made on screen since the view
    // was made.
    int DragsEnded() const { return dragsEnded_; }
    int Draws() const { return draws_; }

    CueTime time;     // the scene time the view shows
    int playing = 0;  // nonzero while playback runs: fast drawing
    int showTextures = 1;

  private:
    static void ginit_cb(Widget w, XtPointer clientData, XtPointer callData);
    static void expose_cb(Widget w, XtPointer clientData, XtPointer callData);
    static void resize_cb(Widget w, XtPointer clientData, XtPointer callData);
    // Every 50 ms: draws again when the scene's content changed since the last draw.
    static void watch_cb(XtPointer clientData, XtIntervalId* id);

    void init_gl();
    bool make_current();
    // Evaluates the scene at `time` with the hooks around it; false when there is nothing.
    bool evaluate();
    void render(int width, int height);

    Widget area_ = nullptr;
    void* context_ = nullptr;  // GLXContext
    bool glFailed_ = false;
    KLScene* scene_ = nullptr;
    KLCamera camera_;
    std::unique_ptr<KLCamera> storedCamera_;
    std::unique_ptr<SceneRenderer> renderer_;
    Hook before_ = nullptr;
    Hook after_ = nullptr;
    void* hookData_ = nullptr;
    int dragsEnded_ = 0;
    int draws_ = 0;
    long drawnRevision_ = 0;
    XtIntervalId watch_ = 0;
    bool framed_ = false;
};
