#pragma once

#include <map>
#include <memory>
#include <string>
#include <vector>

class CueRecognizer;

// The recognizer plug-ins found on the plug-in path: shared objects loaded with dlopen, each
// exporting the entry symbols of CuePlugin.h. Keys are the recognizers' names in the order
// found.
class KLPlugCatalog {
  public:
    KLPlugCatalog();
    virtual ~KLPlugCatalog();

    // Loads every plug-in of the colon-separated directories of `path`; returns how many
    // recognizers were added. Files that are not plug-ins, or were built for another
    // plug-in interface version, are reported (KLWarning) and skipped.
    int ScanDirectory(const char* path);
    // Loads one plug-in file; false with a warning when it is not a usable plug-in.
    bool LoadPlugin(const char* file);

    // Key walk: the first name, and the name after `key` (null at the end).
    const char* HeadKey() const;
    const char* NextKey(const char* key) const;
    int Count() const { return int(order_.size()); }

  protected:
    struct Plugin;
    std::vector<std::string> order_;
    std::map<std::string, std::unique_ptr<CueRecognizer>> prototypes_;
    std::vector<void*> handles_;
    bool scanned_ = false;  // ScanDirectory has run at least once
};
