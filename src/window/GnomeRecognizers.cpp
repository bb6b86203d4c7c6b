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

// The panel (form dialog) that holds a recognizer's container.
Widget panel_of(Widget container) {
    return container ? XtParent(container) : nullptr;
}

}  // namespace

// --- The catalogue, the menu and the panels

void Gnome::load_recognizers() {
    install_chirrup_host();
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
        SetLabel(label, KLFmt("Recognizer [%s]", key));
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
            SetLabel(w, b.label);
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
    SetLabel(find_recognizer_widget(name, "label", nullptr),
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
