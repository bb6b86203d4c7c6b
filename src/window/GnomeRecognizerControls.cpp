// The controls recognizer plug-ins put on their panels through CueChirrup: integer and
// decimal sliders with a value label, and option menus. Each control keeps a record of the
// recognizer it currently serves and the plug-in's callback.
#include <Xm/Label.h>
#include <Xm/PushB.h>
#include <Xm/RowColumn.h>
#include <Xm/Scale.h>
#include <Xm/Xm.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <memory>
#include <string>
#include <vector>

#include "toolkit/CueChirrup.h"
#include "toolkit/CueRecognizer.h"
#include "toolkit/KLString.h"
#include "window/Gnome.h"

namespace {

// What a slider or option menu calls: the recognizer it currently serves and the plug-in's
// callback. Kept for the life of the process (panels are never destroyed before it ends).
struct SliderRecord {
    CueRecognizer* recognizer = nullptr;
    CueChirrupHost::IntCallback intCallback = nullptr;
    CueChirrupHost::FloatCallback floatCallback = nullptr;
    CueChirrupHost::OptionCallback optionCallback = nullptr;
    Widget valueLabel = nullptr;
    std::vector<Widget> buttons;  // an option menu's entries, in index order
};
std::vector<std::unique_ptr<SliderRecord>> theRecords;

// Float sliders keep their value in thousandths on the integer scale.
constexpr int kFloatScale = 1000;

std::string int_text(int value) {
    return KLFmt(" %5d ", value);
}
std::string float_text(float value) {
    return KLFmt("%8.3f", value);
}

void int_changed_cb(Widget, XtPointer client, XtPointer call) {
    auto* record = static_cast<SliderRecord*>(client);
    const int value = static_cast<XmScaleCallbackStruct*>(call)->value;
    Gnome::SetLabel(record->valueLabel, int_text(value));
    if (record->intCallback && record->recognizer)
        record->intCallback(record->recognizer, value);
}
void int_drag_cb(Widget, XtPointer client, XtPointer call) {
    Gnome::SetLabel(static_cast<SliderRecord*>(client)->valueLabel,
                    int_text(static_cast<XmScaleCallbackStruct*>(call)->value));
}
void float_changed_cb(Widget, XtPointer client, XtPointer call) {
    auto* record = static_cast<SliderRecord*>(client);
    const float value = float(static_cast<XmScaleCallbackStruct*>(call)->value) / kFloatScale;
    Gnome::SetLabel(record->valueLabel, float_text(value));
    if (record->floatCallback && record->recognizer)
        record->floatCallback(record->recognizer, value);
}
void float_drag_cb(Widget, XtPointer client, XtPointer call) {
    Gnome::SetLabel(
        static_cast<SliderRecord*>(client)->valueLabel,
        float_text(float(static_cast<XmScaleCallbackStruct*>(call)->value) / kFloatScale));
}
void option_cb(Widget w, XtPointer client, XtPointer) {
    auto* record = static_cast<SliderRecord*>(client);
    for (size_t i = 0; i < record->buttons.size(); ++i)
        if (record->buttons[i] == w && record->optionCallback && record->recognizer)
            record->optionCallback(record->recognizer, int(i));
}

// Runs one of the main window's plug-in operations; 0 when there is no window.
template <typename... Params, typename... Args>
int to_window(int (Gnome::*operation)(Params...), Args... args) {
    Gnome* g = TheGnome();
    return g ? (g->*operation)(args...) : 0;
}

// CueChirrup's host: the operations go to the one main window.
class GnomeChirrupHost : public CueChirrupHost {
  public:
    int CreateFloatSlider(CueRecognizer* r, const char* name, float minimum, float maximum,
                          float value, FloatCallback callback) override {
        return to_window(&Gnome::CreateFloatSlider, r, name, minimum, maximum, value, callback);
    }
    int SetFloatSlider(CueRecognizer* r, const char* name, float value) override {
        return to_window(&Gnome::SetFloatSlider, r, name, value);
    }
    int CreateIntSlider(CueRecognizer* r, const char* name, int minimum, int maximum, int value,
                        IntCallback callback) override {
        return to_window(&Gnome::CreateIntSlider, r, name, minimum, maximum, value, callback);
    }
    int SetIntSlider(CueRecognizer* r, const char* name, int value) override {
        return to_window(&Gnome::SetIntSlider, r, name, value);
    }
    int CreateOption(CueRecognizer* r, const char* name, int count, const char* const* labels,
                     int value, OptionCallback callback) override {
        return to_window(&Gnome::CreateOption, r, name, count, labels, value, callback);
    }
    int SetOption(CueRecognizer* r, const char* name, int index) override {
        return to_window(&Gnome::SetOption, r, name, index);
    }
    void Progress(CueRecognizer* r, float done) override {
        if (Gnome* g = TheGnome())
            g->RecognizeProgress(r, done);
    }
};
GnomeChirrupHost theHost;

}  // namespace

