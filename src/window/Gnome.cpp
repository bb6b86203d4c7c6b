// The main window's construction: fields, the dressing of the built widget tree, and the
// file managers' binding to the File and Reference menus.
#include "window/Gnome.h"

#include <Xm/Protocols.h>
#include <Xm/RowColumn.h>
#include <Xm/TextF.h>
#include <Xm/ToggleBG.h>
#include <Xm/Xm.h>

#include <cstdlib>

#include "dialogs/RefLoadDialog.h"
#include "toolkit/KLTimer.h"
#include "toolkit/xm/KLAlert.h"
#include "toolkit/xm/KLFileManager.h"
#include "toolkit/xm/KLImageButton.h"
#include "toolkit/xm/KLImageView.h"
#include "toolkit/xm/KLPrompt.h"
#include "toolkit/xm/KLXtBeat.h"
#include "window/KeysetFileManager.h"
#include "window/ReferenceFileManager.h"
#include "window/SoundFileManager.h"
#include "window/TrackFileManager.h"
#include "window/WireFileApplyManager.h"
#include "workspace/Imp.h"

#include "chart/KLSyncChart.h"
#include "scene/gl/KLSceneView.h"

int Gnome::tilesPerRow = -1;
void (*Gnome::exitFunction)(int) = std::exit;

Gnome* TheGnome() {
    return dynamic_cast<Gnome*>(KLXmGnome::theGnome);
}

namespace {
// Buttons that arm and disarm a camera drag with any of the three mouse buttons.
const char kTumbleTranslations[] =
    "<Btn1Down>: Arm()\n<Btn1Up>: Disarm()\n<Btn2Down>: Arm()\n<Btn2Up>: Disarm()\n"
    "<Btn3Down>: Arm()\n<Btn3Up>: Disarm()\n";

void set_toggle(const char* name, bool on) {
    if (Widget w = KLXmGnome::FindWidget(name))
        XmToggleButtonGadgetSetState(w, on, False);
}
}  // namespace

Gnome::Gnome() {
    confirmEnabled = std::getenv("VX_NOCONFIRM") ? 0 : 1;
}

Gnome::~Gnome() {
    recognizerWidgets.clear();
    if (playTimer)
        playTimer.reset();
}

