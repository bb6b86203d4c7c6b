#pragma once

#include <memory>
#include <string>

class OrDagNode;
class SceneDocument;

// An open scene file. The constructor reads the file; Valid() says whether that worked and
// ErrorText() why not (the message names the file).
class KLWireSource {
  public:
    explicit KLWireSource(const char* path);
    ~KLWireSource();

    bool Valid() const;
    const std::string& ErrorText() const;
    const std::string& Path() const;

    // A new handle on the scene's root group (its children are the scene's root nodes);
    // null when the scene is not valid.
    std::unique_ptr<OrDagNode> RootNode() const;
    // Writes the scene, with every channel stored into it, to `path` (.gltf or .glb by the
    // name's ending) through a temporary file renamed into place. Returns 1 on success, 0
    // with a message on the error stream naming the file.
    int Store(const char* path);

    SceneDocument* document() const { return doc_.get(); }

  private:
    std::shared_ptr<SceneDocument> doc_;
    std::string path_;
    std::string error_;
};