void Gnome::install_chirrup_host() {
    CueChirrup::SetHost(&theHost);
}

// --- The plug-ins' controls

// A new control row named `name` on r's panel. Null when there is none to make: either the
// control exists already (its record now serves r, and `update` gives it the plug-in's value)
// or r has no panel (said).
Widget Gnome::control_row(CueRecognizer* r, const char* name, const std::function<void()>& update) {
    if (!r || !name)
        return nullptr;
    void* existing = nullptr;
    if (find_recognizer_widget(r->Name(), name, &existing) && existing) {
        static_cast<SliderRecord*>(existing)->recognizer = r;
        update();
        return nullptr;
    }
    Widget container = find_recognizer_widget(r->Name(), nullptr, nullptr);
    if (!container) {
        std::fprintf(stderr, "Couldn't find widget %s\n", r->Name());
        return nullptr;
    }
    Widget row = XtVaCreateManagedWidget("rc", xmRowColumnWidgetClass, container, XmNorientation,
                                         XmHORIZONTAL, nullptr);
    Widget label = XtVaCreateManagedWidget("label", xmLabelWidgetClass, row, nullptr);
    SetLabel(label, name);
    return row;
}

// A slider on `row`: positions low..high (shown with `decimals` decimal places) at `at`, and
// its value label "value-<name>" showing `shown`; `record` (kept by the caller for the life of
// the process) is what the callbacks get.
void Gnome::add_scale(CueRecognizer* r, const char* name, Widget row, int low, int high, int at,
                      int decimals, const std::string& shown, void* recordPointer) {
    auto* record = static_cast<SliderRecord*>(recordPointer);
    record->recognizer = r;
    Widget scale = XtVaCreateManagedWidget(
        name, xmScaleWidgetClass, row, XmNorientation, XmHORIZONTAL, XmNminimum, low, XmNmaximum,
        std::max(high, low + 1), XmNvalue, at, XmNdecimalPoints, decimals, XmNshowValue, False,
        XmNscaleWidth, 160, nullptr);
    const std::string valueName = KLFmt("value-%s", name);
    record->valueLabel =
        XtVaCreateManagedWidget(valueName.c_str(), xmLabelWidgetClass, row, nullptr);
    SetLabel(record->valueLabel, shown);
    const bool isInt = decimals == 0;
    XtAddCallback(scale, XmNvalueChangedCallback, isInt ? int_changed_cb : float_changed_cb,
                  record);
    XtAddCallback(scale, XmNdragCallback, isInt ? int_drag_cb : float_drag_cb, record);
    stash_recognizer_widget(r->Name(), valueName.c_str(), record->valueLabel, nullptr);
    stash_recognizer_widget(r->Name(), name, scale, record);
}

// Moves the slider `name` of r to `at` on its own scale (kept within its range) and shows
// text(at) in its value label; 0 (said) when r has no such slider.
int Gnome::move_scale(CueRecognizer* r, const char* name, int at, std::string (*text)(int)) {
    void* record = nullptr;
    Widget scale = r && name ? find_recognizer_widget(r->Name(), name, &record) : nullptr;
    if (!scale || !record || !XmIsScale(scale)) {
        std::fprintf(stderr, "Couldn't find slider %s\n", name ? name : "");
        return 0;
    }
    int minimum = 0, maximum = 0;
    XtVaGetValues(scale, XmNminimum, &minimum, XmNmaximum, &maximum, nullptr);
    at = std::min(std::max(at, minimum), maximum);
    XmScaleSetValue(scale, at);
    SetLabel(static_cast<SliderRecord*>(record)->valueLabel, text(at));
    return 1;
}

