// The apply dialog: keysets and a dag node of the apply scene are chosen, the source and
// destination ranges typed, and "Apply" writes the keysets' animation into the scene, then
// asks for the output name.
#include <Xm/FileSB.h>
#include <Xm/Form.h>
#include <Xm/Label.h>
#include <Xm/List.h>
#include <Xm/PushB.h>
#include <Xm/Separator.h>
#include <Xm/TextF.h>
#include <Xm/Xm.h>

#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <sstream>

#include "model/KLEdlEvent.h"
#include "model/KLKeySet.h"
#include "scene/KLWire.h"
#include "scene/KLWireSource.h"
#include "scene/OrDagNode.h"
#include "scene/RawGeometry.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/xm/KLAlert.h"
#include "toolkit/xm/KLFileManager.h"
#include "window/Gnome.h"
#include "workspace/Imp.h"

#include "chart/KLSyncChart.h"

namespace {
const char kRootItem[] = "<ROOT>";
const int kMaxApplyKeysets = 10;

Widget make(WidgetClass cls, const char* name, Widget parent, const char* label = nullptr) {
    Widget w = XtVaCreateManagedWidget(name, cls, parent, nullptr);
    if (label)
        KLXmGnome::SetLabel(w, label);
    KLXmGnome::RegisterWidget(w);
    return w;
}

void attach(Widget w, Widget above, bool leftHalf, bool rightHalf) {
    XtVaSetValues(w, XmNleftAttachment, rightHalf ? XmATTACH_POSITION : XmATTACH_FORM,
                  XmNleftPosition, 50, XmNrightAttachment,
                  leftHalf ? XmATTACH_POSITION : XmATTACH_FORM, XmNrightPosition, 50,
                  XmNtopAttachment, above ? XmATTACH_WIDGET : XmATTACH_FORM, XmNtopWidget, above,
                  XmNleftOffset, 4, XmNrightOffset, 4, XmNtopOffset, 4, nullptr);
}

// A label and a list under it, in a form that takes one half of `parent`.
Widget lister(Widget parent, const char* box, const char* labelName, const char* label,
              const char* listName, bool left, unsigned char policy) {
    Widget form = make(xmFormWidgetClass, box, parent);
    attach(form, nullptr, left, !left);
    XtVaSetValues(form, XmNbottomAttachment, XmATTACH_FORM, nullptr);
    Widget l = make(xmLabelWidgetClass, labelName, form, label);
    attach(l, nullptr, false, false);
    Arg args[2];
    XtSetArg(args[0], XmNselectionPolicy, policy);
    XtSetArg(args[1], XmNvisibleItemCount, 10);
    Widget list = XmCreateScrolledList(form, const_cast<char*>(listName), args, 2);
    XtManageChild(list);
    KLXmGnome::RegisterWidget(list);
    XtVaSetValues(XtParent(list), XmNtopAttachment, XmATTACH_WIDGET, XmNtopWidget, l,
                  XmNleftAttachment, XmATTACH_FORM, XmNrightAttachment, XmATTACH_FORM,
                  XmNbottomAttachment, XmATTACH_FORM, nullptr);
    return list;
}

// One "In:"/"Out:" row: a label and a text field that calls typein_cb on Return.
Widget typein_row(Widget parent, const char* rowName, Widget above, const char* labelName,
                  const char* label, const char* fieldName) {
    Widget row = make(xmFormWidgetClass, rowName, parent);
    attach(row, above, false, false);
    Widget l = make(xmLabelWidgetClass, labelName, row, label);
    XtVaSetValues(l, XmNleftAttachment, XmATTACH_FORM, XmNtopAttachment, XmATTACH_FORM,
                  XmNbottomAttachment, XmATTACH_FORM, XmNwidth, 40, XmNrecomputeSize, False,
                  nullptr);
    Widget field = make(xmTextFieldWidgetClass, fieldName, row);
    XtVaSetValues(field, XmNleftAttachment, XmATTACH_WIDGET, XmNleftWidget, l, XmNrightAttachment,
                  XmATTACH_FORM, XmNcolumns, 12, nullptr);
    XtAddCallback(field, XmNactivateCallback, Gnome::typein_cb, nullptr);
    return row;
}

Widget typein_column(Widget parent, const char* name, bool left, const char* labelForm,
                     const char* labelName, const char* label, const char* top, const char* inL,
                     const char* in, const char* bot, const char* outL, const char* out) {
    Widget column = make(xmFormWidgetClass, name, parent);
    attach(column, nullptr, left, !left);
    Widget lf = make(xmFormWidgetClass, labelForm, column);
    attach(lf, nullptr, false, false);
    Widget l = make(xmLabelWidgetClass, labelName, lf, label);
    attach(l, nullptr, false, false);
    Widget t = typein_row(column, top, lf, inL, "In:", in);
    typein_row(column, bot, t, outL, "Out:", out);
    return column;
}

std::string time_text(CueTime t) {
    std::ostringstream out;
    t.Write(out);
    return out.str();
}

void show_dialog() {
    if (Widget d = KLXmGnome::FindWidget("applyDialog"))
        XtManageChild(d);
}

void hide_dialog() {
    if (Widget d = KLXmGnome::FindWidget("applyDialog"))
        XtUnmanageChild(d);
}

void set_region(Gnome* g, KLEdlEvent* event) {
    if (g->syncChart)
        g->syncChart->SetRegionRange(event->sourceIn, event->sourceOut);
}
}  // namespace

