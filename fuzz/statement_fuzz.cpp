// Feeds arbitrary bytes to the statement reader: every line is split, every token read as
// text, integer, float and time, and blocks are skipped, as the file readers do.
#include <cstddef>
#include <cstdint>
#include <sstream>
#include <string>

#include "toolkit/CueStatement.h"
#include "toolkit/CueTime.h"
#include "toolkit/KLString.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::string text(reinterpret_cast<const char*>(data), size);
    std::istringstream in(text);
    CueStatement s;
    while (s.Read(in)) {
        for (int i = 0; i < s.Count(); ++i) {
            const char* t = s.ArgText(i);
            (void)s.ArgInt(i);
            const float f = s.ArgFloat(i);
            const CueTime time(f, 0);
            (void)time.Frame();
            CueTime parsed;
            if (parsed.SetText(t)) {
                CueTime back;
                if (!back.SetText(parsed.Text()) || back != parsed) __builtin_trap();
            }
            // Quoting a token and reading it back gives the token, unless it holds a quote.
            const std::string quoted = KLQuote(t);
            if (std::string(t).find('"') == std::string::npos && std::string(t).find('\r') == std::string::npos) {
                CueTokenList again(quoted);
                if (again.Count() != 1 || std::string(again.ArgText(0)) != t) __builtin_trap();
            }
        }
        if (s.Matches("begin")) KLEatBeginEndBlock(in);
    }
    return 0;
}
