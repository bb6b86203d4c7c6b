#include "scene/KLWireSource.h"

#include <iostream>

#include "scene/OrDagNode.h"
#include "scene/SceneDocument.h"

KLWireSource::KLWireSource(const char* path) : path_(path ? path : "") {
    if (!path) {
        error_ = "Cannot open scene file []: no file name given";
        return;
    }
    doc_ = SceneDocument::Load(path_, &error_);
}

KLWireSource::~KLWireSource() = default;

bool KLWireSource::Valid() const {
    return doc_ != nullptr;
}
const std::string& KLWireSource::ErrorText() const {
    return error_;
}
const std::string& KLWireSource::Path() const {
    return path_;
}

std::unique_ptr<OrDagNode> KLWireSource::RootNode() const {
    return doc_ ? std::make_unique<OrDagNode>(doc_, -1) : nullptr;
}

int KLWireSource::Store(const char* path) {
    std::string error;
    if (!path || !*path) {
        error = "Cannot write scene file []: no file name given";
    } else if (!doc_) {
        error = "Cannot write scene file [" + std::string(path) + "]: no scene is open (" + error_ +
                ")";
    } else if (doc_->Store(path, &error)) {
        return 1;
    }
    std::cerr << error << std::endl;
    return 0;
}
