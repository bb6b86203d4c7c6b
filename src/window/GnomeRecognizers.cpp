// Recognizer plug-ins in the window: the "recognizer" menu, one settings panel per recognizer
// with the controls its plug-in asks for through CueChirrup, and running a recognizer over
// the chart's region to make keyframes.
#include <Xm/Form.h>
#include <Xm/Label.h>
#include <Xm/PushB.h>
#include <Xm/PushBG.h>
#include <Xm/RowColumn.h>
#include <Xm/Scale.h>
#include <Xm/Separator.h>
#include <Xm/Xm.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <exception>
#include <memory>
#include <string>

#include "chart/KLSyncChart.h"
#include "model/KLKeySet.h"
#include "toolkit/CueChirrup.h"
#include "toolkit/CueRecognizer.h"
#include "toolkit/CueRecognizerCatalog.h"
#include "toolkit/CueResultPlacement.h"
#include "toolkit/CueSound.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLString.h"
#include "toolkit/xm/KLAlert.h"
#include "window/Gnome.h"
#include "workspace/Imp.h"

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

void set_label(Widget w, const std::string& text) {
    if (!w)
        return;
    XmString s = XmStringCreateLocalized(const_cast<char*>(text.c_str()));
    XtVaSetValues(w, XmNlabelString, s, nullptr);
    XmStringFree(s);
}

std::string int_text(int value) {
    return KLFmt(" %5d ", value);
}
std::string float_text(float value) {
    return KLFmt("%8.3f", value);
}

// The panel (form dialog) that holds a recognizer's container.
Widget panel_of(Widget container) {
    return container ? XtParent(container) : nullptr;
}

void int_changed_cb(Widget, XtPointer client, XtPointer call) {
    auto* record = static_cast<SliderRecord*>(client);
    const int value = static_cast<XmScaleCallbackStruct*>(call)->value;
    set_label(record->valueLabel, int_text(value));
    if (record->intCallback && record->recognizer)
        record->intCallback(record->recognizer, value);
}
void int_drag_cb(Widget, XtPointer client, XtPointer call) {
    set_label(static_cast<SliderRecord*>(client)->valueLabel,
              int_text(static_cast<XmScaleCallbackStruct*>(call)->value));
}
void float_changed_cb(Widget, XtPointer client, XtPointer call) {
    auto* record = static_cast<SliderRecord*>(client);
    const float value = float(static_cast<XmScaleCallbackStruct*>(call)->value) / kFloatScale;
    set_label(record->valueLabel, float_text(value));
    if (record->floatCallback && record->recognizer)
        record->floatCallback(record->recognizer, value);
}
void float_drag_cb(Widget, XtPointer client, XtPointer call) {
    set_label(static_cast<SliderRecord*>(client)->valueLabel,
              float_text(float(static_cast<XmScaleCallbackStruct*>(call)->value) / kFloatScale));
}
void option_cb(Widget w, XtPointer client, XtPointer) {
    auto* record = static_cast<SliderRecord*>(client);
    for (size_t i = 0; i < record->buttons.size(); ++i)
        if (record->buttons[i] == w && record->optionCallback && record->recognizer)
            record->optionCallback(record->recognizer, int(i));
}

// CueChirrup's host: the operations go to the one main window.
class GnomeChirrupHost : public CueChirrupHost {
  public:
    int CreateFloatSlider(CueRecognizer* r, const char* name, float minimum, float maximum,
                          float value, FloatCallback callback) override {
        Gnome* g = TheGnome();
        return g ? g->CreateFloatSlider(r, name, minimum, maximum, value, callback) : 0;
    }
    int SetFloatSlider(CueRecognizer* r, const char* name, float value) override {
        Gnome* g = TheGnome();
        return g ? g->SetFloatSlider(r, name, value) : 0;
    }
    int CreateIntSlider(CueRecognizer* r, const char* name, int minimum, int maximum, int value,
                        IntCallback callback) override {
        Gnome* g = TheGnome();
        return g ? g->CreateIntSlider(r, name, minimum, maximum, value, callback) : 0;
    }
    int SetIntSlider(CueRecognizer* r, const char* name, int value) override {
        Gnome* g = TheGnome();
        return g ? g->SetIntSlider(r, name, value) : 0;
    }
    int CreateOption(CueRecognizer* r, const char* name, int count, const char* const* labels,
                     int value, OptionCallback callback) override {
        Gnome* g = TheGnome();
        return g ? g->CreateOption(r, name, count, labels, value, callback) : 0;
    }
    int SetOption(CueRecognizer* r, const char* name, int index) override {
        Gnome* g = TheGnome();
        return g ? g->SetOption(r, name, index) : 0;
    }
    void Progress(CueRecognizer* r, float done) override {
        if (Gnome* g = TheGnome())
            g->RecognizeProgress(r, done);
    }
};
GnomeChirrupHost theHost;

}  // namespace

