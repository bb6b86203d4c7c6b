#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include <X11/Intrinsic.h>

#include "toolkit/CueTime.h"
#include "toolkit/KLStopWatch.h"
#include "toolkit/xm/KLWidgetSpec.h"
#include "toolkit/xm/KLXmGnome.h"
#include "workspace/Ghost.h"

class CueRecognizer;
class CueSound;
class KLAlert;
class KLEdlEvent;
class KLFiend;
class KLFileManager;
class KLImageButton;
class KLImageSGI;
class KLImageView;
class KLKey;
class KLKeySet;
class KLMarkTrack;
class KLPrompt;
class KLSceneView;
class KLSyncChart;
class KLTimer;
class RefLoadDialog;

// The main window: built from `widget_spec`, dressed by DressWidgets, and the window side of
// the workspace (Ghost). Its members are grouped by what they serve; each group lives in its
// own source file (named in the group's comment).
class Gnome : public KLXmGnome, public virtual Ghost {
  public:
    static constexpr int kMaxKeysets = 10;
    static constexpr int kMaxTiles = 60;

    // --- Construction, widget tree, sensitivity, accelerators, quitting (Gnome.cpp,
    // GnomeStatus.cpp)
    Gnome();
    ~Gnome() override;
    int DressWidgets() override;
    void SetMenuStatus() override;
    void SetViewStatus() override;
    void ResetFileManagers() override;
    void fix_hotkeys();
    // Prefix that fix_hotkeys puts before every hotkey accelerator for a modifier mask:
    // "Mod2 Mod3 ", "Mod2 ", "Mod3 " or "" (no change).
    static const char* hotkey_prefix(unsigned int modifierMask);
    void set_option_callbacks(Widget optionMenu, XtCallbackProc function);
    void set_option_value(Widget optionMenu, int index);
    void set_option_sensitive(Widget optionMenu, int index, int sensitive);
    static void quit_cb(Widget, XtPointer, XtPointer);
    // The asking part of quit_cb: 1 when the program may exit, 0 when the user cancelled.
    int QuitQuestions();
    // Exits the process; tests replace it to watch quit_cb without leaving.
    static void (*exitFunction)(int status);

    // --- Transport and playback (GnomePlayback.cpp)
    void PlayForward();
    void PlayReverse();
    void FastForward();
    void FastReverse();
    void PlayStop();
    void PlayForwardSave();
    void begin_playback(CueTime from, CueTime to, float speed);
    void end_playback();
    void GoToTime(CueTime t);
    static Boolean playback_workproc(XtPointer gnome);
    static void play_finish_cb(KLTimer* timer, void* gnome);
    static void play_forward_cb(Widget, XtPointer, XtPointer);
    static void play_reverse_cb(Widget, XtPointer, XtPointer);
    static void fast_forward_cb(Widget, XtPointer, XtPointer);
    static void fast_reverse_cb(Widget, XtPointer, XtPointer);
    static void play_stop_cb(Widget, XtPointer, XtPointer);
    static void play_forward_save_cb(Widget, XtPointer, XtPointer);
    static void change_speed_cb(Widget, XtPointer, XtPointer);
    static void change_repeat_cb(Widget, XtPointer, XtPointer);
    // Helpers: a pass over the chart's region (reversed or not) at a speed; the key image
    // view set by the display style; playback ended at once (before the workspace replaces
    // what is playing); the mix and key views drawn at a time.
    void start_pass(bool reverse, float speed);
    void show_key_images(KLKey* prev, KLKey* next, bool hasPrev, bool hasNext, float fraction);
    void show_views_at(CueTime t);
    void halt_playback();

    // --- Key editing commands and key value (GnomeKeyEdit.cpp)
    int CurrentKeyShape();
    void HighlightKeyframe(int index);
    void SetKeyValue(float value);
    void ActivateKeyValue(int sensitive);
    static void add_keyframe_cb(Widget, XtPointer, XtPointer);
    static void delete_keyframe_cb(Widget, XtPointer, XtPointer);
    static void delete_keyframe_region_cb(Widget, XtPointer, XtPointer);
    static void linear_keyframe_cb(Widget, XtPointer, XtPointer);
    static void ease_keyframe_cb(Widget, XtPointer, XtPointer);
    static void smooth_keyframe_cb(Widget, XtPointer, XtPointer);
    static void val_typein_cb(Widget, XtPointer, XtPointer);
    static void set_duration_cb(Widget, XtPointer, XtPointer);
    // Helper: a key of shape `index` of the shown keyset at the indicator (or in place of the
    // active key), with the "-a" beep, and the key frames rebuilt.
    void add_key(int index);

