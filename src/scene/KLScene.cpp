#include "scene/KLScene.h"

#include "scene/KLGraphNode.h"
#include "scene/KLWireSource.h"
#include "scene/SceneDocument.h"

KLScene::KLScene() = default;
KLScene::~KLScene() = default;

void KLScene::LoadGeometry(KLWireSource* source) {
    nodes_.clear();
    source_ = source;
    if (!source || !source->document()) {
        return;
    }
    const SceneDocument& doc = *source->document();
    for (int i = 0; i < doc.NodeCount(); ++i) {
        const std::string& name = doc.NodeName(i);
        nodes_[name] = std::make_unique<KLGraphNode>(name);
    }
}

KLGraphNode* KLScene::FetchNode(const char* name) {
    if (!name) {
        return nullptr;
    }
    auto it = nodes_.find(name);
    return it == nodes_.end() ? nullptr : it->second.get();
}