// --- The catalogue, the menu and the panels

void Gnome::load_recognizers() {
    CueChirrup::SetHost(&theHost);
    theImp.recognizers.ScanDirectory(CueRecognizerCatalog::SearchPath().c_str());
}

void Gnome::dress_recognizer_menu() {
    Widget menu = FindWidget("recognizerMenu");
    if (!menu)
        return;
    EmptyMenu(menu);
    for (const char* key = theImp.recognizers.HeadKey(); key; key = theImp.recognizers.NextKey(key))
        AddMenuEntry(menu, key, create_recognize_cb, const_cast<char*>(key));
}

void Gnome::dress_recognizer_widgets() {
    Widget console = FindWidget("console");
    Widget parent = console ? console : AppShell();
    if (!parent)
        return;
    for (const char* key = theImp.recognizers.HeadKey(); key;
         key = theImp.recognizers.NextKey(key)) {
        if (find_recognizer_widget(key, nullptr, nullptr))
            continue;  // built already
        const std::string dialogName = KLFmt("%s Recognizer", key);
        Widget dialog =
            XmCreateFormDialog(parent, const_cast<char*>(dialogName.c_str()), nullptr, 0);
        XtVaSetValues(XtParent(dialog), XmNtitle, dialogName.c_str(), nullptr);

        Widget top = XtVaCreateManagedWidget(
            "top_form", xmFormWidgetClass, dialog, XmNtopAttachment, XmATTACH_FORM,
            XmNleftAttachment, XmATTACH_FORM, XmNrightAttachment, XmATTACH_FORM, nullptr);
        Widget label = XtVaCreateManagedWidget("label", xmLabelWidgetClass, top, XmNtopAttachment,
                                               XmATTACH_FORM, XmNleftAttachment, XmATTACH_FORM,
                                               XmNrightAttachment, XmATTACH_FORM, nullptr);
        set_label(label, KLFmt("Recognizer [%s]", key));
        stash_recognizer_widget(key, "label", label, nullptr);

        Widget sep1 = XtVaCreateManagedWidget("horiz_separator", xmSeparatorWidgetClass, dialog,
                                              XmNtopAttachment, XmATTACH_WIDGET, XmNtopWidget, top,
                                              XmNleftAttachment, XmATTACH_FORM, XmNrightAttachment,
                                              XmATTACH_FORM, nullptr);
        Widget mid = XtVaCreateManagedWidget(
            "mid_rc", xmRowColumnWidgetClass, dialog, XmNorientation, XmVERTICAL, XmNtopAttachment,
            XmATTACH_WIDGET, XmNtopWidget, sep1, XmNleftAttachment, XmATTACH_FORM,
            XmNrightAttachment, XmATTACH_FORM, nullptr);
        stash_recognizer_widget(key, nullptr, mid, nullptr);
        Widget sep2 = XtVaCreateManagedWidget("horiz_separator", xmSeparatorWidgetClass, dialog,
                                              XmNtopAttachment, XmATTACH_WIDGET, XmNtopWidget, mid,
                                              XmNleftAttachment, XmATTACH_FORM, XmNrightAttachment,
                                              XmATTACH_FORM, nullptr);
        Widget bottom = XtVaCreateManagedWidget(
            "bot_rc", xmFormWidgetClass, dialog, XmNfractionBase, 16, XmNtopAttachment,
            XmATTACH_WIDGET, XmNtopWidget, sep2, XmNleftAttachment, XmATTACH_FORM,
            XmNrightAttachment, XmATTACH_FORM, XmNbottomAttachment, XmATTACH_FORM, nullptr);
        struct {
            const char* name;
            const char* label;
            int left, right;
        } const buttons[] = {{"configure", "Configure", 1, 5},
                             {"recognize", "Recognize", 6, 10},
                             {"dismiss", "Dismiss", 11, 15}};
        for (const auto& b : buttons) {
            Widget w = XtVaCreateManagedWidget(
                b.name, xmPushButtonGadgetClass, bottom, XmNleftAttachment, XmATTACH_POSITION,
                XmNleftPosition, b.left, XmNrightAttachment, XmATTACH_POSITION, XmNrightPosition,
                b.right, XmNtopAttachment, XmATTACH_FORM, XmNbottomAttachment, XmATTACH_FORM,
                XmNtopOffset, 4, XmNbottomOffset, 4, nullptr);
            set_label(w, b.label);
            stash_recognizer_widget(key, b.label, w, nullptr);
        }
        XtRealizeWidget(XtParent(dialog));
    }
}