    // --- Keyset tiles, keyset menu, key shape display, start-up load (GnomeTiles.cpp)
    void DressKeyset(int k);
    virtual void ShowKeySet(int k);
    int GetActiveKeyset() override;
    void SetActiveKeyset(int index) override;
    void InitKeyset(int index) override;
    void ClearKeysets(int index) override;
    void ClearKeysetMenu() override;
    void DressKeysetMenu() override;
    void ClearKeyTracks() override;
    void InitSound(CueSound* sound) override;
    void InitMarkTrack(KLMarkTrack* track) override;
    void MakeKeysetImages() override;
    void update_keyset_tiles();
    void DisplayKeyShapeImages(int a, int b, float fraction);
    void PostLoadKeyset(const char* path);
    static Boolean loadkeyset_workproc(XtPointer path);
    static void set_static_keytracks(void* gnome);
    static void clear_static_keytracks(void* gnome);
    static void TileButtonDown(Widget, XtPointer, XtPointer);
    static void TileButtonClick2(Widget, XtPointer, XtPointer);
    static void select_keyset_cb(Widget, XtPointer, XtPointer);
    static void display_style_cb(Widget, XtPointer, XtPointer);
    // Helper: makes the pressed tile the only set one; its index, -1 when not a tile of the
    // active keyset.
    int select_tile(KLFiend* pressed);

    // --- Key and mix 3D views (GnomeViews.cpp)
    void CenterKeyView() override;
    void CenterMixView() override;
    void ClearViews() override;
    void do_one_tumble(int view);
    static Boolean tumble_workproc(XtPointer view);
    static void tumble_key_cb(Widget, XtPointer, XtPointer);
    static void tumble_mix_cb(Widget, XtPointer, XtPointer);
    static void key_vu_lookat_cb(Widget, XtPointer, XtPointer);
    static void mix_vu_lookat_cb(Widget, XtPointer, XtPointer);
    static void feedback_cb(Widget, XtPointer, XtPointer);
    static void load_geometry_cb(Widget, XtPointer, XtPointer);
    static void toggle_key_view_cb(Widget, XtPointer, XtPointer);
    static void toggle_mix_view_cb(Widget, XtPointer, XtPointer);
    static void toggle_ref_view_cb(Widget, XtPointer, XtPointer);
    static void key_view_set_cb(Widget, XtPointer, XtPointer);
    static void key_view_clear_cb(Widget, XtPointer, XtPointer);
    // Helpers of the views: the key view's hooks and the showTextures toggle (from
    // DressWidgets); one arm or disarm of a camera button of view 1 (key) or 0 (mix).
    void dress_scene_views();
    static void show_textures_cb(Widget, XtPointer, XtPointer);
    void camera_drag(Widget w, XtPointer clientData, XtPointer callData, int view);
    // PlayForwardSave's frames: the mix view as drawn, kept as playblast frame i; the
    // playblast from `start` shown in the reference view.
    void grab_playblast_frame(int i);
    void show_playblast(CueTime start);

