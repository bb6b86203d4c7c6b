#include "chart/KLSyncChart.h"

#include <Xm/DrawingA.h>
#include <Xm/Form.h>
#include <Xm/Frame.h>
#include <Xm/PushB.h>
#include <Xm/ScrollBar.h>
#include <Xm/Xm.h>

#include <cmath>
#include <iostream>

#include "chart/KLChartText.h"
#include "model/KLKeyTrack.h"
#include "toolkit/CueSound.h"
#include "toolkit/xm/KLXmGnome.h"

namespace {

// The chart's own widget tree, under the form named after the chart.
const KLWidgetSpec chartTree[] = {
    {"+", "syncChartZoomPanForm", XmCreateForm},
    {".+", "syncChartZoomFrame", XmCreateFrame},
    {"..+", "syncChartZoomForm", XmCreateForm},
    {"...+", "syncChartZoomOut", XmCreatePushButton},
    {"...+", "syncChartZoomIn", XmCreatePushButton},
    {".+", "syncChartPanScroll", XmCreateScrollBar},
    {"+", "syncChartDrawingArea", XmCreateDrawingArea},
    {nullptr, nullptr, nullptr},
};

const char chartTranslations[] =
    "<Key> : DrawingAreaInput() ManagerGadgetKeyInput()\n"
    "<Btn1Down> : DrawingAreaInput() ManagerGadgetArm()\n"
    "<Btn1Up>\t: DrawingAreaInput() ManagerGadgetActivate()\n"
    "<Btn2Down> : DrawingAreaInput() ManagerGadgetArm()\n"
    "<Btn2Up>\t: DrawingAreaInput() ManagerGadgetActivate()\n"
    "<BtnMotion> : DrawingAreaInput()";

const KLFiendCallback noCallback{};
const Pixel noPixel = 0;

#define CHART_PIXEL(name, cls, field)                                                      \
    {                                                                                      \
        const_cast<char*>(name), const_cast<char*>(cls), const_cast<char*>(XtRPixel),      \
            sizeof(Pixel), offsetof(KLChartResources, field), const_cast<char*>(XtRPixel), \
            const_cast<Pixel*>(&noPixel)                                                   \
    }
#define CHART_CALLBACK(name, cls, field)                                                      \
    {                                                                                         \
        const_cast<char*>(name), const_cast<char*>(cls), const_cast<char*>(KLRFiendCallback), \
            sizeof(KLFiendCallback), offsetof(KLChartResources, field),                       \
            const_cast<char*>(KLRFiendCallback), const_cast<KLFiendCallback*>(&noCallback)    \
    }

XtResource chartResources[] = {
    CHART_PIXEL("soundColor", "SoundColor", soundColor),
    CHART_PIXEL("gridColor", "GridColor", gridColor),
    CHART_PIXEL("regionColor", "RegionColor", regionColor),
    CHART_PIXEL("keylineColor", "KeylineColor", keylineColor),
    CHART_PIXEL("keyColor", "KeyColor", keyColor),
    CHART_PIXEL("keyActiveColor", "KeyActiveColor", keyActiveColor),
    CHART_PIXEL("keyMovingColor", "KeyMovingColor", keyMovingColor),
    CHART_PIXEL("easeColor", "EaseColor", easeColor),
    CHART_PIXEL("linearColor", "LinearColor", linearColor),
    CHART_PIXEL("smoothColor", "SmoothColor", smoothColor),
    CHART_CALLBACK("showKeyframeCallback", "showKeyframeCallback", showKeyframeCallback),
    CHART_CALLBACK("showKeyframeImageCallback", "showKeyframeImageCallback",
                   showKeyframeImageCallback),
    CHART_CALLBACK("showReferenceImageCallback", "ShowReferenceImageCallback",
                   showReferenceImageCallback),
};

bool resourcesLoaded = false;

}  // namespace

