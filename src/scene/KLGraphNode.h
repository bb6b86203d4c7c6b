#pragma once

#include <memory>
#include <string>

#include "scene/KLChannel.h"

// The transform of a preview scene node: nine channels (TX..SZ), each made animatable on
// request.
class KLTransform {
  public:
    // Makes channel `c` (0..8) animated and returns it; null for another number.
    KLChannel* AnimateChannel(int c);
    // The channel if it was made animated, else null.
    KLChannel* Channel(int c) const;

  private:
    std::unique_ptr<KLChannel> channels_[9];
};

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
