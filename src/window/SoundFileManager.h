#pragma once

#include "toolkit/xm/KLFileManager.h"

// Sound files: retrieving one starts a new track on it; storing does nothing.
class SoundFileManager : public KLFileManager {
  public:
    using KLFileManager::KLFileManager;
    int RetrieveFile(const char* name) override;
    int StoreFile(const char* name) override;
    const char* DefaultDirectory() override;
    const char* FileTypeName() override { return "Sound"; }
    const char* Pattern() override { return "*.aif[cf]"; }
};
