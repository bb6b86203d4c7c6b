// A plug-in of another interface version: refused before its create function is called.
#include <cstdlib>

#include "toolkit/CuePlugin.h"

CHIRRUP_PLUGIN_EXPORT int chirrup_plugin_abi_version(void) {
    return CHIRRUP_PLUGIN_ABI_VERSION + 41;
}
CHIRRUP_PLUGIN_EXPORT CueRecognizer* chirrup_plugin_create(void) {
    std::abort();
}
