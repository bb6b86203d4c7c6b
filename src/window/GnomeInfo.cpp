// The information bar (time, frame, keyset, duration, status line, error flag), the window's
// messages and questions, the Help menu, the audio panel, the error-log viewer and the
// Reference menu.
#include <Xm/Form.h>
#include <Xm/Label.h>
#include <Xm/MessageB.h>
#include <Xm/PushB.h>
#include <Xm/Text.h>
#include <Xm/Xm.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <iostream>
#include <sstream>

#include "dialogs/RefLoadDialog.h"
#include "model/KLKeyEvent.h"
#include "model/KLKeyTrack.h"
#include "toolkit/CuePrefs.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLString.h"
#include "toolkit/xm/KLAlert.h"
#include "toolkit/xm/KLImageView.h"
#include "window/Gnome.h"
#include "workspace/Imp.h"

#include "chart/KLSyncChart.h"
#include "scene/gl/KLSceneView.h"

namespace {
const char kBuildStamp[] = "9704300208";

// A time in the form the program writes times (text, or binary when times are in binary).
std::string time_text(CueTime t) {
    std::ostringstream out;
    if (CueTime::binaryIO)
        t.WriteBinary(out);
    else
        t.Write(out);
    return out.str();
}

// The read-only error-log window used when no viewer program is set or installed.
Widget log_dialog = nullptr;

void close_log_cb(Widget w, XtPointer, XtPointer) {
    XtUnmanageChild(w);
}

void show_log_in_window(const std::string& fileName) {
    Widget parent = KLXmGnome::FindWidget("console");
    if (!parent)
        return;
    if (!log_dialog) {
        Arg args[1];
        XtSetArg(args[0], XmNautoUnmanage, False);
        log_dialog = XmCreateMessageDialog(parent, const_cast<char*>("errorLogDialog"), args, 1);
        XtUnmanageChild(XmMessageBoxGetChild(log_dialog, XmDIALOG_CANCEL_BUTTON));
        XtUnmanageChild(XmMessageBoxGetChild(log_dialog, XmDIALOG_HELP_BUTTON));
        XtUnmanageChild(XmMessageBoxGetChild(log_dialog, XmDIALOG_MESSAGE_LABEL));
        XtAddCallback(log_dialog, XmNokCallback, close_log_cb, nullptr);
        Arg targs[4];
        XtSetArg(targs[0], XmNeditable, False);
        XtSetArg(targs[1], XmNeditMode, XmMULTI_LINE_EDIT);
        XtSetArg(targs[2], XmNrows, 24);
        XtSetArg(targs[3], XmNcolumns, 80);
        Widget text = XmCreateScrolledText(log_dialog, const_cast<char*>("errorLogText"), targs, 4);
        XtManageChild(text);
        KLXmGnome::RegisterWidget(text);
    }
    std::ifstream in(fileName);
    std::stringstream content;
    content << in.rdbuf();
    if (Widget text = KLXmGnome::FindWidget("errorLogText", log_dialog))
        XmTextSetString(text, const_cast<char*>(content.str().c_str()));
    XtManageChild(log_dialog);
}
}  // namespace

void Gnome::create_error_flag() {
    Widget form = FindWidget("infoBarForm");
    if (!form)
        return;
    errorFlag = XmCreatePushButton(form, const_cast<char*>("errorFlag"), nullptr, 0);
    XtAddCallback(errorFlag, XmNactivateCallback, view_errors_cb, nullptr);
    XtManageChild(errorFlag);
    RegisterWidget(errorFlag);
    statusLine = XmCreateLabel(form, const_cast<char*>("statusLine"), nullptr, 0);
    XtManageChild(statusLine);
    RegisterWidget(statusLine);
    KLErrHandler::SetStatusHook(status_hook, this);
}

void Gnome::ShowStatus(const char* message) {
    if (!statusLine)
        return;
    std::string text = message ? message : "";
    while (!text.empty() && (text.back() == '\n' || text.back() == ' '))
        text.pop_back();
    KLXmGnome::SetLabel(statusLine, text);
    // Shown at once, also in the middle of a long load.
    if (XtIsRealized(statusLine))
        XmUpdateDisplay(statusLine);
}

void Gnome::status_hook(const char* message, void* gnome) {
    auto* g = static_cast<Gnome*>(gnome);
    g->ShowStatus(message);
    if (!g->statusIdle && AppContext())
        g->statusIdle = XtAppAddWorkProc(AppContext(), status_idle_workproc, g);
}

