#include "toolkit/KLErrHandler.h"

#include <cstdarg>
#include <iostream>

#include "toolkit/KLString.h"

int KLErrHandler::outputLevel = KLErrHandler::kDefaultOutputLevel;
KLErrHandler* KLErrHandler::current_ = nullptr;

namespace {
KLErrHandler::StatusHook status_hook = nullptr;
void* status_hook_data = nullptr;
}  // namespace

KLErrHandler::KLErrHandler(int install) {
    if (install == 0) {
        previous_ = current_;
        current_ = this;
        installed_ = true;
    }
}

KLErrHandler::~KLErrHandler() {
    if (installed_ && current_ == this)
        current_ = previous_;
}

void KLErrHandler::Handle(KLErr* e) {
    if (e->Level() < outputLevel)
        return;
    std::cerr << e->Message();
    std::cerr.flush();
}

void KLErrHandler::SetStatusHook(StatusHook hook, void* data) {
    status_hook = hook;
    status_hook_data = data;
}

void KLErrHandler::Report(int level, const std::string& message) {
    if (level == KLErr::kStatus && status_hook)
        status_hook(message.c_str(), status_hook_data);
    KLErr e(level, message);
    if (current_)
        current_->Handle(&e);
    else if (level >= outputLevel)
        std::cerr << message << std::flush;
}

#define KL_REPORT(level)                        \
    va_list args;                               \
    va_start(args, format);                     \
    std::string message = KLVFmt(format, args); \
    va_end(args);                               \
    KLErrHandler::Report(level, message)

void KLStatus(const char* format, ...) {
    KL_REPORT(KLErr::kStatus);
}
void KLInform(const char* format, ...) {
    KL_REPORT(KLErr::kInformation);
}
void KLWarning(const char* format, ...) {
    KL_REPORT(KLErr::kWarning);
}
void KLError(const char* format, ...) {
    KL_REPORT(KLErr::kError);
}