int Gnome::CreateIntSlider(CueRecognizer* r, const char* name, int minimum, int maximum, int value,
                           CueChirrupHost::IntCallback callback) {
    Widget row = control_row(r, name, [&] { SetIntSlider(r, name, value); });
    if (!row)
        return 0;
    maximum = std::max(maximum, minimum + 1);
    value = std::min(std::max(value, minimum), maximum);
    auto record = std::make_unique<SliderRecord>();
    record->intCallback = callback;
    add_scale(r, name, row, minimum, maximum, value, 0, int_text(value), record.get());
    theRecords.push_back(std::move(record));
    return 1;
}

int Gnome::SetIntSlider(CueRecognizer* r, const char* name, int value) {
    return move_scale(r, name, value, int_text);
}

int Gnome::CreateFloatSlider(CueRecognizer* r, const char* name, float minimum, float maximum,
                             float value, CueChirrupHost::FloatCallback callback) {
    Widget row = control_row(r, name, [&] { SetFloatSlider(r, name, value); });
    if (!row)
        return 0;
    const int low = int(std::lround(minimum * kFloatScale));
    const int high = std::max(int(std::lround(maximum * kFloatScale)), low + 1);
    const int at = std::min(std::max(int(std::lround(value * kFloatScale)), low), high);
    auto record = std::make_unique<SliderRecord>();
    record->floatCallback = callback;
    add_scale(r, name, row, low, high, at, 3, float_text(float(at) / kFloatScale), record.get());
    theRecords.push_back(std::move(record));
    return 1;
}

int Gnome::SetFloatSlider(CueRecognizer* r, const char* name, float value) {
    return move_scale(r, name, int(std::lround(value * kFloatScale)),
                      [](int at) { return float_text(float(at) / kFloatScale); });
}

int Gnome::CreateOption(CueRecognizer* r, const char* name, int count, const char* const* labels,
                        int value, CueChirrupHost::OptionCallback callback) {
    Widget row = control_row(r, name, [&] { SetOption(r, name, value); });
    if (!row)
        return 0;
    auto record = std::make_unique<SliderRecord>();
    record->recognizer = r;
    record->optionCallback = callback;
    const std::string menuName = KLFmt("%s-menu", name);
    Widget pulldown = XmCreatePulldownMenu(row, const_cast<char*>(menuName.c_str()), nullptr, 0);
    for (int i = 0; i < count; ++i) {
        Widget b = XtVaCreateManagedWidget(labels[i] ? labels[i] : "", xmPushButtonWidgetClass,
                                           pulldown, nullptr);
        XtAddCallback(b, XmNactivateCallback, option_cb, record.get());
        record->buttons.push_back(b);
    }
    Arg args[1];
    XtSetArg(args[0], XmNsubMenuId, pulldown);
    Widget option = XmCreateOptionMenu(row, const_cast<char*>(name), args, 1);
    XtManageChild(option);
    if (value >= 0 && value < count)
        XtVaSetValues(option, XmNmenuHistory, record->buttons[size_t(value)], nullptr);
    stash_recognizer_widget(r->Name(), name, option, record.get());
    theRecords.push_back(std::move(record));
    return 1;
}

int Gnome::SetOption(CueRecognizer* r, const char* name, int index) {
    void* found = nullptr;
    Widget option = r && name ? find_recognizer_widget(r->Name(), name, &found) : nullptr;
    auto* record = static_cast<SliderRecord*>(found);
    if (!option || !record || record->buttons.empty()) {
        std::fprintf(stderr, "Couldn't find option %s\n", name ? name : "");
        return 0;
    }
    if (index < 0 || index >= int(record->buttons.size()))
        return 0;
    XtVaSetValues(option, XmNmenuHistory, record->buttons[size_t(index)], nullptr);
    return 1;
}