const char* const KLSyncChart::fallbackResources[] = {
    "*SyncChart.soundColor: #1d4f91",
    "*SyncChart.gridColor: #a9acb0",
    "*SyncChart.regionColor: #f2e3a6",
    "*SyncChart.keylineColor: #7a7a7a",
    "*SyncChart.keyColor: #b22222",
    "*SyncChart.keyActiveColor: #ff8c1a",
    "*SyncChart.keyMovingColor: #ffb000",
    "*SyncChart.easeColor: #2e8b57",
    "*SyncChart.linearColor: #6a3d9a",
    "*SyncChart.smoothColor: #0b7fb5",
    "*syncChartZoomPanForm.leftAttachment: attach_form",
    "*syncChartZoomPanForm.rightAttachment: attach_form",
    "*syncChartZoomPanForm.bottomAttachment: attach_form",
    "*syncChartZoomFrame.leftAttachment: attach_form",
    "*syncChartZoomFrame.topAttachment: attach_form",
    "*syncChartZoomFrame.bottomAttachment: attach_form",
    "*syncChartZoomFrame.shadowType: shadow_etched_in",
    "*syncChartZoomOut.labelString: Zoom Out",
    "*syncChartZoomOut.leftAttachment: attach_form",
    "*syncChartZoomOut.topAttachment: attach_form",
    "*syncChartZoomOut.bottomAttachment: attach_form",
    "*syncChartZoomIn.labelString: Zoom In",
    "*syncChartZoomIn.leftAttachment: attach_widget",
    "*syncChartZoomIn.leftWidget: syncChartZoomOut",
    "*syncChartZoomIn.topAttachment: attach_form",
    "*syncChartZoomIn.bottomAttachment: attach_form",
    "*syncChartPanScroll.orientation: horizontal",
    "*syncChartPanScroll.minimum: 0",
    "*syncChartPanScroll.maximum: 10000",
    "*syncChartPanScroll.leftAttachment: attach_widget",
    "*syncChartPanScroll.leftWidget: syncChartZoomFrame",
    "*syncChartPanScroll.leftOffset: 4",
    "*syncChartPanScroll.rightAttachment: attach_form",
    "*syncChartPanScroll.topAttachment: attach_form",
    "*syncChartPanScroll.bottomAttachment: attach_form",
    "*syncChartDrawingArea.topAttachment: attach_form",
    "*syncChartDrawingArea.leftAttachment: attach_form",
    "*syncChartDrawingArea.rightAttachment: attach_form",
    "*syncChartDrawingArea.bottomAttachment: attach_widget",
    "*syncChartDrawingArea.bottomWidget: syncChartZoomPanForm",
    "*syncChartDrawingArea.width: 800",
    "*syncChartDrawingArea.height: 240",
    "*syncChartDrawingArea.marginWidth: 0",
    "*syncChartDrawingArea.marginHeight: 0",
    "*syncChartDrawingArea.traversalOn: True",
    nullptr,
};

Widget KLSyncChart::Create(Widget parent, String name, ArgList, Cardinal) {
    auto* chart = new KLSyncChart(parent, name);
    return chart->GetWidget();
}

KLSyncChart::KLSyncChart(Widget parent, const char* name) : KLFiend(parent, name) {
    display = XtDisplay(parent);
    if (!resourcesLoaded) {
        KLXmGnome::LoadFiendResources(fallbackResources);
        resourcesLoaded = true;
    }
    Widget form = XmCreateForm(parent, const_cast<char*>(name), nullptr, 0);
    XtVaGetValues(form, XmNbackground, &background, XmNforeground, &foreground, nullptr);
    attach_widget(form);
    read_resources(form);
    build(form);
    bool found = false;
    font = std::make_unique<KLChartText>(form, &found);
    if (!found)
        std::cerr << "Font failed" << std::endl;
    // The pan bar shows the whole chart from the start, not the scroll bar's own default.
    set_scrollbar_values();
}

KLSyncChart::~KLSyncChart() {
    // A chart that goes while scrubbing stops the sound without drawing (its window is gone).
    if (dragMode == 4)
        stop_scrub();
    hitKey = nullptr;
    hitMark = nullptr;
    font.reset();
    free_pixmaps();
    if (gc)
        XFreeGC(display, gc);
    if (maskGc)
        XFreeGC(display, maskGc);
}

void KLSyncChart::read_resources(Widget form) {
    // The colour and callback resources, read as sub-resources of the chart's form.
    XtGetSubresources(form, static_cast<KLChartResources*>(this), const_cast<char*>(Name().c_str()),
                      const_cast<char*>("SyncChart"), chartResources, XtNumber(chartResources),
                      nullptr, 0);
}

void KLSyncChart::build(Widget form) {
    KLXmGnome::BuildWidgetTree(form, chartTree);
    drawingArea = KLXmGnome::FindWidget("syncChartDrawingArea", form);
    if (drawingArea) {
        XtVaSetValues(drawingArea, XmNtranslations, XtParseTranslationTable(chartTranslations),
                      nullptr);
        XtAddCallback(drawingArea, XmNexposeCallback, chart_cb, this);
        XtAddCallback(drawingArea, XmNinputCallback, chart_cb, this);
        XtAddCallback(drawingArea, XmNresizeCallback, chart_cb, this);
    }
    panScroll = KLXmGnome::FindWidget("syncChartPanScroll", form);
    if (panScroll) {
        XtAddCallback(panScroll, XmNvalueChangedCallback, pan_scrollbar_cb, this);
        XtAddCallback(panScroll, XmNdragCallback, pan_scrollbar_cb, this);
    }
    if (Widget w = KLXmGnome::FindWidget("syncChartZoomIn", form))
        XtAddCallback(w, XmNactivateCallback, zoom_in_cb, this);
    if (Widget w = KLXmGnome::FindWidget("syncChartZoomOut", form))
        XtAddCallback(w, XmNactivateCallback, zoom_out_cb, this);
}

