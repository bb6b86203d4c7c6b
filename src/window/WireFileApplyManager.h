#pragma once

#include "toolkit/xm/KLFileManager.h"

// The scene file to apply into: retrieving opens it for the apply dialog; storing writes the
// applied scene (and, with VX_RAWFILE set, its raw geometry beside it as NAME.raw).
class WireFileApplyManager : public KLFileManager {
  public:
    using KLFileManager::KLFileManager;
    int RetrieveFile(const char* name) override;
    int StoreFile(const char* name) override;
    const char* DefaultDirectory() override;
    const char* FileTypeName() override { return "Wire"; }
};