Boolean Gnome::status_idle_workproc(XtPointer gnome) {
    auto* g = static_cast<Gnome*>(gnome);
    g->statusIdle = 0;
    g->ShowStatus("Ready.");
    return True;
}

void Gnome::DisplayTimecode(CueTime t) {
    KLXmGnome::SetLabel(timeValueLabel, time_text(t));
    std::ostringstream frames;
    frames << t.Ticks() * double(CueTime::default_fps) / 6000.0;
    KLXmGnome::SetLabel(frameValueLabel, frames.str());
    if (Display* dpy = GetDisplay())
        XFlush(dpy);
}

void Gnome::chart_follows_workspace(bool withSound) {
    if (!syncChart)
        return;
    // The mark track first: the chart's drawing reads it, while of the sound it only asks
    // whether there is one.
    if (syncChart->markTrack != theImp.markTrack.get())
        syncChart->SetMarkTrack(theImp.markTrack.get());
    if (withSound && syncChart->sound != theImp.sound.get())
        syncChart->SetSound(theImp.sound.get());
}

void Gnome::DisplayDuration(CueTime duration) {
    chart_follows_workspace();
    if (syncChart)
        syncChart->SetUserDuration(duration);
    KLXmGnome::SetLabel(durationValueButton, time_text(duration));
}

void Gnome::DisplayReferenceOffset(CueTime offset) {
    KLXmGnome::SetLabel(refAdjustButton,
                        KLFmt("Set Reference Time [%s]", time_text(offset).c_str()));
}

void Gnome::DisplayReference(CueTime t) {
    if (!refImageView)
        return;
    if (theImp.referenceLoaded && refViewOn)
        refImageView->SetImage(theImp.GetReference(t));
    else if (theImp.playblastLoaded && playblastViewOn)
        refImageView->SetImage(theImp.GetPlayblast(t));
    else
        refImageView->SetImage(nullptr);
}

void Gnome::Inform(const char* message, const char* button) {
    chart_follows_workspace();  // the alert's event loop may redraw the chart
    std::cerr << (message ? message : "") << std::endl;
    if (attentionAlert)
        attentionAlert->Notify(message, button);
}

int Gnome::Confirm(const char* message, const char* yes, const char* no) {
    if (theImp.batchMode || !attentionAlert) {
        std::cerr << (message ? message : "") << std::endl << "Assuming OK" << std::endl;
        return 1;
    }
    chart_follows_workspace();
    return attentionAlert->Confirm(message, yes, no);
}

void Gnome::ShowErrorFlag() {
    if (!errorFlag)
        return;
    Pixel fg = 0;
    XtVaGetValues(errorFlag, XmNforeground, &fg, nullptr);
    XtVaSetValues(errorFlag, XmNbackground, fg, nullptr);
    XBell(XtDisplay(errorFlag), 100);
}

void Gnome::ClearErrorFlag() {
    if (!errorFlag)
        return;
    Pixel bg = 0;
    XtVaGetValues(XtParent(errorFlag), XmNbackground, &bg, nullptr);
    XtVaSetValues(errorFlag, XmNbackground, bg, nullptr);
}

int Gnome::AdjustRelLoad(char** prefix, char** ext, int* start, int* end, int* by, int* zoom) {
    if (!refLoadDialog)
        return 0;
    RefLoadDialog& d = *refLoadDialog;
    // The sequence shown may be replaced by this load: the view lets go of its pictures.
    if (refImageView)
        refImageView->SetImage(nullptr);
    d.SetPrefix(*prefix);
    d.SetExt(*ext);
    d.SetStart(*start);
    d.SetEnd(*end);
    d.SetBy(*by);
    d.SetZoom(*zoom);
    int ok = d.Show();
    std::string newPrefix = d.Prefix();
    if (newPrefix != (*prefix ? *prefix : "")) {
        delete[] * prefix;
        *prefix = KLNewString(newPrefix.c_str());
    }
    std::string newExt = d.Ext();
    if (newExt != (*ext ? *ext : "")) {
        delete[] * ext;
        *ext = KLNewString(newExt.c_str());
    }
    *start = d.Start();
    *end = d.End();
    *by = d.By();
    *zoom = d.Zoom();
    if (refImageView)
        refImageView->SetZoom(*zoom);
    return ok;
}

void Gnome::help_cb(Widget, XtPointer clientData, XtPointer) {
    const char* page = long(clientData) == 1 ? "Chirrup.html" : "chirrup.2.html";
    const char* location = CuePrefs::Location();
    const char* help = CuePrefs::HelpDir();
    std::string command =
        KLFmt("%s/bin/.nethelp %s/%s & \n", location ? location : ".", help ? help : ".", page);
    if (std::system(command.c_str()) != 0) {
        // A viewer that fails to start is not reported (the shell has said why).
    }
}

