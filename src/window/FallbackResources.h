#pragma once

// The application resource file (resources/Chirrup) compiled into the program, as Xt's
// fallback resources: used when no app-defaults file of class "Chirrup" is installed.
// Null-terminated.
const char* const* chirrup_fallback_resources();
