#include "scene/KLScene.h"

#include <cmath>
#include <iostream>

#include "scene/ChannelCurve.h"
#include "scene/KLCamera.h"
#include "scene/KLGraphNode.h"
#include "scene/KLPoseSource.h"
#include "scene/KLWireSource.h"
#include "scene/SceneDeformer.h"
#include "scene/SceneDocument.h"

KLScene::KLScene() : deformer_(std::make_unique<SceneDeformer>()) {}
KLScene::~KLScene() = default;

void KLScene::Feedback(int mode, void*) {
    if (mode >= 0 && mode <= 3) {
        feedback_ = mode;
    }
}

void KLScene::LoadGeometry(KLWireSource* source) {
    nodes_.clear();
    geometry_ = SceneGeometry();
    messages_.clear();
    rest_.clear();
    animated_.clear();
    world_.clear();
    items_.clear();
    hasBox_ = false;
    // Unique over all scenes of the run: a new scene made where an old one stood must not
    // pass for it.
    static int loads = 0;
    generation_ = ++loads;
    source_ = source;
    if (!source || !source->document()) {
        deformer_->Prepare(geometry_);
        pose_.Reset(rest_);
        return;
    }
    const SceneDocument& doc = *source->document();
    for (int i = 0; i < doc.NodeCount(); ++i) {
        const std::string& name = doc.NodeName(i);
        nodes_[name] = std::make_unique<KLGraphNode>(name);
    }
    geometry_.Load(doc.model(), &messages_);
    for (const std::string& message : messages_) {
        std::cerr << "Scene file [" << source->Path() << "]: " << message << std::endl;
    }
    deformer_->Prepare(geometry_);
    world_.assign(size_t(doc.NodeCount()), Mat4());
    SetRestFrame(restFrame_);
}

void KLScene::SetPoseSource(std::unique_ptr<KLPoseSource> source) {
    poseSource_ = std::move(source);
}

void KLScene::SetRestFrame(double frame) {
    restFrame_ = frame;
    const SceneDocument* doc = source_ ? source_->document() : nullptr;
    const int n = doc ? doc->NodeCount() : 0;
    rest_.assign(size_t(n), ScenePose::Channels{});
    animated_.assign(size_t(n), false);
    for (int i = 0; i < n; ++i) {
        for (int c = 0; c < SceneDocument::kChannels; ++c) {
            const ChannelCurve* curve = doc->Curve(i, c);
            animated_[size_t(i)] = animated_[size_t(i)] || (curve && !curve->empty());
            rest_[size_t(i)][size_t(c)] =
                curve && !curve->empty() ? curve->eval(frame) : doc->RestValue(i, c);
        }
    }
    pose_.Reset(rest_);
}

long KLScene::ContentRevision() const {
    const long animation = poseSource_ ? poseSource_->Revision() : 0;
    return (animation * 31 + generation_) * 7 + feedback_;
}

KLGraphNode* KLScene::FetchNode(const char* name) {
    if (!name) {
        return nullptr;
    }
    auto it = nodes_.find(name);
    return it == nodes_.end() ? nullptr : it->second.get();
}

void KLScene::Evaluate(CueTime t) {
    pose_.Reset(rest_);
    if (poseSource_ && source_) {
        poseSource_->Pose(source_, t, &pose_);
    }
    compute_world();
    const double seconds = restFrame_ / double(CueTime::default_fps);
    deformer_->Deform(geometry_, world_, seconds, &items_);
    compute_bounds();
}

void KLScene::compute_world() {
    const SceneDocument* doc = source_ ? source_->document() : nullptr;
    if (!doc) {
        return;
    }
    // Parents come before children in a walk from the roots.
    std::vector<int> stack;
    for (int r = doc->FirstChild(-1); r >= 0; r = doc->NextSibling(r)) {
        stack.push_back(r);
    }
    while (!stack.empty()) {
        int i = stack.back();
        stack.pop_back();
        const size_t n = size_t(i);
        const Mat4 local = animated_[n] || pose_.Posed(i) ? Mat4::FromChannels(pose_.Node(i).data())
                                                          : geometry_.restLocal[n];
        const int parent = doc->Parent(i);
        world_[n] = parent >= 0 ? world_[size_t(parent)] * local : local;
        for (int c = doc->FirstChild(i); c >= 0; c = doc->NextSibling(c)) {
            stack.push_back(c);
        }
    }
}

void KLScene::compute_bounds() {
    hasBox_ = false;
    for (const SceneDrawItem& item : items_) {
        const size_t count = item.primitive->VertexCount();
        for (size_t v = 0; v < count; ++v) {
            const float* p = item.positions + v * 3;
            Vec3 w = item.world.TransformPoint(Vec3(p[0], p[1], p[2]));
            if (!std::isfinite(w.x) || !std::isfinite(w.y) || !std::isfinite(w.z)) {
                continue;
            }
            if (!hasBox_) {
                boxMin_ = boxMax_ = w;
                hasBox_ = true;
                continue;
            }
            boxMin_ = Vec3(std::fmin(boxMin_.x, w.x), std::fmin(boxMin_.y, w.y),
                           std::fmin(boxMin_.z, w.z));
            boxMax_ = Vec3(std::fmax(boxMax_.x, w.x), std::fmax(boxMax_.y, w.y),
                           std::fmax(boxMax_.z, w.z));
        }
    }
}

bool KLScene::Bounds(Vec3* min, Vec3* max) const {
    if (!hasBox_) {
        return false;
    }
    *min = boxMin_;
    *max = boxMax_;
    return true;
}

void KLScene::LookAt(KLCamera* camera, bool fromSceneCamera, float aspect) const {
    Vec3 lo(-1, -1, -1), hi(1, 1, 1);
    Bounds(&lo, &hi);
    if (fromSceneCamera && !geometry_.cameras.empty()) {
        // The scene's own camera gives the direction the first time.
        const SceneCamera& sc = geometry_.cameras.front();
        if (sc.node >= 0 && size_t(sc.node) < world_.size()) {
            const Mat4& m = world_[size_t(sc.node)];
            Vec3 eye = m.TransformPoint(Vec3(0, 0, 0));
            Vec3 ahead = m.TransformDirection(Vec3(0, 0, -1));
            camera->Aim(eye, eye + ahead.Normalized() * std::fmax(1e-3f, (hi - lo).Length()));
        }
        if (sc.yfov > 1.0f && sc.yfov < 170.0f) {
            camera->fovY = sc.yfov;
        }
    }
    camera->Frame(lo, hi, aspect);
}
