#pragma once

#include <map>
#include <memory>
#include <string>

class KLGraphNode;
class KLWireSource;

// The scene shown in the 3D views: the geometry loaded from the keyset's scene file and the
// display settings. Holds no GL state itself. The preview always draws key shapes whole, opaque
// and with plain shading: there are no settings for delta shapes, transparency or shaders.
class KLScene {
  public:
    KLScene();
    ~KLScene();

    void EvaluateDags() { evaluateDags_ = true; }
    void DontEvaluateDags() { evaluateDags_ = false; }
    void SetDetail(int u, int v) { tessU_ = u, tessV_ = v; }
    // Shading mode 0..3 (wire frame, flat, smooth, textured).
    void Feedback(int mode, void* unused = nullptr) { (void)unused, feedback_ = mode; }

    // Loads the geometry of `source` (its nodes become graph nodes found by name).
    void LoadGeometry(KLWireSource* source);
    // The node of that name, or null.
    KLGraphNode* FetchNode(const char* name);

    int Feedback() const { return feedback_; }
    int TessU() const { return tessU_; }
    int TessV() const { return tessV_; }
    bool EvaluatesDags() const { return evaluateDags_; }
    KLWireSource* Source() const { return source_; }

  private:
    bool evaluateDags_ = false;
    int feedback_ = 2;
    int tessU_ = 0, tessV_ = 0;
    KLWireSource* source_ = nullptr;  // borrowed
    std::map<std::string, std::unique_ptr<KLGraphNode>> nodes_;
};
