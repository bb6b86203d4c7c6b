#pragma once

// The Motif GL drawing area, included from C++ only through this header: its header declares
// the widget class with Mesa's GLAPI, which carries no `extern`, so every C++ file including
// it directly would define the class variable.
#include <Xm/Xm.h>

#include <GL/glx.h>

#pragma push_macro("GLAPI")
#undef GLAPI
#define GLAPI extern
#include <GL/GLwMDrawA.h>
#pragma pop_macro("GLAPI")