void Gnome::create_apply_dialog() {
    Widget dialog = FindWidget("applyDialog");
    if (!dialog || FindWidget("top_form", dialog))
        return;
    // The dialog keeps the size it was given (or grows to fit): shown again it would otherwise
    // shrink to its children's least size. What it has to spare goes to the lists.
    XtVaSetValues(dialog, XmNresizePolicy, XmRESIZE_GROW, nullptr);
    Widget top = make(xmFormWidgetClass, "top_form", dialog);
    lister(top, "keyListerBox", "keyListerLabel", "Select Keyset(s)", "keyLister", true,
           XmMULTIPLE_SELECT);
    lister(top, "dagListerBox", "dagListerLabel", "Select\tDagnode:", "dagLister", false,
           XmBROWSE_SELECT);
    Widget sep = make(xmSeparatorWidgetClass, "horiz_separator", dialog);
    Widget bottom = make(xmFormWidgetClass, "bottom_form", dialog);
    attach(top, nullptr, false, false);
    XtVaSetValues(top, XmNbottomAttachment, XmATTACH_WIDGET, XmNbottomWidget, sep, nullptr);
    XtVaSetValues(sep, XmNleftAttachment, XmATTACH_FORM, XmNrightAttachment, XmATTACH_FORM,
                  XmNbottomAttachment, XmATTACH_WIDGET, XmNbottomWidget, bottom, XmNbottomOffset, 4,
                  nullptr);
    XtVaSetValues(bottom, XmNleftAttachment, XmATTACH_FORM, XmNrightAttachment, XmATTACH_FORM,
                  XmNbottomAttachment, XmATTACH_FORM, XmNleftOffset, 4, XmNrightOffset, 4,
                  XmNbottomOffset, 4, nullptr);
    Widget typein = make(xmFormWidgetClass, "typein_form", bottom);
    attach(typein, nullptr, false, false);
    typein_column(typein, "left_typein", true, "left_label_form", "left_label", "Source\t(Chirrup)",
                  "left_top", "src_in_label", "src_in", "left_bot", "src_out_label", "src_out");
    typein_column(typein, "right_typein", false, "right_label_form", "right_label",
                  "Destination (wire)", "right_top", "dst_in_label", "dst_in", "right_bot",
                  "dst_out_label", "dst_out");
    Widget sep2 = make(xmSeparatorWidgetClass, "horiz_separator", bottom);
    attach(sep2, typein, false, false);
    Widget buttons = make(xmFormWidgetClass, "button_form", bottom);
    attach(buttons, sep2, false, false);
    Widget row = make(xmFormWidgetClass, "bottom_buttons", buttons);
    attach(row, nullptr, false, false);
    Widget done = make(xmPushButtonWidgetClass, "done_button", row, "Dismiss");
    attach(done, nullptr, true, false);
    Widget apply = make(xmPushButtonWidgetClass, "apply_button", row, "Apply");
    attach(apply, nullptr, false, true);
    XtAddCallback(done, XmNactivateCallback, done_cb, nullptr);
    XtAddCallback(apply, XmNactivateCallback, apply_cb, nullptr);
}

