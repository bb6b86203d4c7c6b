// Key-shape extraction: the key channels of a kind-1 keyset sampled from its scene.
#include <algorithm>
#include <memory>
#include <vector>

#include "model/KLKeySet.h"
#include "scene/KLWire.h"
#include "scene/OrDagNode.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLStdImp.h"
#include "toolkit/KLString.h"

void KLKeySet::extract_dag(CueTime t, int index, OrDagNode* top) {
    if (!top)
        return;
    const double frame = t.Frames();
    // Depth first, parents before children, with an explicit stack: a scene's hierarchy may be
    // deeper than the call stack.
    std::vector<std::unique_ptr<OrDagNode>> stack;
    stack.push_back(std::make_unique<OrDagNode>(top->documentPtr(), top->index()));
    while (!stack.empty()) {
        std::unique_ptr<OrDagNode> node = std::move(stack.back());
        stack.pop_back();
        const char* nodeName = KLWire::NodeName(node.get());
        for (int c = KLKeyChannel::kTX; c <= KLKeyChannel::kSZ; ++c) {
            OrChannel* channel = KLWire::FindChannel(node.get(), c);
            if (!channel)
                continue;
            const double value = channel->eval(frame);
            KLKeyChannel* kc = GetKeyChannel(nodeName, c);
            if (!kc)
                kc = AddKeyChannel(std::make_unique<KLKeyChannel>(nodeName, c, keyShapeCount));
            kc->Set(index, float(value));
        }
        if (node->asGroupNodePtr()) {
            const size_t at = stack.size();
            for (std::unique_ptr<OrDagNode> child = node->childNode(); child;
                 child = child->nextNode())
                stack.push_back(std::make_unique<OrDagNode>(child->documentPtr(), child->index()));
            std::reverse(stack.begin() + long(at), stack.end());  // first child on top
        }
    }
}

// Samples every top-level node (and all below it) at each key shape's frame, then drops the
// channels that do not change between key shapes. Channels are shared by (node name,
// channel), so two nodes of one name set the same slots twice and their channel is dropped
// as incompletely filled: only uniquely named nodes are extracted.
void KLKeySet::ExtractKeys(OrDagNode* scene) {
    if (!scene)
        return;
    for (int i = 0; i < keyShapeCount; ++i) {
        const KLKey* key = keyShapes[i].get();
        const CueTime t(double(key->frame), 0);
        std::unique_ptr<OrDagNode> node =
            scene->isRoot() ? scene->childNode()
                            : std::make_unique<OrDagNode>(scene->documentPtr(), scene->index());
        for (; node; node = node->nextNode())
            extract_dag(t, key->index, node.get());
    }
    for (auto it = keyChannels.begin(); it != keyChannels.end();) {
        const KLKeyChannel* kc = it->get();
        if (kc->Constant()) {
            it = keyChannels.erase(it);
        } else {
            KLInform("Key Channel [%s.%s].\n", kc->Name() ? kc->Name() : "", kc->GetChannelName());
            ++it;
        }
    }
    if (keyChannels.empty() && keyShapeCount > 1)
        KLStdImp::Workspace().Inform(
            KLFmt("Keyset [%s]: its key shapes differ in no channel, so it has no key channels.",
                  Name() ? Name() : "")
                .c_str(),
            "Dismiss");
}
