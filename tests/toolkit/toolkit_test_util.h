#pragma once

#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <utility>
#include <vector>

#include "testkit/TempDir.h"
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
    void SetUp() override { ASSERT_FALSE(temp_.path().empty()); }
    std::string Path(const std::string& leaf) const { return temp_ / leaf; }

    testkit::TempDir temp_;
    const std::filesystem::path dir_{temp_.path()};
    CaptureErrors errors_;
};