void Gnome::ShowRecognizerGui(CueRecognizer* recognizer) {
    if (!recognizer)
        return;
    const char* name = recognizer->Name();
    Widget container = find_recognizer_widget(name, nullptr, nullptr);
    if (!container)
        return;
    struct {
        const char* item;
        XtCallbackProc callback;
    } const buttons[] = {
        {"Configure", configure_cb}, {"Recognize", recognize_cb}, {"Dismiss", dismiss_cb}};
    for (const auto& b : buttons)
        if (Widget w = find_recognizer_widget(name, b.item, nullptr)) {
            XtRemoveAllCallbacks(w, XmNactivateCallback);
            XtAddCallback(w, XmNactivateCallback, b.callback, recognizer);
        }
    if (Widget w = find_recognizer_widget(name, "Recognize", nullptr))
        XtSetSensitive(w, recognizer->Configured());
    KLKeySet* keyset = theImp.GetKeySet(GetActiveKeyset());
    set_label(find_recognizer_widget(name, "label", nullptr),
              KLFmt("Recognizer [%s] (%s)", name, keyset && keyset->Name() ? keyset->Name() : ""));
    try {
        recognizer->UpdatePanel();
    } catch (const std::exception& e) {
        KLWarning("Recognizer [%s] failed: %s\n", name, e.what());
    } catch (...) {
        KLWarning("Recognizer [%s] failed.\n", name);
    }
    Widget dialog = panel_of(container);
    if (recognizer->shown == 1)
        XtManageChild(dialog);
    else
        XtUnmanageChild(dialog);
}

void Gnome::update_recognizer_dialogs() {
    KLKeySet* keyset = theImp.GetKeySet(GetActiveKeyset());
    for (const char* key = theImp.recognizers.HeadKey(); key;
         key = theImp.recognizers.NextKey(key)) {
        CueRecognizer* r = keyset ? keyset->GetRecognizer(key) : nullptr;
        if (!r) {
            if (Widget container = find_recognizer_widget(key, nullptr, nullptr))
                XtUnmanageChild(panel_of(container));
        } else if (r->shown == 1) {
            ShowRecognizerGui(r);
        }
    }
}

// --- The registry of panel widgets

void Gnome::stash_recognizer_widget(const char* name, const char* item, Widget widget,
                                    void* record) {
    RecognizerWidget entry;
    entry.name = name ? name : "";
    entry.hasItem = item != nullptr;
    entry.item = item ? item : "";
    entry.widget = widget;
    entry.record = record;
    recognizerWidgets.push_back(entry);
}

Widget Gnome::find_recognizer_widget(const char* name, const char* item, void** record) {
    if (!name)
        return nullptr;
    for (const RecognizerWidget& entry : recognizerWidgets) {
        if (entry.name != name)
            continue;
        if (item ? (entry.hasItem && entry.item == item) : !entry.hasItem) {
            if (record)
                *record = entry.record;
            return entry.widget;
        }
    }
    return nullptr;
}

// --- The plug-ins' controls

int Gnome::CreateIntSlider(CueRecognizer* r, const char* name, int minimum, int maximum, int value,
                           CueChirrupHost::IntCallback callback) {
    if (!r || !name)
        return 0;
    void* found = nullptr;
    if (find_recognizer_widget(r->Name(), name, &found) && found) {
        static_cast<SliderRecord*>(found)->recognizer = r;
        SetIntSlider(r, name, value);
        return 0;
    }
    Widget container = find_recognizer_widget(r->Name(), nullptr, nullptr);
    if (!container) {
        std::fprintf(stderr, "Couldn't find widget %s\n", r->Name());
        return 0;
    }
    if (maximum <= minimum)
        maximum = minimum + 1;
    value = std::min(std::max(value, minimum), maximum);
    auto record = std::make_unique<SliderRecord>();
    record->recognizer = r;
    record->intCallback = callback;
    Widget row = add_control_row(container, name);
    Widget scale = XtVaCreateManagedWidget(
        name, xmScaleWidgetClass, row, XmNorientation, XmHORIZONTAL, XmNminimum, minimum,
        XmNmaximum, maximum, XmNvalue, value, XmNshowValue, False, XmNscaleWidth, 160, nullptr);
    const std::string valueName = KLFmt("value-%s", name);
    record->valueLabel =
        XtVaCreateManagedWidget(valueName.c_str(), xmLabelWidgetClass, row, nullptr);
    set_label(record->valueLabel, int_text(value));
    XtAddCallback(scale, XmNvalueChangedCallback, int_changed_cb, record.get());
    XtAddCallback(scale, XmNdragCallback, int_drag_cb, record.get());
    stash_recognizer_widget(r->Name(), valueName.c_str(), record->valueLabel, nullptr);
    stash_recognizer_widget(r->Name(), name, scale, record.get());
    theRecords.push_back(std::move(record));
    return 1;
}