    // --- Information bar, prompts, error flag, help, reference menu (GnomeInfo.cpp)
    void DisplayTimecode(CueTime t);
    void DisplayDuration(CueTime duration) override;
    void DisplayReferenceOffset(CueTime offset) override;
    void DisplayReference(CueTime t);
    void ShowKeyframeImage();
    void Inform(const char* message, const char* button) override;
    int Confirm(const char* message, const char* yes, const char* no) override;
    void ShowErrorFlag() override;
    void ClearErrorFlag() override;
    int AdjustRelLoad(char** prefix, char** ext, int* start, int* end, int* by, int* zoom) override;
    // The status line: the latest status report of the toolkit, shown at once.
    void ShowStatus(const char* message);
    static void status_hook(const char* message, void* gnome);
    // Once the event loop is idle again after status reports, the status line says "Ready.".
    static Boolean status_idle_workproc(XtPointer gnome);
    static void help_cb(Widget, XtPointer, XtPointer);
    static void version_cb(Widget, XtPointer, XtPointer);
    static void open_audio_panel_cb(Widget, XtPointer, XtPointer);
    static void view_errors_cb(Widget, XtPointer, XtPointer);
    static void delete_reference_cb(Widget, XtPointer, XtPointer);
    static void adjust_reference_cb(Widget, XtPointer, XtPointer);
    static void set_reference_region_cb(Widget, XtPointer, XtPointer);
    static void show_keyframe_cb(Widget, XtPointer, KLFiend*);
    static void show_keyframe_image_cb(Widget, XtPointer, KLFiend*);
    static void show_reference_image_cb(Widget, XtPointer, KLFiend*);
    // Makes the error flag and the status line in the information bar (outside the table).
    void create_error_flag();
    // The workspace frees its mark track and sound before it tells the window about their
    // replacements: hands the chart the current ones (the sound too unless `withSound` is
    // false) before anything can make it draw with the freed ones.
    void chart_follows_workspace(bool withSound = true);

    // --- Recognizer plug-ins and their settings panels (GnomeRecognizers.cpp)
    void ShowRecognizerGui(CueRecognizer* recognizer) override;
    static void load_recognizers();
    void dress_recognizer_menu();
    void dress_recognizer_widgets();
    void update_recognizer_dialogs();
    void stash_recognizer_widget(const char* name, const char* item, Widget widget, void* record);
    Widget find_recognizer_widget(const char* name, const char* item, void** record);
    void UpdateDisplay();
    static void create_recognize_cb(Widget, XtPointer, XtPointer);
    static void configure_cb(Widget, XtPointer, XtPointer);
    static void recognize_cb(Widget, XtPointer, XtPointer);
    static void dismiss_cb(Widget, XtPointer, XtPointer);
    // CueChirrup's operations (the plug-ins' controls on their panels), and the progress of
    // a recognition shown in the "Recognizing ..." alert.
    int CreateFloatSlider(CueRecognizer* r, const char* name, float minimum, float maximum,
                          float value, void (*callback)(void*, float));
    int SetFloatSlider(CueRecognizer* r, const char* name, float value);
    int CreateIntSlider(CueRecognizer* r, const char* name, int minimum, int maximum, int value,
                        void (*callback)(void*, int));
    int SetIntSlider(CueRecognizer* r, const char* name, int value);
    int CreateOption(CueRecognizer* r, const char* name, int count, const char* const* labels,
                     int value, void (*callback)(void*, int));
    int SetOption(CueRecognizer* r, const char* name, int index);
    void RecognizeProgress(CueRecognizer* r, float done);
    // The panels' controls: a labelled row "rc" for a new one (or `update` for one that exists),
    // a slider and its value label (the record is the control's callback record, kept for the
    // life of the process), and moving a slider found again.
    static void install_chirrup_host();
    Widget control_row(CueRecognizer* r, const char* name, const std::function<void()>& update);
    void add_scale(CueRecognizer* r, const char* name, Widget row, int low, int high, int at,
                   int decimals, const std::string& shown, void* record);
    int move_scale(CueRecognizer* r, const char* name, int at, std::string (*text)(int));

    // --- Link dialog (GnomeLink.cpp)
    void create_link_dialog();
    void update_link_dialog(KLKeySet* keyset, CueRecognizer* recognizer);
    void update_target_lister(CueRecognizer* recognizer);
    void update_keyshape_lister(KLKeySet* keyset);
    static void select_target_cb(Widget, XtPointer, XtPointer);
    static void select_keyshape_cb(Widget, XtPointer, XtPointer);
    static void link_link_cb(Widget, XtPointer, XtPointer);
    static void link_audition_cb(Widget, XtPointer, XtPointer);
    static void link_done_cb(Widget, XtPointer, XtPointer);

