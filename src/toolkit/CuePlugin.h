#pragma once

// The entry symbols of a recognizer plug-in.
//
// A plug-in is a C++ shared object ("*.so") built with the program from the same headers and
// the same compiler. It derives one class from CueRecognizer and exports two C functions:
//
//   int chirrup_plugin_abi_version(void);
//       returns CHIRRUP_PLUGIN_ABI_VERSION as it was when the plug-in was compiled;
//   CueRecognizer* chirrup_plugin_create(void);
//       returns a new recognizer with default settings: the prototype. The catalogue owns it
//       and hands out Clone()s of it; it is deleted before the shared object is closed.
//
// CHIRRUP_PLUGIN(Class) defines both for a class with a default constructor.
//
// The plug-in's undefined symbols (CueRecognizer's own members, CueSound, the reporting
// functions) are resolved against the program that loads it, so the program is linked with
// its symbols exported and the plug-in is not linked with the program's libraries. No
// exception may leave plug-in code: the catalogue wraps every call into a plug-in.
//
// Raise CHIRRUP_PLUGIN_ABI_VERSION whenever a change to CueRecognizer (its members, its
// virtual functions, their order) or to anything it hands to plug-ins would break a plug-in
// compiled against the old headers; the catalogue refuses plug-ins of another version.

#include "toolkit/CueRecognizer.h"

#define CHIRRUP_PLUGIN_ABI_VERSION 1

// Names of the entry symbols, for dlsym.
#define CHIRRUP_PLUGIN_ABI_SYMBOL "chirrup_plugin_abi_version"
#define CHIRRUP_PLUGIN_CREATE_SYMBOL "chirrup_plugin_create"

extern "C" {
typedef int (*ChirrupPluginAbiVersionFn)(void);
typedef CueRecognizer* (*ChirrupPluginCreateFn)(void);
}

#define CHIRRUP_PLUGIN_EXPORT extern "C" __attribute__((visibility("default")))

// Defines the two entry symbols for `Class`. An exception thrown while constructing the
// prototype is caught here and turned into a null result.
#define CHIRRUP_PLUGIN(Class)                                          \
    CHIRRUP_PLUGIN_EXPORT int chirrup_plugin_abi_version(void) {       \
        return CHIRRUP_PLUGIN_ABI_VERSION;                             \
    }                                                                  \
    CHIRRUP_PLUGIN_EXPORT CueRecognizer* chirrup_plugin_create(void) { \
        try {                                                          \
            return new Class();                                        \
        } catch (...) {                                                \
            return nullptr;                                            \
        }                                                              \
    }
