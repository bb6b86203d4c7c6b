#pragma once

#include <utility>
#include <vector>

class KLChannel;

// The scene frame numbers of all key shapes of the loaded keysets, in keyset and key-shape
// order, plus one extra frame (the rest pose), and the key-shape and value channels that the
// preview's key tracks register with it. The channels are borrowed.
class KLKeyFrameList {
  public:
    KLKeyFrameList(std::vector<int> frames, int extraFrame)
        : frames_(std::move(frames)), extraFrame_(extraFrame) {}

    const std::vector<int>& Frames() const { return frames_; }
    int ExtraFrame() const { return extraFrame_; }

    void AddKeyChannel(KLChannel* shapeChannel, KLChannel* valueChannel);
    // Forgets the pair that holds `shapeChannel` or `valueChannel`.
    void RemoveKeyChannel(KLChannel* channel);
    const std::vector<std::pair<KLChannel*, KLChannel*>>& KeyChannels() const { return channels_; }

  private:
    std::vector<int> frames_;
    int extraFrame_;
    std::vector<std::pair<KLChannel*, KLChannel*>> channels_;
};
