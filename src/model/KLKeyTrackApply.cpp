// Apply of a key track to a scene, and the 3D preview's key frames.
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "model/KLApplyCurve.h"
#include "model/KLKey.h"
#include "model/KLKeyChannel.h"
#include "model/KLKeySet.h"
#include "model/KLKeyTrack.h"
#include "scene/KLChannel.h"
#include "scene/KLKeyFrameList.h"
#include "scene/KLSplineChannel.h"
#include "scene/KLWire.h"
#include "scene/KLWireSetting.h"
#include "scene/KLWireSource.h"
#include "scene/OrDagNode.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLStdImp.h"
#include "toolkit/KLString.h"

namespace {
using NodeHandle = std::unique_ptr<OrDagNode>;

// The base node of an apply: the first top-level node named `dagName`, else the node of that
// name anywhere below the root; null when there is none.
NodeHandle find_base(KLWireSource* wire, const char* dagName) {
    if (!wire || !dagName)
        return nullptr;
    NodeHandle root = wire->RootNode();
    if (!root)
        return nullptr;
    for (NodeHandle node = root->childNode(); node; node = node->nextNode()) {
        const char* name = KLWire::NodeName(node.get());
        if (name && std::strcmp(name, dagName) == 0)
            return node;
    }
    return KLWire::FetchDagNode(root.get(), dagName);
}

}  // namespace

// For each animated parameter of the keyset, one key per event with start <= time <= end (in
// ticks, both ends inclusive) at time + offset, replacing the parameter's animation in the
// scene. Kind 1 blends each parameter from the rest pose (value 0) to the event's key shape
// (value 1) and beyond: d + value * (s - d). Kind 2 writes the values as they stand onto the
// keyset's node and channel.
int KLKeyTrack::Apply(KLWireSource* wire, const char* dagName, CueTime start, CueTime end,
                      CueTime offset) {
    KLStdImp& imp = KLStdImp::Workspace();
    NodeHandle base = find_base(wire, dagName);
    if (!base) {
        imp.Inform(KLFmt("Cannot find base dag [%s] for apply ...", dagName ? dagName : "").c_str(),
                   "Dismiss");
        return 0;
    }
    if (!keySet)
        return 1;
    // glTF has no time before 0: the scene cuts every stored curve there.
    int early = 0;
    for (const KLKeyEvent* event : events) {
        if (event->time >= start && event->time <= end && (event->time + offset).Ticks() < 0)
            ++early;
    }
    if (early > 0)
        imp.Inform(KLFmt("Keyset [%s]: %d key%s before time 0 dropped; each curve starts at 0 "
                         "with its value there.",
                         keySet->Name() ? keySet->Name() : "", early, early == 1 ? "" : "s")
                       .c_str(),
                   "Dismiss");

    if (keySet->kind == 1) {
        for (const auto& kc : keySet->keyChannels) {
            const char* name = kc->Name() ? kc->Name() : "";
            if (!kc->Constant())
                KLInform("Apply [%s.%s]...\n", name, kc->GetChannelName());
            bool ambiguous = false;
            NodeHandle node = KLFindChannelNode(base.get(), name, &ambiguous);
            if (!node) {
                const std::string message =
                    ambiguous ? KLFmt("Dag name [%s] isn't unique, ignored.", name)
                              : KLFmt("Could not locate apply dag [%s].", name);
                if (!imp.Confirm(message.c_str(), "Continue", "Cancel"))
                    return 0;
                continue;
            }
            KLApplyCurve(*this, kc.get(), start, end, offset).Store(node.get(), kc->channel);
        }
    } else if (keySet->kind == 2) {
        const char* name = keySet->nodeName ? keySet->nodeName->c_str() : "";
        NodeHandle node;
        {
            KLWireSetting demangle(KLWireSetting::kDemangleNames);
            node = KLWire::FetchDagNode(base.get(), name);
        }
        if (!node) {
            return imp.Confirm(KLFmt("Could not locate apply dag [%s].", name).c_str(), "Continue",
                               "Cancel")
                       ? 1
                       : 0;
        }
        KLApplyCurve(*this, nullptr, start, end, offset).Store(node.get(), keySet->channelIndex);
    }
    return 1;
}

// Kind 1: one key per event on the key-shape channel (the key shape's shapeValue) and on the
// value channel (the event's value), making and registering both channels with the key frame
// list on first use. Only while the workspace prepares key frames. Kind 2: refills the value
// channel, when there is one, with the events' values.
void KLKeyTrack::PrepareKeyFrames(KLKeyFrameList* list) {
    if (!keySet)
        return;
    if (keySet->kind == 1) {
        if (!make_channels(list))
            return;
        vuKeyFrames = false;
        ++previewRevision;
        for (const KLKeyEvent* event : events) {
            const KLKey* key = event->key ? event->key : keySet->GetKeyShape(event->shapeIndex);
            if (key)
                shapeChannel->AddKey(event->time, float(key->shapeValue));
            weightChannel->AddKey(event->time, event->value);
        }
    } else if (keySet->kind == 2 && weightChannel) {
        weightChannel->ClearAnimation();
        for (const KLKeyEvent* event : events)
            weightChannel->AddKey(event->time, event->value);
        vuKeyFrames = false;
        ++previewRevision;
    }
}

bool KLKeyTrack::make_channels(KLKeyFrameList* list) {
    if (!list)
        list = keySet->keyFrameList;
    if (!list || !KLStdImp::Workspace().KeyFramePreparation())
        return false;
    if (shapeChannel && weightChannel) {
        shapeChannel->ClearAnimation();
        weightChannel->ClearAnimation();
        return true;
    }
    release_channels();
    ownShape_ = std::make_unique<KLSplineChannel>();
    ownWeight_ = std::make_unique<KLSplineChannel>();
    ownShape_->SetStorageKeyed();
    ownWeight_->SetStorageKeyed();
    shapeChannel = ownShape_.get();
    weightChannel = ownWeight_.get();
    list->AddKeyChannel(shapeChannel, weightChannel);
    return true;
}

// Kind 1: one key per key shape at the key shape's frame: the key-shape channel holds its
// shapeValue and the value channel 1, so that the preview at that time is the key shape in
// full. Under the same conditions as PrepareKeyFrames. Kind 2: the value channel, when there
// is one, holds the keyset's rest value at every key shape (a single channel has no pose of
// its own per key shape).
void KLKeyTrack::PrepareVuKeyFrames(KLKeyFrameList* list) {
    if (!keySet)
        return;
    if (keySet->kind == 1) {
        if (!make_channels(list))
            return;
        for (const auto& key : keySet->keyShapes) {
            const CueTime at = CueTime::FromFrames(key->frame);
            shapeChannel->AddKey(at, float(key->shapeValue));
            weightChannel->AddKey(at, 1.0f);
        }
    } else if (keySet->kind == 2 && weightChannel) {
        weightChannel->ClearAnimation();
        for (const auto& key : keySet->keyShapes)
            weightChannel->AddKey(CueTime::FromFrames(key->frame), keySet->lowValue);
    } else {
        return;
    }
    vuKeyFrames = true;
    ++previewRevision;
}
