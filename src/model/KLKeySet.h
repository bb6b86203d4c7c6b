#pragma once

#include <iosfwd>
#include <list>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "model/KLKey.h"
#include "model/KLKeyChannel.h"
#include "toolkit/CueTime.h"

class CueRecognizer;
class KLImageSGI;
class KLKeyFrameList;
class OrDagNode;

// A named, ordered table of key shapes that a key track calls up by index, with the key
// channels that carry the differences between the shapes and the recognizers bound to it.
//
// Kind 1 holds key shapes that are frames of a scene file (`sourceFile`); extraction fills its
// key channels. Kind 2 drives one channel (`channelIndex`) of one scene node (`nodeName`) with
// the key values directly.
class KLKeySet {
  public:
    // Kind 1.
    KLKeySet(const char* name, const char* sourceFile);
    // Kind 2.
    KLKeySet(const char* name, const char* nodeName, int channelIndex, float lowValue,
             float highValue);
    ~KLKeySet();
    KLKeySet(const KLKeySet&) = delete;
    KLKeySet& operator=(const KLKeySet&) = delete;

    void clear_keyshapes();

    // Index of the first key shape standing exactly at `frame`, or -1.
    int GetKeyShapeIdx(float frame) const;
    // Frame of the first key shape of that index, or -1.0.
    float GetKeyShapeFrame(int index) const;
    // Index of the first key shape of that name (case-sensitive), or -1.
    int GetKeyShapeId(const char* name) const;
    // Null when i is out of range.
    KLKey* GetKeyShape(int i) const;
    KLImageSGI* GetKeyShapeImage(int i) const;
    KLImageSGI* GetKeyShapeIcon(int i) const;
    const char* GetKeyShapeName(int i) const;
    // keyShapes[defaultIndex]; null when the keyset has no key shapes.
    KLKey* GetDefaultKeyShape() const;

    // The newest recognizer of that name, or null. AddRecognizer puts the recognizer first
    // and returns it.
    CueRecognizer* GetRecognizer(const char* name) const;
    CueRecognizer* AddRecognizer(std::unique_ptr<CueRecognizer> recognizer);

    // The most recently added key channel for (node name, channel), or null. AddKeyChannel
    // puts the channel first and returns it.
    KLKeyChannel* GetKeyChannel(const char* name, int channel) const;
    KLKeyChannel* AddKeyChannel(std::unique_ptr<KLKeyChannel> channel);

    // The keyset block: "key <name> <frame> [<image>]" lines up to "end" (see KLKeySet.cpp).
    // Read replaces the key shapes; Write writes the key lines only.
    void Read(std::istream& in);
    void Write(std::ostream& out);

    // Fills keyChannels from a scene: samples every node at every key shape's frame and keeps
    // the channels that change between key shapes. `scene` is the scene's root group (its
    // children are the top-level nodes) or the first top-level node; the caller keeps it.
    void ExtractKeys(OrDagNode* scene);
    // Samples `node` and everything below it at `t` into slot `index` of the key channels.
    void extract_dag(CueTime t, int index, OrDagNode* node);

    const char* Name() const { return name ? name->c_str() : nullptr; }

    int kind = 1;
    std::optional<std::string> name;
    std::optional<std::string> sourceFile;  // kind 1: the scene file as given
    std::optional<std::string> nodeName;    // kind 2: the driven node
    int channelIndex = 0;                   // kind 2: the driven channel (KLKeyChannel::Channel)
    float lowValue = 0.0f;                  // kind 2: rest value of the driven channel
    float highValue = 0.0f;                 // kind 2: stored, not used here
    std::vector<std::unique_ptr<KLKey>> keyShapes;          // in index order
    int keyShapeCount = 0;                                  // keyShapes.size()
    int defaultIndex = 0;                                   // the rest pose
    std::list<std::unique_ptr<KLKeyChannel>> keyChannels;   // newest first
    std::list<std::unique_ptr<CueRecognizer>> recognizers;  // newest first
    int imagesOnFile = 1;   // 1 while every key shape read has a readable image file
    int imagesChanged = 0;  // 1 when the pictures were made anew in the program
    KLKeyFrameList* keyFrameList = nullptr;  // borrowed: the 3D preview's key frame list

  private:
    void read_block(std::istream& in);
    // The full path of key shape i's picture as Write makes it.
    std::string picture_path(int i, const char* pixDir) const;
};
