#pragma once

#include <memory>

#include "scene/KLDagList.h"
#include "scene/OrChannel.h"
#include "scene/OrDagNode.h"
#include "toolkit/CueTime.h"

// The scene programming interface: static operations on open scenes (KLWireSource) and the
// nodes they hand out. Channels 0..8 are TX TY TZ RX RY RZ SX SY SZ of a node's local
// transform; rotations in degrees.
class KLWire {
  public:
    enum Tangent { kSmooth = 0, kLinear = 1, kFlat = 2 };

    // 1: StoreChannel clears a channel's old keys first. Switch it on around a call with
    // KLWireSetting, so that it cannot stay on.
    static int alwaysClearChannel;

    static void Initialize();
    // Nonzero when `path` is a file that parses as a glTF scene.
    static int IsWireFile(const char* path);
    static const char* NodeName(OrDagNode* node);
    // A new handle on the node named `name` at or below `below`, searched depth first; null
    // when there is none. With name demangling on, `name` without "#" also matches the first
    // node named `name` plus a "#n" suffix.
    static std::unique_ptr<OrDagNode> FetchDagNode(OrDagNode* below, const char* name);
    // Nonzero when exactly one node at or below `below` bears `name` (its name with any "#n"
    // suffix removed equals `name`).
    static int UniqueDagName(OrDagNode* below, const char* name);
    // Name demangling for FetchDagNode, off by default; switch it on around a call with
    // KLWireSetting.
    static void DemangleNames(int on);
    static int NamesDemangled();
    // The animation channel `channel` (0..8) of the node, or null when the node does not
    // animate it. The channel belongs to the scene.
    static OrChannel* FindChannel(OrDagNode* node, int channel);
    // Replaces the animation of one channel by `count` keys: times in ticks, values, in- and
    // out-tangent codes (Tangent). The two null arguments are unused tangent details. Returns
    // nonzero on success.
    static int StoreChannel(OrDagNode* node, int channel, int count, const CueTime* times,
                            const float* values, const int* inTangents, const void* inDetail,
                            const int* outTangents, const void* outDetail);
    // Every node at or below `root` in depth-first order; `withRoot` nonzero includes `root`.
    static std::unique_ptr<KLDagList> BuildDagList(OrDagNode* root, int withRoot);
    // Blend surfaces are a construct glTF does not have (morph targets are kept and played
    // as they are): nothing to remove.
    static void NukeBlendSurfaces(OrDagNode* root);
    static void EmptyDumpster();
    static void ClearAll();
};
