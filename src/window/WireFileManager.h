#pragma once

#include "toolkit/xm/KLFileManager.h"

// Scene files chosen only for their name: retrieving and storing do nothing.
class WireFileManager : public KLFileManager {
  public:
    using KLFileManager::KLFileManager;
    int RetrieveFile(const char* name) override;
    int StoreFile(const char* name) override;
    const char* DefaultDirectory() override;
    const char* FileTypeName() override { return "Wire"; }
};
