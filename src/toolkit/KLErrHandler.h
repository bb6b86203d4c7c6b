#pragma once

#include <string>

#include "toolkit/KLErr.h"

// Receives the reports of KLStatus, KLInform, KLWarning and KLError. Constructing a handler
// with `install` 0 makes it the current one (the previous one is restored when it is
// destroyed); without a handler, reports at or above the output level go to the error stream.
class KLErrHandler {
  public:
    static constexpr int kDefaultOutputLevel = KLErr::kWarning;
    static int outputLevel;

    explicit KLErrHandler(int install = 0);
    virtual ~KLErrHandler();
    KLErrHandler(const KLErrHandler&) = delete;
    KLErrHandler& operator=(const KLErrHandler&) = delete;

    // Deals with one report; the default writes it to the error stream when its level is at
    // least outputLevel.
    virtual void Handle(KLErr* e);

    static KLErrHandler* Current() { return current_; }
    // Hands a report to the current handler (or the default behaviour when none).
    static void Report(int level, const std::string& message);

    // An observer that sees every status report, whatever the output level (the window's
    // status line); null for none.
    using StatusHook = void (*)(const char* message, void* data);
    static void SetStatusHook(StatusHook hook, void* data);

  private:
    static KLErrHandler* current_;
    KLErrHandler* previous_ = nullptr;
    bool installed_ = false;
};

// The reporting functions, printf-style.
void KLStatus(const char* format, ...) __attribute__((format(printf, 1, 2)));
void KLInform(const char* format, ...) __attribute__((format(printf, 1, 2)));
void KLWarning(const char* format, ...) __attribute__((format(printf, 1, 2)));
void KLError(const char* format, ...) __attribute__((format(printf, 1, 2)));