void Gnome::version_cb(Widget, XtPointer, XtPointer) {
    if (Gnome* g = TheGnome())
        g->Inform(KLFmt("Tessel|Marlin Parlando and Facial Animation Version 2.0 (%s)", kBuildStamp)
                      .c_str(),
                  "OK");
}

void Gnome::open_audio_panel_cb(Widget, XtPointer, XtPointer) {
    const char* command = nullptr;
    if (access("/usr/sbin/apanel", X_OK) == 0)
        command = "/usr/sbin/apanel";
    else if (access("/usr/bin/pavucontrol", X_OK) == 0)
        command = "/usr/bin/pavucontrol";
    if (command) {
        if (std::system(command) != 0) {
            // The panel's own exit status is of no interest.
        }
    } else if (Gnome* g = TheGnome()) {
        g->Inform("No audio control panel is installed (apanel or pavucontrol).", "Dismiss");
    }
}

void Gnome::view_errors_cb(Widget, XtPointer, XtPointer) {
    Imp::KLErrorLog* log = theImp.errorLog.get();
    bool ownWindow = !std::getenv("TESSEL_USER_ERROR_READER") && access("/usr/sbin/jot", X_OK) != 0;
    if (!log || !ownWindow) {
        theImp.ViewErrorLog();
        return;
    }
    // No viewer program: the log in a window of our own, with the same separator rule.
    show_log_in_window(log->fileName);
    if (log->handled != log->handledAtView)
        log->append_msg("\n---------------------------------------\n\n");
    log->handledAtView = log->handled;
    theImp.UIClearErrorFlag();
}

void Gnome::delete_reference_cb(Widget, XtPointer, XtPointer) {
    theImp.DeleteReference();
    if (Gnome* g = TheGnome())
        g->DisplayReference(CueTime());
}

void Gnome::adjust_reference_cb(Widget, XtPointer, XtPointer) {
    Gnome* g = TheGnome();
    if (g && g->syncChart)
        theImp.SetReferenceOffset(g->syncChart->GetIndicatorTime());
}

void Gnome::set_reference_region_cb(Widget, XtPointer, XtPointer) {
    Gnome* g = TheGnome();
    if (g && g->syncChart)
        g->syncChart->SetZoomRange(theImp.referenceOffset, theImp.ReferenceEnd());
}

void Gnome::ShowKeyframeImage() {
    // The key and mix views at the indicator, as GoToTime shows them, without moving the
    // indicator or the reference view.
    if (!syncChart)
        return;
    CueTime t = syncChart->GetIndicatorTime();
    show_views_at(t);
}

void Gnome::show_keyframe_cb(Widget, XtPointer, KLFiend*) {
    Gnome* g = TheGnome();
    if (g && g->syncChart) {
        // A key made active while the indicator is hidden (before the first click, or
        // scrolled out of view; a recognizer placing keys) leaves the views and the time
        // where they are: a hidden indicator has no time worth showing.
        if (g->syncChart->geometry.ValidColumn(g->syncChart->geometry.indicatorX)) {
            const CueTime t = g->syncChart->GetIndicatorTime();
            g->GoToTime(t);
            g->DisplayTimecode(t);
        }
        // A key became active: its value in the value field, its shape's tile selected.
        if (const KLKeyEvent* key = g->syncChart->activeKey) {
            g->SetKeyValue(key->value);
            g->ActivateKeyValue(1);
            g->HighlightKeyframe(key->shapeIndex);
        }
    }
}

void Gnome::show_keyframe_image_cb(Widget, XtPointer, KLFiend*) {
    if (Gnome* g = TheGnome())
        g->ShowKeyframeImage();
}

void Gnome::show_reference_image_cb(Widget, XtPointer, KLFiend*) {
    Gnome* g = TheGnome();
    if (g && g->syncChart) {
        // The chart calls this whenever the user moves its indicator (a click, a drag, a key
        // or mark moved): the information bar follows, not only when a key becomes active.
        // A hidden indicator (scrolled or zoomed out of view) has no time worth showing.
        const CueTime t = g->syncChart->GetIndicatorTime();
        g->DisplayReference(t);
        if (g->syncChart->geometry.ValidColumn(g->syncChart->geometry.indicatorX))
            g->DisplayTimecode(t);
    }
}
