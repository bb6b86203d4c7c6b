#pragma once

#include <array>
#include <cstdint>
#include <vector>

// The nine transform channels (TX TY TZ, RX RY RZ in degrees, SX SY SZ) of every node of a
// scene at one time, and which of them were set by the animation being previewed.
class ScenePose {
  public:
    using Channels = std::array<double, 9>;

    void Reset(const std::vector<Channels>& base) {
        channels_ = base;
        posed_.assign(base.size(), 0);
    }
    // Sets one channel of one node; out-of-range node or channel numbers are ignored.
    void Set(int node, int channel, double value) {
        if (node < 0 || size_t(node) >= channels_.size() || channel < 0 || channel >= 9) {
            return;
        }
        channels_[size_t(node)][size_t(channel)] = value;
        posed_[size_t(node)] |= uint16_t(1u << channel);
    }
    double Get(int node, int channel) const { return channels_[size_t(node)][size_t(channel)]; }
    const Channels& Node(int node) const { return channels_[size_t(node)]; }
    // True when any channel of the node was set since Reset.
    bool Posed(int node) const { return posed_[size_t(node)] != 0; }
    int NodeCount() const { return int(channels_.size()); }

  private:
    std::vector<Channels> channels_;
    std::vector<uint16_t> posed_;  // bit c: channel c was set
};
