#include "scene/OrDagNode.h"

#include "scene/SceneDocument.h"

OrDagNode* OrDagNode::asGroupNodePtr() {
    return isRoot() || doc_->HasChildren(index_) ? this : nullptr;
}

std::unique_ptr<OrDagNode> OrDagNode::childNode() const {
    const int child = doc_->FirstChild(index_);
    return child < 0 ? nullptr : std::make_unique<OrDagNode>(doc_, child);
}

std::unique_ptr<OrDagNode> OrDagNode::nextNode() const {
    const int next = doc_->NextSibling(index_);
    return next < 0 ? nullptr : std::make_unique<OrDagNode>(doc_, next);
}

const char* OrDagNode::name() const {
    return doc_->NodeName(index_).c_str();
}
