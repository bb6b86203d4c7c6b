#pragma once

#include "toolkit/xm/KLFileManager.h"

// Reference picture sequences: retrieving one loads the sequence it belongs to; they are
// never stored.
class ReferenceFileManager : public KLFileManager {
  public:
    using KLFileManager::KLFileManager;
    int RetrieveFile(const char* name) override;
    int StoreFile(const char* name) override;
    const char* DefaultDirectory() override;
    const char* FileTypeName() override { return "Reference"; }
    const char* Extension() override { return nullptr; }
};
