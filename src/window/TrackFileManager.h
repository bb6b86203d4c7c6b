#pragma once

#include "toolkit/xm/KLFileManager.h"

// Track files (".track"): open and save the key tracks, marks and sound name.
class TrackFileManager : public KLFileManager {
  public:
    using KLFileManager::KLFileManager;
    int RetrieveFile(const char* name) override;
    int StoreFile(const char* name) override;
    const char* DefaultDirectory() override;
    const char* FileTypeName() override { return "Track"; }
    const char* Extension() override { return "track"; }
};
