#pragma once

#include <memory>
#include <optional>
#include <string>

#include "toolkit/CueTime.h"

class KLWireSource;
struct KLDagList;

// One apply of the key tracks into a scene file: the scene file, the stretch of the
// workspace's time line taken (sourceIn to sourceOut) and where it lands in the scene
// (destIn to destOut).
class KLEdlEvent {
  public:
    // A wireFile below the workspace's wire directory is held relative to it; null stays
    // null.
    KLEdlEvent(const char* wireFile, CueTime sourceIn, CueTime sourceOut, CueTime destIn,
               CueTime destOut);
    ~KLEdlEvent();
    KLEdlEvent(const KLEdlEvent&) = delete;
    KLEdlEvent& operator=(const KLEdlEvent&) = delete;

    // Frees the event's file name and extra block; leaves an open scene and the node list.
    static void DeleteEvent(void* event);

    // Opens the scene file (relative names joined to the wire directory) into `wire`,
    // replacing any scene already open, and builds the scene's node list anew. Does nothing
    // without a file name. `wire` is set even when the file cannot be read: see its Valid().
    void OpenWire();
    // Stores the open scene to `path` and closes it; 1 on success, 0 when storing failed or
    // no scene was open (then nothing is written).
    int StoreWire(const char* path);
    // Destroys the open scene, if any. The node list stays until the next OpenWire.
    void CloseWire();

    const char* WireFile() const { return wireFile ? wireFile->c_str() : nullptr; }

    std::optional<std::string> wireFile;
    std::unique_ptr<KLWireSource> wire;  // the scene while open
    CueTime sourceIn;
    CueTime sourceOut;
    CueTime destIn;
    CueTime destOut;
    std::shared_ptr<void> extra;  // set and read by the apply code
    std::unique_ptr<KLDagList> dagList;
};