int Gnome::DressWidgets() {
    // Timers fire from the event loop; the window manager's close is Quit.
    KLXtBeat::Install();
    if (Widget shell = AppShell()) {
        Atom wmDelete =
            XmInternAtom(XtDisplay(shell), const_cast<char*>("WM_DELETE_WINDOW"), False);
        XmAddWMProtocolCallback(shell, wmDelete, quit_cb, nullptr);
    }

    // 1. Dialogs built outside the table.
    create_apply_dialog();
    create_link_dialog();

    // 2. Shell, help cascade.
    Widget console = FindWidget("console");
    topShell = console ? XtParent(console) : AppShell();
    helpCascade = FindWidget("help");
    if (Widget bar = FindWidget("menuBar"))
        if (helpCascade)
            XtVaSetValues(bar, XmNmenuHelpWidget, helpCascade, nullptr);

    // 3. Help, reference-load dialog, recognizers.
    AddCallback("helpRef", XmNactivateCallback, help_cb, XtPointer(1));
    AddCallback("helpTut", XmNactivateCallback, help_cb, XtPointer(2));
    AddCallback("versionInfo", XmNactivateCallback, version_cb, XtPointer(2));
    AddCallback("vuErrors", XmNactivateCallback, view_errors_cb, nullptr);
    refLoadDialog = std::make_unique<RefLoadDialog>();
    load_recognizers();

    // 4. Scene views and the hooks around the key view's evaluation.
    keyScene = dynamic_cast<KLSceneView*>(FindFiend("keyScn"));
    mixScene = dynamic_cast<KLSceneView*>(FindFiend("mixScn"));
    dress_scene_views();

    // 5. Alerts and prompt.
    Widget parent = console ? console : topShell;
    attentionAlert = std::make_unique<KLAlert>(parent, "Attention");
    informationAlert = std::make_unique<KLAlert>(parent, "Information");
    prompt = std::make_unique<KLPrompt>(parent, "promptDialog");
    activeKeyset = -1;
    shownKeyset = nullptr;

    // 6. Callbacks.
    AddCallback("quit", XmNactivateCallback, quit_cb, nullptr);
    AddCallback("loadGeometry", XmNvalueChangedCallback, load_geometry_cb, this);
    for (const char* name : {"addKeyframe", "addKey"})
        AddCallback(name, XmNactivateCallback, add_keyframe_cb, nullptr);
    for (const char* name : {"deleteKeyframe", "deleteKey"})
        AddCallback(name, XmNactivateCallback, delete_keyframe_cb, nullptr);
    for (const char* name : {"deleteKeyframeRegion", "deleteKeyRegion"})
        AddCallback(name, XmNactivateCallback, delete_keyframe_region_cb, nullptr);
    for (const char* name : {"play", "playForward"})
        AddCallback(name, XmNactivateCallback, play_forward_cb, nullptr);
    AddCallback("linearKey", XmNactivateCallback, linear_keyframe_cb, nullptr);
    AddCallback("easeKey", XmNactivateCallback, ease_keyframe_cb, nullptr);
    AddCallback("smoothKey", XmNactivateCallback, smooth_keyframe_cb, nullptr);
    AddCallback("valTypein", XmNactivateCallback, val_typein_cb, nullptr);
    if (Widget w = FindWidget("valTypein"))
        XtVaSetValues(w, XmNcolumns, 7, nullptr);
    AddCallback("audioPanel", XmNactivateCallback, open_audio_panel_cb, nullptr);
    const char* keyDrag[] = {"keyVuTumble", "keyVuZoom", "keyVuPan"};
    const char* mixDrag[] = {"mixVuTumble", "mixVuZoom", "mixVuPan"};
    for (long mode = 0; mode < 3; mode++) {
        AddCallback(keyDrag[mode], XmNarmCallback, tumble_key_cb, XtPointer(mode));
        AddCallback(keyDrag[mode], XmNdisarmCallback, tumble_key_cb, nullptr);
        AddCallback(mixDrag[mode], XmNarmCallback, tumble_mix_cb, XtPointer(mode));
        AddCallback(mixDrag[mode], XmNdisarmCallback, tumble_mix_cb, nullptr);
    }
    AddCallback("keyVuLookAt", XmNactivateCallback, key_vu_lookat_cb, nullptr);
    AddCallback("mixVuLookAt", XmNactivateCallback, mix_vu_lookat_cb, nullptr);
    AddCallback("refDelete", XmNactivateCallback, delete_reference_cb, nullptr);
    AddCallback("refAdjust", XmNactivateCallback, adjust_reference_cb, nullptr);
    AddCallback("refRegion", XmNactivateCallback, set_reference_region_cb, nullptr);
    AddCallback("fastReverse", XmNactivateCallback, fast_reverse_cb, nullptr);
    AddCallback("playReverse", XmNactivateCallback, play_reverse_cb, nullptr);
    AddCallback("playStop", XmNactivateCallback, play_stop_cb, nullptr);
    AddCallback("playForwardSave", XmNactivateCallback, play_forward_save_cb, nullptr);
    AddCallback("fastForward", XmNactivateCallback, fast_forward_cb, nullptr);
    AddCallback("keyVuSet", XmNactivateCallback, key_view_set_cb, nullptr);
    AddCallback("keyVuClear", XmNactivateCallback, key_view_clear_cb, nullptr);
    AddCallback("infoDurationValue", XmNactivateCallback, set_duration_cb, nullptr);
    AddCallback("infoDurationLabel", XmNactivateCallback, set_duration_cb, nullptr);

    // 7.
    SetMenuStatus();

    // 8. Camera buttons arm with any mouse button.
    XtTranslations tumble = XtParseTranslationTable(kTumbleTranslations);
    for (const char* name :
         {"keyVuTumble", "keyVuZoom", "keyVuPan", "mixVuTumble", "mixVuZoom", "mixVuPan"})
        if (Widget w = FindWidget(name))
            XtVaSetValues(w, XmNtranslations, tumble, nullptr);

    // 9. File managers.
    keysetManager = std::make_unique<KeysetFileManager>(topShell);
    soundManager = std::make_unique<SoundFileManager>(topShell);
    trackManager = std::make_unique<TrackFileManager>(topShell);
    referenceManager = std::make_unique<ReferenceFileManager>(topShell);
    applyManager = std::make_unique<WireFileApplyManager>(topShell);
    keysetManager->InstallRetrieveCallback(FindWidget("openKeyset"), XmNactivateCallback);
    keysetManager->InstallStoreAsCallback(FindWidget("saveKeyset"), XmNactivateCallback);
    soundManager->InstallRetrieveCallback(FindWidget("newTrack"), XmNactivateCallback);
    trackManager->InstallRetrieveCallback(FindWidget("openTrack"), XmNactivateCallback);
    trackManager->InstallStoreAsCallback(FindWidget("saveTrack"), XmNactivateCallback);
    referenceManager->InstallRetrieveCallback(FindWidget("refLoad"), XmNactivateCallback);
    applyManager->InstallRetrieveCallback(FindWidget("applyWire"), XmNactivateCallback);

    // 10. Reference item, image views, the chart's hooks.
    refAdjustButton = FindWidget("refAdjust");
    keyImageView = dynamic_cast<KLImageView*>(FindFiend("keyVu"));
    if (keyImageView)
        keyImageView->SetZoom(2);
    refImageView = dynamic_cast<KLImageView*>(FindFiend("refVu"));
    if (refImageView)
        refImageView->SetZoom(theImp.referenceZoom);
    if (KLFiend* chart = FindFiend("syncChart")) {
        syncChart = dynamic_cast<KLSyncChart*>(chart);
        chart->SetFiendCallback("showKeyframeCallback", show_keyframe_cb, nullptr);
        chart->SetFiendCallback("showKeyframeImageCallback", show_keyframe_image_cb, nullptr);
        chart->SetFiendCallback("showReferenceImageCallback", show_reference_image_cb, nullptr);
    }

    // 11. Transport option menus.
    speedMenu = FindWidget("speedMenu");
    repeatMenu = FindWidget("repeatMenu");
    set_option_callbacks(speedMenu, change_speed_cb);
    set_option_callbacks(repeatMenu, change_repeat_cb);

    // 12. Display toggles, set without notification.
    for (const char* name : {"midpoint", "keyframe", "dissolve"})
        AddCallback(name, XmNvalueChangedCallback, display_style_cb, this);
    set_toggle("midpoint", true);
    set_toggle("keyframe", false);
    set_toggle("dissolve", false);
    for (const char* name : {"points", "lines", "polygons", "polygonsboth"})
        AddCallback(name, XmNvalueChangedCallback, feedback_cb, this);
    set_toggle("points", false);
    set_toggle("lines", false);
    set_toggle("polygons", true);
    set_toggle("polygonsboth", false);

    // 13. Information bar.
    displayMenu = FindWidget("displayMenu");
    timeValueLabel = FindWidget("infoTimeValue");
    frameValueLabel = FindWidget("infoFrameValue");
    KLXmGnome::SetLabel(frameValueLabel, "0");
    keysetTitleLabel = FindWidget("infoKeysetTitle");
    durationValueButton = FindWidget("infoDurationValue");
    create_error_flag();

    // 14. View option menus.
    set_option_callbacks(FindWidget("refVuToggle"), toggle_ref_view_cb);
    set_option_callbacks(FindWidget("mixVuToggle"), toggle_mix_view_cb);
    set_option_callbacks(FindWidget("keyVuToggle"), toggle_key_view_cb);

    // 15. Recognizer panels and menu; accelerators under lock modifiers.
    dress_recognizer_widgets();
    dress_recognizer_menu();
    fix_hotkeys();

    // 16.
    if (!theImp.geometryActive) {
        keyViewMode = 0;
        mixViewOn = 0;
    }

    // 17.
    SetViewStatus();
    return 1;
}
