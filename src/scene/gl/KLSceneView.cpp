#include "scene/gl/KLSceneView.h"

#include <cstdio>
#include <vector>

#include <Xm/DrawingA.h>

#include "scene/KLScene.h"
#include "scene/gl/GLwMDrawingArea.h"
#include "scene/gl/SceneRenderer.h"
#include "toolkit/KLImageSGI.h"

namespace {
// Double-buffered RGBA with a depth buffer, the views' visual.
int kVisualAttributes[] = {
    GLX_RGBA, GLX_DOUBLEBUFFER, GLX_RED_SIZE, 1,   GLX_GREEN_SIZE, 1, GLX_BLUE_SIZE,
    1,        GLX_DEPTH_SIZE,   16,           None};

// How often a view looks whether its scene changed.
constexpr unsigned long kWatchMilliseconds = 50;

// The context the first view made; later views share its textures and buffers.
GLXContext sharedContext = nullptr;

// Says once per run why the views stay blank.
void report_no_gl(const char* why) {
    static bool told = false;
    if (!told) {
        std::fprintf(stderr, "The 3D views cannot draw on this display (%s); they stay blank.\n",
                     why);
        told = true;
    }
}

// True when the display offers direct rendering GLX with the views' visual.
bool display_has_gl(Display* display) {
    int error = 0, event = 0;
    if (!glXQueryExtension(display, &error, &event)) {
        report_no_gl("the display has no GLX extension");
        return false;
    }
    XVisualInfo* info = glXChooseVisual(display, DefaultScreen(display), kVisualAttributes);
    if (!info) {
        report_no_gl("no double-buffered RGBA visual with a depth buffer");
        return false;
    }
    XFree(info);
    return true;
}
}  // namespace

Widget KLSceneView::Create(Widget parent, String name, ArgList args, Cardinal count) {
    return (new KLSceneView(parent, name, args, count))->GetWidget();
}

KLSceneView::KLSceneView(Widget parent, const char* name, ArgList args, Cardinal count)
    : KLFiend(parent, name), renderer_(std::make_unique<SceneRenderer>()) {
    std::vector<Arg> all(args, args + count);
    if (display_has_gl(XtDisplay(parent))) {
        Arg a;
        XtSetArg(a, GLwNattribList, kVisualAttributes);
        all.push_back(a);
        area_ = XtCreateWidget(name, glwMDrawingAreaWidgetClass, parent, all.data(),
                               Cardinal(all.size()));
        XtAddCallback(area_, GLwNginitCallback, ginit_cb, this);
        XtAddCallback(area_, GLwNexposeCallback, expose_cb, this);
        XtAddCallback(area_, GLwNresizeCallback, resize_cb, this);
    } else {
        glFailed_ = true;
        area_ = XtCreateWidget(name, xmDrawingAreaWidgetClass, parent, all.data(),
                               Cardinal(all.size()));
    }
    attach_widget(area_);
    watch_ =
        XtAppAddTimeOut(XtWidgetToApplicationContext(area_), kWatchMilliseconds, watch_cb, this);
}

KLSceneView::~KLSceneView() {
    if (watch_) {
        XtRemoveTimeOut(watch_);
    }
    if (context_) {
        Display* display = XtDisplay(area_);
        if (glXGetCurrentContext() == static_cast<GLXContext>(context_)) {
            renderer_->Release();
            glXMakeCurrent(display, None, nullptr);
        }
        if (context_ != sharedContext) {
            glXDestroyContext(display, static_cast<GLXContext>(context_));
        }
    }
}

KLSceneView* KLSceneView::FromWidget(Widget widget) {
    return dynamic_cast<KLSceneView*>(KLFiend::FromWidget(widget));
}

void KLSceneView::ginit_cb(Widget, XtPointer clientData, XtPointer) {
    static_cast<KLSceneView*>(clientData)->init_gl();
}

void KLSceneView::expose_cb(Widget, XtPointer clientData, XtPointer) {
    static_cast<KLSceneView*>(clientData)->Draw();
}

void KLSceneView::resize_cb(Widget, XtPointer clientData, XtPointer) {
    auto* view = static_cast<KLSceneView*>(clientData);
    if (XtIsRealized(view->area_)) {
        view->Draw();
    }
}

