#pragma once

#include "toolkit/xm/KLFileManager.h"

// Keyset description files (".keyset"): open and save the keysets.
class KeysetFileManager : public KLFileManager {
  public:
    using KLFileManager::KLFileManager;
    int RetrieveFile(const char* name) override;
    int StoreFile(const char* name) override;
    const char* DefaultDirectory() override;
    const char* FileTypeName() override { return "Keyset"; }
    const char* Extension() override { return "keyset"; }
};