int Gnome::SetIntSlider(CueRecognizer* r, const char* name, int value) {
    void* found = nullptr;
    Widget scale = r && name ? find_recognizer_widget(r->Name(), name, &found) : nullptr;
    if (!scale || !found || !XmIsScale(scale)) {
        std::fprintf(stderr, "Couldn't find slider %s\n", name ? name : "");
        return 0;
    }
    int minimum = 0, maximum = 0;
    XtVaGetValues(scale, XmNminimum, &minimum, XmNmaximum, &maximum, nullptr);
    value = std::min(std::max(value, minimum), maximum);
    XmScaleSetValue(scale, value);
    set_label(static_cast<SliderRecord*>(found)->valueLabel, int_text(value));
    return 1;
}

int Gnome::CreateFloatSlider(CueRecognizer* r, const char* name, float minimum, float maximum,
                             float value, CueChirrupHost::FloatCallback callback) {
    if (!r || !name)
        return 0;
    void* found = nullptr;
    if (find_recognizer_widget(r->Name(), name, &found) && found) {
        static_cast<SliderRecord*>(found)->recognizer = r;
        SetFloatSlider(r, name, value);
        return 0;
    }
    Widget container = find_recognizer_widget(r->Name(), nullptr, nullptr);
    if (!container) {
        std::fprintf(stderr, "Couldn't find widget %s\n", r->Name());
        return 0;
    }
    const int low = int(std::lround(minimum * kFloatScale));
    int high = int(std::lround(maximum * kFloatScale));
    if (high <= low)
        high = low + 1;
    const int at = std::min(std::max(int(std::lround(value * kFloatScale)), low), high);
    auto record = std::make_unique<SliderRecord>();
    record->recognizer = r;
    record->floatCallback = callback;
    Widget row = add_control_row(container, name);
    Widget scale = XtVaCreateManagedWidget(
        name, xmScaleWidgetClass, row, XmNorientation, XmHORIZONTAL, XmNminimum, low, XmNmaximum,
        high, XmNvalue, at, XmNdecimalPoints, 3, XmNshowValue, False, XmNscaleWidth, 160, nullptr);
    const std::string valueName = KLFmt("value-%s", name);
    record->valueLabel =
        XtVaCreateManagedWidget(valueName.c_str(), xmLabelWidgetClass, row, nullptr);
    set_label(record->valueLabel, float_text(float(at) / kFloatScale));
    XtAddCallback(scale, XmNvalueChangedCallback, float_changed_cb, record.get());
    XtAddCallback(scale, XmNdragCallback, float_drag_cb, record.get());
    stash_recognizer_widget(r->Name(), valueName.c_str(), record->valueLabel, nullptr);
    stash_recognizer_widget(r->Name(), name, scale, record.get());
    theRecords.push_back(std::move(record));
    return 1;
}

int Gnome::SetFloatSlider(CueRecognizer* r, const char* name, float value) {
    void* found = nullptr;
    Widget scale = r && name ? find_recognizer_widget(r->Name(), name, &found) : nullptr;
    if (!scale || !found || !XmIsScale(scale)) {
        std::fprintf(stderr, "Couldn't find slider %s\n", name ? name : "");
        return 0;
    }
    int minimum = 0, maximum = 0;
    XtVaGetValues(scale, XmNminimum, &minimum, XmNmaximum, &maximum, nullptr);
    const int at = std::min(std::max(int(std::lround(value * kFloatScale)), minimum), maximum);
    XmScaleSetValue(scale, at);
    set_label(static_cast<SliderRecord*>(found)->valueLabel, float_text(float(at) / kFloatScale));
    return 1;
}