bool KLSyncChart::SetFiendCallback(const char* resourceName, KLFiendProc function,
                                   XtPointer clientData) {
    const std::string name = resourceName ? resourceName : "";
    KLFiendCallback* target = name == "showKeyframeCallback"         ? &showKeyframeCallback
                              : name == "showKeyframeImageCallback"  ? &showKeyframeImageCallback
                              : name == "showReferenceImageCallback" ? &showReferenceImageCallback
                                                                     : nullptr;
    if (!target)
        return false;
    target->function = function;
    target->clientData = clientData;
    return true;
}

// --- Size -------------------------------------------------------------------------------

void KLSyncChart::free_pixmaps() {
    if (font)
        font->Forget();
    if (chartPixmap)
        XFreePixmap(display, chartPixmap);
    if (regionPixmap)
        XFreePixmap(display, regionPixmap);
    if (bandMask)
        XFreePixmap(display, bandMask);
    chartPixmap = regionPixmap = bandMask = 0;
}

void KLSyncChart::set_size(Window w) {
    if (!w)
        return;
    Window root;
    int x, y;
    unsigned int width, height, border, depth;
    if (!XGetGeometry(display, w, &root, &x, &y, &width, &height, &border, &depth))
        return;
    if (!geometry.SetSize(width, height))
        return;
    free_pixmaps();
    if (width > 0 && height > 0) {
        chartPixmap = XCreatePixmap(display, w, width, height, depth);
        regionPixmap = XCreatePixmap(display, w, width, height, depth);
        bandMask = XCreatePixmap(display, w, width, unsigned(geometry.bandMaskHeight), 1);
        if (!gc)
            gc = XCreateGC(display, chartPixmap, 0, nullptr);
        if (!maskGc)
            maskGc = XCreateGC(display, bandMask, 0, nullptr);
    }
    waveSegments.assign(width, KLWaveSegment{0, 0, 0, 0});
    waveSegmentCount = 0;
    sketch_sound();
    sketch_grid();
    needFullReveal = true;
}

bool KLSyncChart::shrunk_only(Window w) {
    Window root;
    int x, y;
    unsigned int width, height, border, depth;
    if (!w || !XGetGeometry(display, w, &root, &x, &y, &width, &height, &border, &depth))
        return false;
    const bool changed = width != geometry.width || height != geometry.height;
    return changed && width <= geometry.width && height <= geometry.height;
}

void KLSyncChart::resize(XEvent*) {
    if (!window)
        return;
    if (shrunk_only(window)) {
        // The server sends no expose when a window only shrinks.
        set_size(window);
        needRedraw = true;
        full_expose();
    } else {
        set_size(window);
    }
}

void KLSyncChart::chart_cb(Widget, XtPointer clientData, XtPointer callData) {
    auto* chart = static_cast<KLSyncChart*>(clientData);
    auto* cbs = static_cast<XmDrawingAreaCallbackStruct*>(callData);
    chart->window = cbs->window;
    switch (cbs->reason) {
        case XmCR_EXPOSE:
            chart->expose(cbs->event);
            break;
        case XmCR_INPUT:
            chart->input(cbs->event);
            break;
        case XmCR_RESIZE:
            chart->resize(cbs->event);
            break;
        default:
            break;
    }
}

// --- Mappings and duration --------------------------------------------------------------

CueTime KLSyncChart::sound_length() const {
    if (!sound || !(sound->Rate() > 0))
        return CueTime();
    return CueTime::FromSeconds(double(sound->FrameCount()) / sound->Rate());
}

long KLSyncChart::index_from_pos(double fraction) {
    if (!sound)
        return 0;
    return geometry.IndexFromPos(fraction, sampleCount, sound_length());
}

void KLSyncChart::recompute_duration() {
    geometry.ComputeDuration(sound != nullptr, sound_length(), keyTrack != nullptr,
                             keyTrack ? keyTrack->Duration() : CueTime());
}

void KLSyncChart::SetUserDuration(CueTime t) {
    geometry.userDuration = std::max(t, CueTime(0, 0, 1, 0, 0));
    recompute_duration();
    sketch_sound();
    sketch_grid();
    full_expose();
}

// --- Zoom and pan -----------------------------------------------------------------------

