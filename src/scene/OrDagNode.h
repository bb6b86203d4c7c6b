#pragma once

#include <memory>

class SceneDocument;

// A handle on one node of an open scene (or on the scene's synthetic root group, whose
// children are the scene's root nodes). Handles are small objects handed out by the scene
// layer as std::unique_ptr. A handle keeps its scene document alive.
class OrDagNode {
  public:
    OrDagNode(std::shared_ptr<SceneDocument> doc, int index)
        : doc_(std::move(doc)), index_(index) {}

    // This node when it is a group (a node with children, or the root), else null. The
    // result is this very handle, not a new one.
    OrDagNode* asGroupNodePtr();
    // New handles on the first child and on the next sibling; null when there is none.
    std::unique_ptr<OrDagNode> childNode() const;
    std::unique_ptr<OrDagNode> nextNode() const;
    // The node's unique name in its scene (see KLWire::NodeName).
    const char* name() const;

    SceneDocument* document() const { return doc_.get(); }
    const std::shared_ptr<SceneDocument>& documentPtr() const { return doc_; }
    // Index of the node in the scene's node array; -1 for the root group.
    int index() const { return index_; }
    bool isRoot() const { return index_ < 0; }

  private:
    std::shared_ptr<SceneDocument> doc_;
    int index_;
};
