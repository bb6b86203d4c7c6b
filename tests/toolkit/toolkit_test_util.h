#pragma once

#include <gtest/gtest.h>
#include <stdlib.h>

#include <filesystem>
#include <string>
#include <utility>
#include <vector>

#include "toolkit/KLErrHandler.h"

// Keeps the toolkit's reports (level, text) instead of printing them, while it lives.
class CaptureErrors : public KLErrHandler {
  public:
    void Handle(KLErr* e) override { reports.push_back({e->Level(), e->Message()}); }
    std::vector<std::pair<int, std::string>> reports;
};

// Gives each test a fresh directory, removed afterwards, and keeps the reports made meanwhile.
class TempDirTest : public ::testing::Test {
  protected:
    void SetUp() override {
        char name[] = "/tmp/chirrup-toolkit-XXXXXX";
        ASSERT_NE(mkdtemp(name), nullptr);
        dir_ = name;
    }
    void TearDown() override { std::filesystem::remove_all(dir_); }
    std::string Path(const std::string& leaf) const { return (dir_ / leaf).string(); }

    std::filesystem::path dir_;
    CaptureErrors errors_;
};
