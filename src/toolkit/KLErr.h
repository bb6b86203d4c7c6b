#pragma once

#include <string>
#include <utility>

// One report of the toolkit's reporting functions: a level and a text (the text keeps its
// own end of line, if any).
class KLErr {
  public:
    // Levels, least to most serious. A report reaches the handler's output only when its
    // level is at least KLErrHandler::outputLevel: the default shows warnings and errors,
    // "-v" (level 2) shows everything.
    enum Level { kStatus = 2, kInformation = 3, kWarning = 4, kError = 5 };

    KLErr(int level, std::string message) : level_(level), message_(std::move(message)) {}
    int Level() const { return level_; }
    const char* Message() const { return message_.c_str(); }

  private:
    int level_;
    std::string message_;
};