void KLSyncChart::zoom_changed() {
    sketch_sound();
    sketch_grid();
    full_expose();  // draws the indicator too
    set_scrollbar_values();
}

void KLSyncChart::ZoomIn() {
    geometry.ZoomIn();
    zoom_changed();
}

void KLSyncChart::ZoomOut() {
    geometry.ZoomOut();
    zoom_changed();
}

void KLSyncChart::ZoomReset() {
    geometry.ZoomReset();
    zoom_changed();
}

void KLSyncChart::SetZoomPan(float start, float end) {
    geometry.SetZoomPan(start, end);
    zoom_changed();
}

void KLSyncChart::GetZoomPan(float* start, float* end) {
    if (start)
        *start = geometry.zoomStart;
    if (end)
        *end = geometry.zoomEnd;
}

void KLSyncChart::GetZoomRange(CueTime& start, CueTime& end) {
    start = geometry.TimeFromFraction(geometry.zoomStart);
    end = geometry.TimeFromFraction(geometry.zoomEnd);
}

void KLSyncChart::SetZoomRange(CueTime start, CueTime end) {
    SetZoomPan(float(geometry.FractionFromTime(start)), float(geometry.FractionFromTime(end)));
}

void KLSyncChart::GetRegionRange(CueTime& start, CueTime& end) {
    if (!geometry.RegionSelected()) {
        GetZoomRange(start, end);
        return;
    }
    start = geometry.TimeFromFraction(geometry.regionStart);
    end = geometry.TimeFromFraction(geometry.regionEnd);
}

void KLSyncChart::SetRegionRange(CueTime start, CueTime end) {
    geometry.regionStart = float(geometry.FractionFromTime(start));
    geometry.regionEnd = float(geometry.FractionFromTime(end));
    needFullReveal = true;
    full_expose();
}

void KLSyncChart::set_scrollbar_values() {
    if (panScroll) {
        int min = 0, max = 100;
        XtVaGetValues(panScroll, XmNminimum, &min, XmNmaximum, &max, nullptr);
        int value = 0, slider = 0;
        geometry.ScrollValues(min, max, &value, &slider);
        // Motif insists on a slider of at least 1 inside [min, max].
        slider = std::clamp(slider, 1, std::max(max - min, 1));
        value = std::clamp(value, min, std::max(min, max - slider));
        XmScrollBarSetValues(panScroll, value, slider, 100, 1000, False);
    }
    feedback_meter_movement();
}

void KLSyncChart::pan_scrollbar_cb(Widget w, XtPointer clientData, XtPointer) {
    auto* chart = static_cast<KLSyncChart*>(clientData);
    int value = 0, slider = 0, min = 0, max = 0;
    XtVaGetValues(w, XmNvalue, &value, XmNsliderSize, &slider, XmNminimum, &min, XmNmaximum, &max,
                  nullptr);
    float start, end;
    KLChartGeometry::PanFromScroll(value, slider, min, max, &start, &end);
    chart->SetZoomPan(start, end);
}

void KLSyncChart::zoom_in_cb(Widget, XtPointer clientData, XtPointer) {
    static_cast<KLSyncChart*>(clientData)->ZoomIn();
}

void KLSyncChart::zoom_out_cb(Widget, XtPointer clientData, XtPointer) {
    static_cast<KLSyncChart*>(clientData)->ZoomOut();
}

// --- Indicator --------------------------------------------------------------------------

float KLSyncChart::GetIndicatorPos() {
    return float(geometry.IndicatorFraction());
}

CueTime KLSyncChart::GetIndicatorTime() {
    return geometry.TimeFromFraction(geometry.IndicatorFraction());
}

void KLSyncChart::SetIndicatorPos(float fraction) {
    if (!(fraction >= geometry.zoomStart && fraction <= geometry.zoomEnd))
        return;
    if (geometry.ValidColumn(geometry.indicatorX))
        reveal(geometry.indicatorX, 0, 1, int(geometry.height));
    const int x = geometry.ColumnFromFraction(fraction);
    if (geometry.ValidColumn(x)) {
        geometry.indicatorX = x;
        draw_indicator();
    }
}

void KLSyncChart::SetIndicatorTime(CueTime t) {
    SetIndicatorPos(float(geometry.FractionFromTime(t)));
}

void KLSyncChart::draw_indicator() {
    if (!window || !gc || !geometry.ValidColumn(geometry.indicatorX))
        return;
    XSetForeground(display, gc, foreground);
    XSetLineAttributes(display, gc, 0, LineSolid, CapButt, JoinRound);
    XDrawLine(display, window, gc, geometry.indicatorX, 0, geometry.indicatorX,
              int(geometry.height));
}