void Gnome::UpdateApplyDialog(KLEdlEvent* event) {
    update_apply_dialog(event);
}

void Gnome::update_apply_dialog(KLEdlEvent* event) {
    if (!event)
        return;
    event->OpenWire();
    std::vector<std::string> names;
    if (event->dagList) {
        bool first = true;
        for (const auto& node : event->dagList->nodes) {
            // The first node of the list is the scene's root group.
            names.push_back(first ? kRootItem : KLWire::NodeName(node.get()));
            first = false;
        }
    }
    update_apply_listers(names);
    set_region(this, event);
    update_typeins(event);
    show_dialog();
}

void Gnome::update_apply_listers(const std::vector<std::string>& dagNames) {
    auto fill = [](Widget list, const std::vector<std::string>& items) {
        if (!list)
            return;
        XmListDeleteAllItems(list);
        for (const std::string& item : items) {
            XmString s = XmStringCreateLocalized(const_cast<char*>(item.c_str()));
            XmListAddItemUnselected(list, s, 0);
            XmStringFree(s);
        }
    };
    std::vector<std::string> keysets;
    for (int i = 0; i < theImp.keysetCount; i++)
        if (KLKeySet* set = theImp.GetKeySet(i))
            keysets.push_back(set->Name() ? set->Name() : "");
    fill(FindWidget("keyLister"), keysets);
    fill(FindWidget("dagLister"), dagNames);
}

void Gnome::update_typeins(KLEdlEvent* event) {
    if (!event)
        return;
    const std::pair<const char*, CueTime> fields[] = {{"src_in", event->sourceIn},
                                                      {"src_out", event->sourceOut},
                                                      {"dst_in", event->destIn},
                                                      {"dst_out", event->destOut}};
    for (const auto& [name, t] : fields)
        if (Widget w = FindWidget(name))
            XmTextFieldSetString(w, const_cast<char*>(time_text(t).c_str()));
}

const char* Gnome::selected_item(Widget list, int index) {
    static std::string last;
    static bool held = false;
    last.clear();
    held = false;
    if (!list)
        return nullptr;
    XmStringTable items = nullptr;
    int count = 0;
    XtVaGetValues(list, XmNselectedItems, &items, XmNselectedItemCount, &count, nullptr);
    if (index < 0 || index >= count)
        return nullptr;
    char* text = nullptr;
    XmStringGetLtoR(items[index], const_cast<char*>(XmFONTLIST_DEFAULT_TAG), &text);
    if (text && *text) {
        char word[1024] = "";
        if (std::sscanf(text, "%1023s", word) == 1) {
            last = word;
            held = true;
        }
    }
    XtFree(text);
    return held ? last.c_str() : nullptr;
}

CueTime Gnome::parse_typein(const char* text) {
    CueTime t;
    if (!text)
        return t;
    int a = 0, b = 0, c = 0, d = 0, n = -1;
    if (std::strchr(text, ':'))
        n = std::sscanf(text, "%d:%d:%d:%d", &a, &b, &c, &d);
    else if (std::strchr(text, '.'))
        n = std::sscanf(text, "%d.%d.%d.%d", &a, &b, &c, &d);
    if (n >= 0) {
        switch (n) {
            case 4:
                t.SetTimecode(a, b, c, d);
                break;
            case 3:
                t.SetTimecode(0, a, b, c);
                break;
            case 2:
                t.SetTimecode(0, 0, a, b);
                break;
            case 1:
                t.SetTimecode(0, 0, 0, a);
                break;
            default:
                break;
        }
        return t;
    }
    int fps = CueTime::default_fps > 0 ? CueTime::default_fps : 30;
    double ticks = std::round(std::atof(text) * (6000 / fps));
    if (!std::isfinite(ticks))
        return t;
    return CueTime::FromTicks(int32_t(std::fmax(-2147483648.0, std::fmin(2147483647.0, ticks))));
}

