#pragma once

#include <gtest/gtest.h>

#include <stdlib.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <sstream>
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

// The whole content of a file (empty when it cannot be read).
inline std::string Slurp(const std::string& path) {
    std::ostringstream bytes;
    bytes << std::ifstream(path, std::ios::binary).rdbuf();
    return bytes.str();
}

// Sound output through one of SDL's device-less drivers: "dummy", or "disk" writing every
// buffer to `file` as fast as the device asks for it.
inline void UseSoundDriver(const char* driver, const char* file = "/dev/null") {
    setenv("SDL_AUDIODRIVER", driver, 1);
    setenv("SDL_DISKAUDIOFILE", file, 1);
    setenv("SDL_DISKAUDIODELAY", "0", 1);
}

// Runs `body` in a child process; its wait status (-1 when there is no child).
template <typename F>
int InChild(F body) {
    const pid_t pid = ::fork();
    if (pid == 0)
        body(), ::_exit(0);
    int status = -1;
    if (pid > 0)
        ::waitpid(pid, &status, 0);
    return status;
}

// Gives each test a fresh directory, removed afterwards, and keeps the reports made meanwhile.
class TempDirTest : public ::testing::Test {
  protected:
    void SetUp() override { ASSERT_FALSE(temp_.path().empty()); }
    std::string Path(const std::string& leaf) const { return temp_ / leaf; }

    testkit::TempDir temp_;
    const std::filesystem::path dir_{temp_.path()};
    CaptureErrors errors_;
};
