#include "scene/KLWire.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <fstream>
#include <functional>

#include "scene/OrDagNode.h"
#include "scene/SceneDocument.h"

int KLWire::alwaysClearChannel = 0;

namespace {
bool demangle = false;

// Calls `visit` on `index` and every node below it, depth first, parents before children;
// stops as soon as `visit` returns true and then returns that node (else -2). Iterative: a
// hierarchy may be deeper than the call stack.
int walk(const SceneDocument& doc, int index, const std::function<bool(int)>& visit) {
    if (visit(index)) {
        return index;
    }
    int at = doc.FirstChild(index);
    while (at >= 0) {
        if (visit(at)) {
            return at;
        }
        int next = doc.FirstChild(at);
        // Without children: the next sibling of the nearest node on the way back up to `index`.
        for (int up = at; next < 0 && up >= 0 && up != index; up = doc.Parent(up)) {
            next = doc.NextSibling(up);
        }
        at = next;
    }
    return -2;
}

// The name up to its first "#" (the instance suffix removed).
std::string base_name(const std::string& name) {
    return name.substr(0, name.find('#'));
}

}  // namespace

void KLWire::Initialize() {
    demangle = false;
    alwaysClearChannel = 0;
}

int KLWire::IsWireFile(const char* path) {
    if (!path) {
        return 0;
    }
    std::string error;
    return SceneDocument::Load(path, &error) ? 1 : 0;
}

const char* KLWire::NodeName(OrDagNode* node) {
    return node ? node->name() : "";
}

std::unique_ptr<OrDagNode> KLWire::FetchDagNode(OrDagNode* below, const char* name) {
    if (!below || !name) {
        return nullptr;
    }
    const SceneDocument& doc = *below->document();
    std::string wanted = name;
    // Names are unique, so the first match depth first is the one node of that name, when it
    // lies below (the group itself is matched by its own name first: the root group's name
    // may also be a node's).
    int found = doc.NodeName(below->index()) == wanted ? below->index() : doc.FindNode(wanted);
    if (found >= 0 && !doc.Below(found, below->index())) {
        found = -2;
    }
    if (found == -2 && demangle && wanted.find('#') == std::string::npos) {
        std::string prefix = wanted + "#";
        found = walk(doc, below->index(),
                     [&](int i) { return doc.NodeName(i).compare(0, prefix.size(), prefix) == 0; });
    }
    return found == -2 ? nullptr : std::make_unique<OrDagNode>(below->documentPtr(), found);
}

int KLWire::UniqueDagName(OrDagNode* below, const char* name) {
    if (!below || !name) {
        return 0;
    }
    const SceneDocument& doc = *below->document();
    std::string wanted = name;
    int count = 0;
    walk(doc, below->index(), [&](int i) {
        count += base_name(doc.NodeName(i)) == wanted;
        return count > 1;
    });
    return count == 1;
}

void KLWire::DemangleNames(int on) {
    demangle = on != 0;
}

int KLWire::NamesDemangled() {
    return demangle ? 1 : 0;
}

OrChannel* KLWire::FindChannel(OrDagNode* node, int channel) {
    if (!node || node->isRoot()) {
        return nullptr;
    }
    return node->document()->Curve(node->index(), channel);
}

int KLWire::StoreChannel(OrDagNode* node, int channel, int count, const CueTime* times,
                         const float* values, const int* inTangents, const void* /*inDetail*/,
                         const int* outTangents, const void* /*outDetail*/) {
    if (!node || node->isRoot() || channel < 0 || channel >= SceneDocument::kChannels ||
        count < 0 || (count > 0 && (!times || !values))) {
        return 0;
    }
    std::vector<ChannelCurve::Key> keys;
    if (!ChannelCurve::FromApplyArrays(count, times, values, inTangents, outTangents, &keys)) {
        return 0;
    }
    node->document()->SetCurve(node->index(), channel, std::move(keys), alwaysClearChannel != 0);
    return 1;
}

std::unique_ptr<KLDagList> KLWire::BuildDagList(OrDagNode* root, int withRoot) {
    auto list = std::make_unique<KLDagList>();
    if (!root) {
        return list;
    }
    const SceneDocument& doc = *root->document();
    walk(doc, root->index(), [&](int i) {
        if (i != root->index() || withRoot) {
            list->nodes.push_back(std::make_unique<OrDagNode>(root->documentPtr(), i));
        }
        return false;
    });
    return list;
}

void KLWire::NukeBlendSurfaces(OrDagNode* /*root*/) {}

void KLWire::EmptyDumpster() {}

void KLWire::ClearAll() {
    demangle = false;
}