    // --- Apply dialog (GnomeApply.cpp)
    void create_apply_dialog();
    void UpdateApplyDialog(KLEdlEvent* event) override;
    void update_apply_dialog(KLEdlEvent* event);
    void update_apply_listers(const std::vector<std::string>& dagNames);
    void update_typeins(KLEdlEvent* event);
    // The index-th selected item of `list` up to its first blank; null when there is none.
    // The text stays valid until the next call.
    static const char* selected_item(Widget list, int index);
    // What a text typed into an apply time field means (frames, or a time code with ":" or
    // "." between its parts).
    static CueTime parse_typein(const char* text);
    // The event's times after `field` ("src_in", "src_out", "dst_in" or "dst_out") was set to
    // t; `duration` limits the source out.
    static void apply_typein(KLEdlEvent* event, const char* field, CueTime t, CueTime duration);
    static void apply_cb(Widget, XtPointer, XtPointer);
    static void done_cb(Widget, XtPointer, XtPointer);
    static void typein_cb(Widget, XtPointer, XtPointer);
    static void apply_wire_filename_cb(Widget, XtPointer, XtPointer);

    // --- Fields: construction and widget tree
    struct RecognizerWidget {
        std::string name;
        std::string item;  // empty: the recognizer's container
        bool hasItem = false;
        Widget widget = nullptr;
        void* record = nullptr;
    };
    std::vector<RecognizerWidget> recognizerWidgets;
    KLStopWatch stopWatch{1.0};
    std::unique_ptr<RefLoadDialog> refLoadDialog;
    Widget refAdjustButton = nullptr;
    int confirmEnabled = 1;
    float playSpeed = 1.0f;
    int keyViewOn = 1;
    int refViewOn = 1;
    int playblastViewOn = 0;
    int mixViewOn = 1;
    int keyViewMode = 1;
    std::unique_ptr<KLFileManager> keysetManager;
    std::unique_ptr<KLFileManager> trackManager;
    std::unique_ptr<KLFileManager> soundManager;
    std::unique_ptr<KLFileManager> applyManager;
    std::unique_ptr<KLFileManager> referenceManager;
    KLSyncChart* syncChart = nullptr;  // owned by its widget
    KLSceneView* keyScene = nullptr;   // owned by its widget
    KLSceneView* mixScene = nullptr;   // owned by its widget
    std::unique_ptr<KLAlert> attentionAlert;
    std::unique_ptr<KLAlert> informationAlert;
    std::unique_ptr<KLPrompt> prompt;
    Widget speedMenu = nullptr;
    Widget repeatMenu = nullptr;
    Widget displayMenu = nullptr;
    Widget timeValueLabel = nullptr;
    Widget frameValueLabel = nullptr;
    Widget keysetTitleLabel = nullptr;
    Widget durationValueButton = nullptr;
    Widget helpCascade = nullptr;
    KLImageView* keyImageView = nullptr;  // owned by its widget
    KLImageView* refImageView = nullptr;  // owned by its widget
    int activeKeyset = -1;
    Widget topShell = nullptr;
    KLKeySet* shownKeyset = nullptr;  // borrowed from the workspace

    // --- Fields: playback
    int soundPlaying = 0;
    int stopRequested = 0;
    std::unique_ptr<KLTimer> playTimer;
    int repeatMode = 0;
    CueTime playFrom, playTo;
    float passSpeed = 1.0f;
    XtWorkProcId playbackWorkProc = 0;
    double nextFrame = 0.0;  // monotonic seconds of the next display update while playing

    // --- Fields: keyset tiles
    KLImageButton* tiles[kMaxKeysets][kMaxTiles] = {};  // owned by their widgets
    int tileCount[kMaxKeysets] = {};
    Widget tileBoxes[kMaxKeysets] = {};
    Widget keysetMenuEntries[kMaxKeysets] = {};
    int displayStyle = 0;
    static int tilesPerRow;

    // --- Fields: 3D views
    int dragButton = 0;
    int dragMode = 0;
    int dragging = 0;
    int dragDX = 0, dragDY = 0;
    int anchorX = 0, anchorY = 0;
    int geometryInformed = 0;  // the load-geometry notice was shown this run

    // --- Fields: information bar
    Widget errorFlag = nullptr;
    Widget statusLine = nullptr;
    XtWorkProcId statusIdle = 0;

    // --- Fields: recognizers and link dialog
    CueRecognizer* linkRecognizer = nullptr;  // borrowed: the recognizer the link dialog shows
    KLKeySet* linkKeyset = nullptr;           // borrowed
};

// The main window's widget table (166 rows and the closing null row).
extern const KLWidgetSpec widget_spec[];
extern const int widget_spec_rows;

// The one main window, as its own class (null before one is constructed).
Gnome* TheGnome();
