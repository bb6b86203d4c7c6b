#pragma once

#include <X11/Intrinsic.h>

// The creation function of one widget-table row, of the Motif form
// (parent, name, argument list, argument count) -> the new widget.
using KLWidgetCreateProc = Widget (*)(Widget parent, String name, ArgList args, Cardinal count);

// One row of a widget table. The marker's "." count is the widget's depth (0 = a child of
// the application shell; a row's parent is the nearest earlier row one level shallower);
// its last character is "+" (manage after creating) or "-" (leave unmanaged). The table
// ends with a row whose three fields are all null.
struct KLWidgetSpec {
    const char* marker;
    const char* name;
    KLWidgetCreateProc create;
};
