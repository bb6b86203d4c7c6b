#pragma once

#include <string>
#include <utility>

#include "scene/KLTransform.h"

// A node of the preview scene, found by name (KLScene::FetchNode).
class KLGraphNode {
  public:
    explicit KLGraphNode(std::string name) : name_(std::move(name)) {}
    const std::string& Name() const { return name_; }
    KLTransform* Transform() { return &transform_; }

  private:
    std::string name_;
    KLTransform transform_;
};