void Gnome::apply_typein(KLEdlEvent* e, const char* field, CueTime t, CueTime duration) {
    CueTime length = e->sourceOut - e->sourceIn;
    if (!std::strcmp(field, "src_in")) {
        e->sourceIn = t;
        if (e->sourceOut < t)
            e->sourceOut = t;
        e->destOut = e->destIn + (e->sourceOut - e->sourceIn);
    } else if (!std::strcmp(field, "src_out")) {
        if (t > duration)
            t = duration;
        if (t < e->sourceIn)
            e->sourceIn = t;
        e->sourceOut = t;
        e->destOut = e->destIn + (e->sourceOut - e->sourceIn);
    } else if (!std::strcmp(field, "dst_in")) {
        e->destIn = t;
        e->destOut = e->destIn + length;
    } else if (!std::strcmp(field, "dst_out")) {
        e->destOut = t;
        e->destIn = t - length;
    }
}

void Gnome::typein_cb(Widget w, XtPointer, XtPointer) {
    Gnome* g = TheGnome();
    KLEdlEvent* event = theImp.applyEvent.get();
    if (!g || !event)
        return;
    char* text = XmTextFieldGetString(w);
    CueTime t = parse_typein(text);
    XtFree(text);
    apply_typein(event, XtName(w), t, theImp.duration);
    set_region(g, event);
    g->update_typeins(event);
}

void Gnome::apply_cb(Widget, XtPointer, XtPointer) {
    Gnome* g = TheGnome();
    KLEdlEvent* event = theImp.applyEvent.get();
    if (!g || !event)
        return;
    hide_dialog();
    const char* picked = selected_item(FindWidget("dagLister"), 0);
    if (!picked) {
        g->attentionAlert->Notify("You must select a dag node to apply under.", "OK");
        show_dialog();
        return;
    }
    std::string dag = picked;
    if (dag == kRootItem && event->wire) {
        std::unique_ptr<OrDagNode> root(event->wire->RootNode());
        if (root)
            dag = KLWire::NodeName(root.get());
    }
    Widget keyLister = FindWidget("keyLister");
    int applied = 0;
    bool failed = false;
    for (int i = 0; i < kMaxApplyKeysets; i++) {
        const char* keyset = selected_item(keyLister, i);
        if (!keyset)
            break;
        std::string name = keyset;  // the item buffer is reused by the next call
        if (!theImp.ApplyWire(event->wire.get(), name.c_str(), dag.c_str(), event->sourceIn,
                              event->sourceOut, event->destIn)) {
            failed = true;
            break;
        }
        applied++;
    }
    if (!failed && applied == 0) {
        g->attentionAlert->Notify("You must select one or more keysets to apply.", "OK");
        show_dialog();
        return;
    }
    if (!failed && g->applyManager)
        g->applyManager->StoreAs(1);
    event->CloseWire();
}

void Gnome::done_cb(Widget, XtPointer, XtPointer) {
    hide_dialog();
    if (KLEdlEvent* event = theImp.applyEvent.get())
        event->CloseWire();
}

void Gnome::apply_wire_filename_cb(Widget, XtPointer, XtPointer callData) {
    KLEdlEvent* event = theImp.applyEvent.get();
    auto* cbs = static_cast<XmFileSelectionBoxCallbackStruct*>(callData);
    if (!event || !cbs)
        return;
    char* name = nullptr;
    XmStringGetLtoR(cbs->value, const_cast<char*>(XmFONTLIST_DEFAULT_TAG), &name);
    if (name && *name) {
        if (std::getenv("VX_RAWFILE") && event->WireFile()) {
            std::string error;
            if (!RawGeometry::Write(event->wire ? event->wire->Path().c_str() : event->WireFile(),
                                    (std::string(name) + ".raw").c_str(), &error))
                KLError("%s\n", error.c_str());
        }
        event->StoreWire(name);
    }
    XtFree(name);
}
