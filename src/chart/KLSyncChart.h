#pragma once

#include <memory>
#include <vector>

#include <X11/Intrinsic.h>
#include <X11/Xlib.h>

#include "chart/KLChartGeometry.h"
#include "chart/KLChartResources.h"
#include "chart/KLKeyDrawing.h"
#include "chart/KLWaveSummary.h"
#include "toolkit/CueTime.h"
#include "toolkit/xm/KLFiend.h"

class CueSound;
class KLChartText;
class KLKey;
class KLKeyEvent;
class KLKeyTrack;
class KLMarkEvent;
class KLMarkTrack;
class KLTimer;

// The sync chart: the time line of the main window. It draws the sound's waveform, a time
// grid, the keys of a key track (curves, sticks and key-shape letters) and the marks of a
// mark track against time, with the indicator line at the current time and the selected
// region in its own colour, and edits keys and marks with the pointer and the keyboard.
// The time/pixel geometry lives in `geometry` (no X there); everything is drawn into two
// pixmaps (normal and region colours) and copied to the window. The chart borrows the tracks
// and the sound and never deletes them. Its top widget (a Form named after the chart) owns it.
class KLSyncChart : public KLFiend, public KLChartResources {
  public:
    // The widget-table creation function: a new chart under `parent`, returning its top
    // widget (the arguments are not applied).
    static Widget Create(Widget parent, String name, ArgList args, Cardinal count);

    KLSyncChart(Widget parent, const char* name);
    ~KLSyncChart() override;

    // Zoom and pan (fractions of the duration, or times).
    void ZoomIn();
    void ZoomOut();
    void ZoomReset();
    void SetZoomPan(float start, float end);
    void GetZoomPan(float* start, float* end);
    void GetZoomRange(CueTime& start, CueTime& end);
    void SetZoomRange(CueTime start, CueTime end);
    // The selected region as times; without a region, the visible span.
    void GetRegionRange(CueTime& start, CueTime& end);
    void SetRegionRange(CueTime start, CueTime end);

    // The indicator: a fraction of the duration or a time inside the visible part.
    float GetIndicatorPos();
    void SetIndicatorPos(float fraction);
    CueTime GetIndicatorTime();
    void SetIndicatorTime(CueTime t);

    // The length the workspace asks for (at least one second).
    void SetUserDuration(CueTime t);

    // Content (borrowed; null allowed).
    void SetKeyTrack(KLKeyTrack* track);
    void SetMarkTrack(KLMarkTrack* track);
    void SetSound(CueSound* sound);

    // Key editing. New keys are Ease keys; the Add operations return non-zero when a key
    // was inserted and repaint when `update` is non-zero.
    int AddKeyframe(int shapeIndex, KLKey* key, int update);
    int AddTimeKeyframe(int shapeIndex, CueTime t, KLKey* key, int update);
    void DeleteTimeKeyframe(CueTime t);
    void DeleteActiveKeyframe();
    void DeleteActiveKeyframeRegion();
    void SetRegionSmoothing(int smoothing);
    // Full repaint, then the feedback of the indicator's place.
    void UpdateDisplay();

    // The three callback resources by name.
    bool SetFiendCallback(const char* resourceName, KLFiendProc function,
                          XtPointer clientData) override;

    // Toolkit callbacks; client data is the chart.
    static void zoom_in_cb(Widget w, XtPointer clientData, XtPointer callData);
    static void zoom_out_cb(Widget w, XtPointer clientData, XtPointer callData);
    static void pan_scrollbar_cb(Widget w, XtPointer clientData, XtPointer callData);
    static void chart_cb(Widget w, XtPointer clientData, XtPointer callData);

    // The class-wide fallback resources (class "SyncChart"), loaded with the first chart.
    static const char* const fallbackResources[];

    KLKeyEvent* activeKey = nullptr;    // key under edit
    KLMarkEvent* activeMark = nullptr;  // mark under edit
    KLMarkTrack* markTrack = nullptr;   // borrowed
    KLKeyTrack* keyTrack = nullptr;     // borrowed
    Display* display = nullptr;
    Window window = 0;  // the drawing area's, from every drawing-area callback
    Widget drawingArea = nullptr;
    Widget panScroll = nullptr;
    KLChartGeometry geometry;  // size, bands, duration, zoom, region, indicator column
    bool needFullReveal = true;
    bool needRedraw = true;
    Pixmap chartPixmap = 0;
    Pixmap regionPixmap = 0;
    Pixmap bandMask = 0;
    GC gc = nullptr;
    GC maskGc = nullptr;
    Pixel background = 0, foreground = 0;
    std::vector<KLWaveSegment> waveSegments;  // one per column
    int waveSegmentCount = 0;                 // segments sketched (0: no waveform)
    CueSound* sound = nullptr;                // borrowed
    std::vector<float> samples;               // the sound as one channel
    long sampleCount = 0;
    float peak = 0.0f;
    KLWaveSummary waveSummary;          // min/max summaries of `samples`
    KLKeyDrawing keyDrawing;            // the key layer of the last redraw
    std::unique_ptr<KLChartText> font;  // the chart's text font

