#pragma once

#include <map>
#include <memory>
#include <string>
#include <vector>

#include "scene/Mat4.h"
#include "scene/SceneDrawItem.h"
#include "scene/SceneGeometry.h"
#include "scene/ScenePose.h"
#include "toolkit/CueTime.h"

class KLCamera;
class KLGraphNode;
class KLPoseSource;
class KLWireSource;
class SceneDeformer;

// The scene shown in the 3D views: the geometry loaded from the keyset's scene file, the
// display settings, and the scene posed at a time. Holds no GL state itself.
//
// Posing (Evaluate): every node channel takes the value the scene's own animation has at the
// rest frame (or the node's rest value), then the pose source (the previewed key tracks)
// sets the channels it drives; node matrices, skins and morph targets follow, giving the
// draw items and the bounding box.
class KLScene {
  public:
    KLScene();
    ~KLScene();

    void EvaluateDags() { evaluateDags_ = true; }
    void DontEvaluateDags() { evaluateDags_ = false; }
    void SetDetail(int u, int v) { tessU_ = u, tessV_ = v; }
    void DoDeltaShape() { deltaShape_ = true; }
    void HideTransparency() { transparency_ = false; }
    void HideShaders() { shaders_ = false; }
    // Feedback style 0..3: points, lines (wire frame), polygons (front faces), polygons on
    // both sides. Other values are ignored.
    void Feedback(int mode, void* unused = nullptr);

    // Loads the geometry of `source` (its nodes become graph nodes found by name). A scene
    // part that cannot be used is left out with a message on the error stream; null or an
    // invalid source leaves an empty scene.
    void LoadGeometry(KLWireSource* source);
    // The node of that name, or null.
    KLGraphNode* FetchNode(const char* name);

    // The frame (of the workspace rate) whose values of the scene's own animation hold the
    // channels no key track drives.
    void SetRestFrame(double frame);
    double RestFrame() const { return restFrame_; }
    // The source of the previewed animation (null for none); the scene owns it.
    void SetPoseSource(std::unique_ptr<KLPoseSource> source);
    KLPoseSource* PoseSource() const { return poseSource_.get(); }

    // Poses the scene at `t`: channels, node matrices, deformed vertices, bounding box.
    void Evaluate(CueTime t);
    const ScenePose& Pose() const { return pose_; }
    // World matrix of node i at the last Evaluate.
    const Mat4& WorldMatrix(int node) const { return world_[size_t(node)]; }
    // The draw items and the bounding box of the last Evaluate. The box is empty (min above
    // max) when nothing was drawn.
    const std::vector<SceneDrawItem>& DrawItems() const { return items_; }
    bool Bounds(Vec3* min, Vec3* max) const;
    // Points `camera` at the subject as last evaluated, framing its bounding box: from the
    // direction of the scene's first camera when it has one and `fromSceneCamera` is set,
    // else from the camera's own direction; `aspect` is the view's width / height.
    void LookAt(KLCamera* camera, bool fromSceneCamera = false, float aspect = 4.0f / 3.0f) const;

    const SceneGeometry& Geometry() const { return geometry_; }
    int NodeCount() const { return int(world_.size()); }
    // Messages of the last LoadGeometry (parts left out).
    const std::vector<std::string>& LoadMessages() const { return messages_; }
    // Changes at every LoadGeometry (unique in the run), so that the views know to renew
    // their GL copies.
    int Generation() const { return generation_; }
    // Changes whenever what the views draw changes: the geometry, the feedback style or the
    // previewed animation.
    long ContentRevision() const;

    int Feedback() const { return feedback_; }
    int TessU() const { return tessU_; }
    int TessV() const { return tessV_; }
    bool EvaluatesDags() const { return evaluateDags_; }
    KLWireSource* Source() const { return source_; }

  private:
    void compute_world();
    void compute_bounds();

    bool evaluateDags_ = false;
    bool deltaShape_ = false;
    bool transparency_ = true;
    bool shaders_ = true;
    int feedback_ = 2;
    int tessU_ = 0, tessV_ = 0;
    int generation_ = 0;
    double restFrame_ = 0.0;
    KLWireSource* source_ = nullptr;  // borrowed
    std::unique_ptr<KLPoseSource> poseSource_;
    std::map<std::string, std::unique_ptr<KLGraphNode>> nodes_;
    SceneGeometry geometry_;
    std::vector<std::string> messages_;
    std::vector<ScenePose::Channels> rest_;  // per node, at the rest frame
    std::vector<bool> animated_;             // per node: some channel has a curve
    ScenePose pose_;
    std::vector<Mat4> world_;
    std::unique_ptr<SceneDeformer> deformer_;
    std::vector<SceneDrawItem> items_;
    Vec3 boxMin_, boxMax_;
    bool hasBox_ = false;
};