int Gnome::CreateOption(CueRecognizer* r, const char* name, int count, const char* const* labels,
                        int value, CueChirrupHost::OptionCallback callback) {
    if (!r || !name)
        return 0;
    void* found = nullptr;
    if (find_recognizer_widget(r->Name(), name, &found) && found) {
        static_cast<SliderRecord*>(found)->recognizer = r;
        SetOption(r, name, value);
        return 0;
    }
    Widget container = find_recognizer_widget(r->Name(), nullptr, nullptr);
    if (!container) {
        std::fprintf(stderr, "Couldn't find widget %s\n", r->Name());
        return 0;
    }
    auto record = std::make_unique<SliderRecord>();
    record->recognizer = r;
    record->optionCallback = callback;
    Widget row = add_control_row(container, name);
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

Widget Gnome::add_control_row(Widget container, const char* name) {
    Widget row = XtVaCreateManagedWidget("rc", xmRowColumnWidgetClass, container, XmNorientation,
                                         XmHORIZONTAL, nullptr);
    Widget label = XtVaCreateManagedWidget("label", xmLabelWidgetClass, row, nullptr);
    set_label(label, name);
    return row;
}

// --- Callbacks

void Gnome::create_recognize_cb(Widget, XtPointer client, XtPointer) {
    Gnome* g = TheGnome();
    const char* name = static_cast<const char*>(client);
    KLKeySet* keyset = g ? theImp.GetKeySet(g->GetActiveKeyset()) : nullptr;
    if (!g || !name || !keyset)
        return;
    CueRecognizer* r = keyset->GetRecognizer(name);
    if (!r) {
        std::unique_ptr<CueRecognizer> fetched = theImp.recognizers.FetchRecognizer(name);
        if (!fetched) {
            g->Inform(KLFmt("Failed to locate plug-in recognizer [%s].", name).c_str(), "Dismiss");
            return;
        }
        r = keyset->AddRecognizer(std::move(fetched));
        theImp.ConfigureRecognizer(r, r->ConfigFileName().c_str());
    }
    r->shown = 1;
    g->ShowRecognizerGui(r);
}

void Gnome::configure_cb(Widget, XtPointer client, XtPointer) {
    Gnome* g = TheGnome();
    auto* r = static_cast<CueRecognizer*>(client);
    if (!g || !r)
        return;
    g->update_link_dialog(theImp.GetKeySet(g->GetActiveKeyset()), r);
    if (Widget dialog = FindWidget("linkDialog"))
        XtManageChild(dialog);
}

void Gnome::dismiss_cb(Widget, XtPointer client, XtPointer) {
    Gnome* g = TheGnome();
    auto* r = static_cast<CueRecognizer*>(client);
    if (!g || !r)
        return;
    if (Widget container = g->find_recognizer_widget(r->Name(), nullptr, nullptr))
        XtUnmanageChild(panel_of(container));
    r->shown = 0;
}

void Gnome::UpdateDisplay() {
    if (syncChart)
        syncChart->UpdateDisplay();
}

void Gnome::RecognizeProgress(CueRecognizer*, float done) {
    if (!informationAlert)
        return;
    informationAlert->Show(
        KLFmt("Recognizing ... %d%%", int(std::lround(std::min(1.0f, std::max(0.0f, done)) * 100)))
            .c_str());
    // Only exposures are handled: the window stays drawn while no input reaches it.
    if (Widget dialog = informationAlert->GetDialog())
        XmUpdateDisplay(dialog);
}

void Gnome::recognize_cb(Widget, XtPointer client, XtPointer) {
    Gnome* g = TheGnome();
    auto* r = static_cast<CueRecognizer*>(client);
    if (!g || !r || !theImp.sound)
        return;
    KLSyncChart* chart = g->syncChart;
    KLKeySet* keyset = theImp.GetKeySet(g->GetActiveKeyset());
    if (!chart || !keyset)
        return;
    g->informationAlert->Show("Recognizing ...");
    if (Widget dialog = g->informationAlert->GetDialog())
        XmUpdateDisplay(dialog);
    CueTime start, end;
    chart->GetRegionRange(start, end);
    // Only the region is copied: a short region of a long sound costs only its own length.
    std::unique_ptr<CueSound> piece = theImp.sound->Excerpt(start.Seconds(), end.Seconds());
    // The region's keys make way for the results only once there are results: a region
    // with no sound in it, or a recognizer that cannot run, loses no key.
    if (end > start && piece->FrameCount() > 0 && r->GuardedRecognize(*piece)) {
        chart->DeleteActiveKeyframeRegion();
        CueResultPlacement::Place(
            r->results, start, r->step,
            [&](const CueResultPlacement::Key& k) {
                if (KLKey* shape = keyset->GetKeyShape(k.shapeIndex))
                    chart->AddTimeKeyframe(k.shapeIndex, k.time, shape, 0);
            },
            [&](long) { g->UpdateDisplay(); });
    }
    g->informationAlert->Hide();
    g->UpdateDisplay();
    theImp.PrepareKeyFrames(0);
}