    int dragMode = 0;  // 0 none, 1 indicator, 2 key, 3 mark, 4 scrub, 5 key stick
    int feedbackKeyBefore = -1, feedbackKeyAfter = -1;
    float feedbackBlend = 0.0f;

  private:
    // Construction and size.
    void build(Widget form);
    void read_resources(Widget form);
    void set_size(Window w);
    bool shrunk_only(Window w);
    void resize(XEvent* event);
    void free_pixmaps();
    void set_scrollbar_values();
    long index_from_pos(double fraction);
    CueTime sound_length() const;
    void recompute_duration();
    // After a zoom change: re-sketch, full expose, indicator, scroll bar.
    void zoom_changed();

    // Drawing (KLSyncChartDraw.cpp).
    void expose(XEvent* event);
    void reveal(int x, int y, int w, int h);
    void sketch_grid();
    void sketch_sound();
    void draw_grid();
    void draw_sound();
    void draw_keys();
    void draw_marks();
    void draw_indicator();
    void full_expose() { expose(nullptr); }
    bool drawable() const { return window && chartPixmap && gc; }

    // Pointer and keyboard (KLSyncChartInput.cpp).
    void input(XEvent* event);
    // Starts (phase 0), moves (1) or ends (2) the button-1 drag that `dragMode` names.
    void button1_drag(int x, int y, int phase);
    void scrub(int x, int phase);
    void stop_scrub();
    void drag_1(int x, int phase);
    void drag_key(int x, int phase);
    void drag_keystick(int y, int phase);
    void drag_mark(int x, int phase);
    void drag_region(int x, int phase);
    // Draws a dragged key or mark at the pointer's column (kept inside the chart) until the
    // release (phase 2), erasing it where it was drawn before; the column it lands on at the
    // release, -1 until then.
    int follow_drag(int x, int phase, void (KLSyncChart::*erase)(int),
                    void (KLSyncChart::*draw)(int));
    // Ends a drag that changed a track: the chart redrawn and the views told.
    void end_drag();
    int handle_keyframe_hit(XEvent* event);
    int handle_keystick_hit(XEvent* event);
    int handle_mark_hit(XEvent* event);
    void handle_keyboard_input(unsigned long keysym, int count, char* text);
    void feedback_meter_movement();
    void set_active_key(KLKeyEvent* event);
    // Removes the key at `t` from the key track (there must be one), forgetting it first as
    // the active or the hit key.
    void remove_key(CueTime t);
    void set_active_mark(KLMarkEvent* mark);
    void move_indicator(int x);
    void draw_stick(Drawable d, int x, float value, unsigned long pixel);
    void draw_dragged_key(int x);
    void draw_dragged_mark(int x);
    void erase_key_strip(int x);
    void erase_mark_strip(int x);

    friend class KLSyncChartTestAccess;

    // Process-wide state of the pointer and keyboard, shared by all charts.
    static KLKeyEvent* hitKey;     // found by the last key or key-stick hit test
    static KLMarkEvent* hitMark;   // found by the last mark hit test
    static int keyHighlightX;      // column of the active-key highlight, -1 none
    static int markHighlightX;     // column of the active-mark highlight, -1 none
    static CueTime feedbackTime;   // indicator time at the last feedback
    static CueTime lastTypedTime;  // time of the last typed mark
    static int lastTypedX;         // indicator column when it was typed (-2: none yet)
    static float scrubPosition;    // play position while scrubbing, 0..1 of the sound
    static std::unique_ptr<KLTimer> scrubTimer;  // the scrub's timer, while scrubbing

    int dragX_ = -1;        // column of the object drawn while dragging, -1 none
    int regionAnchor_ = 0;  // column where the region sweep started
    int regionLeft_ = 0;    // swept rectangle: left column and width
    int regionWidth_ = 0;
    float dragValue_ = 0.0f;  // key value while its stick is dragged
};