void KLSceneView::watch_cb(XtPointer clientData, XtIntervalId*) {
    auto* view = static_cast<KLSceneView*>(clientData);
    view->watch_ = XtAppAddTimeOut(XtWidgetToApplicationContext(view->area_), kWatchMilliseconds,
                                   watch_cb, view);
    if (view->scene_ && !view->playing && view->context_ && XtIsRealized(view->area_) &&
        XtIsManaged(view->area_) && view->scene_->ContentRevision() != view->drawnRevision_) {
        view->Draw();
    }
}

void KLSceneView::init_gl() {
    if (context_ || glFailed_) {
        return;
    }
    XVisualInfo* info = nullptr;
    XtVaGetValues(area_, GLwNvisualInfo, &info, nullptr);
    Display* display = XtDisplay(area_);
    GLXContext context = info ? glXCreateContext(display, info, sharedContext, True) : nullptr;
    if (context && !glXIsDirect(display, context)) {
        glXDestroyContext(display, context);
        context = nullptr;
    }
    if (!context) {
        glFailed_ = true;
        report_no_gl("no direct rendering context");
        return;
    }
    context_ = context;
    if (!sharedContext) {
        sharedContext = context;
    }
}

bool KLSceneView::make_current() {
    if (glFailed_ || !area_) {
        return false;
    }
    if (!XtIsRealized(area_)) {
        Widget parent = XtParent(area_);
        if (!parent || !XtIsRealized(parent)) {
            return false;
        }
        XtRealizeWidget(area_);
    }
    if (!context_) {
        init_gl();
    }
    return context_ &&
           glXMakeCurrent(XtDisplay(area_), XtWindow(area_), static_cast<GLXContext>(context_));
}

void KLSceneView::SetScene(KLScene* scene) {
    bool first = scene && scene != scene_;
    scene_ = scene;
    if (first && !storedCamera_) {
        LookAt();
    }
}

void KLSceneView::SetEvaluationHooks(Hook before, Hook after, void* data) {
    before_ = before;
    after_ = after;
    hookData_ = data;
}

bool KLSceneView::evaluate() {
    if (!scene_) {
        return false;
    }
    if (before_) {
        before_(hookData_);
    }
    scene_->Evaluate(time);
    if (after_) {
        after_(hookData_);
    }
    return true;
}

void KLSceneView::render(int width, int height) {
    SceneRenderer::Options options;
    options.textures = showTextures && !playing;
    options.fast = playing != 0;
    renderer_->Draw(scene_, camera_, width, height, options);
}

void KLSceneView::Draw() {
    if (!XtIsRealized(area_) || !XtIsManaged(area_) || !make_current()) {
        return;
    }
    Dimension width = 0, height = 0;
    XtVaGetValues(area_, XmNwidth, &width, XmNheight, &height, nullptr);
    if (scene_) {
        evaluate();
        drawnRevision_ = scene_->ContentRevision();
    }
    render(width, height);
    glXSwapBuffers(XtDisplay(area_), XtWindow(area_));
    ++draws_;
}

std::unique_ptr<KLImageSGI> KLSceneView::DrawPix(int width, int height) {
    if (!scene_ || width < 1 || height < 1 || !make_current()) {
        return nullptr;
    }
    evaluate();
    return renderer_->DrawOffscreen(width, height, [&](int w, int h) { render(w, h); });
}

void KLSceneView::CameraTumble(float dx, float dy, int constrained) {
    camera_.Tumble(dx, dy, constrained != 0);
}

void KLSceneView::CameraMove(float dx, float dy) {
    camera_.Move(dx, dy);
}

void KLSceneView::CameraZoom(float dx, float dy) {
    camera_.Zoom(dx, dy);
}

void KLSceneView::CameraEnd() {
    ++dragsEnded_;
}

void KLSceneView::LookAt() {
    if (storedCamera_) {
        camera_ = *storedCamera_;
        return;
    }
    if (!scene_) {
        return;
    }
    evaluate();
    Dimension width = 0, height = 0;
    XtVaGetValues(area_, XmNwidth, &width, XmNheight, &height, nullptr);
    scene_->LookAt(&camera_, !framed_,
                   width && height ? float(width) / float(height) : 4.0f / 3.0f);
    framed_ = true;
}

void KLSceneView::StoreCamera() {
    storedCamera_ = std::make_unique<KLCamera>(camera_);
}

void KLSceneView::ForgetCamera() {
    storedCamera_.reset();
}
