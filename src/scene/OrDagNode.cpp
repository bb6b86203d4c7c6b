#include "scene/OrDagNode.h"

#include "scene/SceneDocument.h"

OrDagNode* OrDagNode::asGroupNodePtr() {
    return isRoot() || doc_->HasChildren(index_) ? this : nullptr;
}

OrDagNode* OrDagNode::childNode() const {
    int child = doc_->FirstChild(index_);
    return child < 0 ? nullptr : new OrDagNode(doc_, child);
}

OrDagNode* OrDagNode::nextNode() const {
    int next = doc_->NextSibling(index_);
    return next < 0 ? nullptr : new OrDagNode(doc_, next);
}

const char* OrDagNode::name() const {
    return doc_->NodeName(index_).c_str();
}
