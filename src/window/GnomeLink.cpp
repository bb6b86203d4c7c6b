// The link dialog: the targets of one recognizer on the left, the key shapes of the current
// keyset on the right; "Link" (or a double click) links the selected target to the selected
// key shape, "Audition" plays the target's sample sound.
#include <Xm/Form.h>
#include <Xm/Frame.h>
#include <Xm/Label.h>
#include <Xm/List.h>
#include <Xm/PushB.h>
#include <Xm/Separator.h>
#include <Xm/Xm.h>

#include <functional>
#include <memory>
#include <string>

#include "model/KLKeySet.h"
#include "toolkit/CueRecognizer.h"
#include "toolkit/CueSound.h"
#include "toolkit/KLImageSGI.h"
#include "toolkit/KLSoundControl.h"
#include "toolkit/KLTimer.h"
#include "toolkit/xm/KLImageView.h"
#include "window/Gnome.h"
#include "workspace/Imp.h"

namespace {

// The character sets of the target lister's items: linked and not linked.
const char kLinked[] = "charset1";
const char kUnlinked[] = "charset2";

// The dialog's working widgets, found once it is built.
struct LinkWidgets {
    Widget targetLister = nullptr;
    Widget keyshapeLister = nullptr;
    Widget targetLabel = nullptr;
    Widget keyshapeLabel = nullptr;
    KLImageView* targetImage = nullptr;  // owned by its widget
    KLImageView* keyshapeImage = nullptr;
    Widget auditionButton = nullptr;
    Widget linkButton = nullptr;
    Widget doneButton = nullptr;
};
LinkWidgets theLink;
// The target's picture being shown (the view borrows it).
std::unique_ptr<KLImageSGI> theTargetPicture;
// The sound being auditioned and the timer that paces it. The sound output reads them from
// its own thread, so they are replaced only after KLSoundControl::Stop (the output closes
// its device at exit before statics such as these are destroyed).
std::unique_ptr<CueSound> theAuditionSound;
std::unique_ptr<KLTimer> theAuditionTimer;

void stop_audition() {
    KLSoundControl::Stop();
    theAuditionSound.reset();
    theAuditionTimer.reset();
}

Widget make(WidgetClass cls, const char* name, Widget parent, const char* label = nullptr) {
    Widget w = XtVaCreateManagedWidget(name, cls, parent, nullptr);
    if (label)
        KLXmGnome::SetLabel(w, label);
    // Names other dialogs use too ("top_form", "frame", "done_button" ...) stay theirs.
    if (!KLXmGnome::FindWidget(name))
        KLXmGnome::RegisterWidget(w);
    return w;
}

// Makes `proc` (with `client`) the one callback of `w`'s list `which`: the dialog serves one
// recognizer and one keyset at a time.
void rebind(Widget w, const char* which, XtCallbackProc proc, XtPointer client) {
    XtRemoveAllCallbacks(w, which);
    XtAddCallback(w, which, proc, client);
}

// Empties a lister and fills it with `count` items made by `item`.
void refill(Widget list, int count, const std::function<XmString(int)>& item) {
    XmListDeleteAllItems(list);
    for (int i = 0; i < count; ++i) {
        XmString text = item(i);
        XmListAddItemUnselected(list, text, 0);
        XmStringFree(text);
    }
}

void set_label(Widget w, const char* text) {
    KLXmGnome::SetLabel(w, text ? text : "");
}

void fill(Widget w, Widget above) {
    XtVaSetValues(w, XmNleftAttachment, XmATTACH_FORM, XmNrightAttachment, XmATTACH_FORM,
                  XmNtopAttachment, above ? XmATTACH_WIDGET : XmATTACH_FORM, XmNtopWidget, above,
                  XmNleftOffset, 4, XmNrightOffset, 4, XmNtopOffset, 4, nullptr);
}

// One half of the dialog: a label, a scrolled list, the selected item's name and its
// picture in a frame.
Widget half(Widget parent, bool left, const char* box, const char* labelName, const char* label,
            const char* listName, const char* itemLabel, const char* imageName, Widget* list,
            Widget* nameLabel, KLImageView** image) {
    Widget form = make(xmFormWidgetClass, box, parent);
    XtVaSetValues(form, XmNtopAttachment, XmATTACH_FORM, XmNbottomAttachment, XmATTACH_FORM,
                  XmNleftAttachment, left ? XmATTACH_FORM : XmATTACH_POSITION, XmNleftPosition, 50,
                  XmNrightAttachment, left ? XmATTACH_POSITION : XmATTACH_FORM, XmNrightPosition,
                  50, nullptr);
    Widget l = make(xmLabelWidgetClass, labelName, form, label);
    fill(l, nullptr);
    Arg args[2];
    XtSetArg(args[0], XmNselectionPolicy, XmBROWSE_SELECT);
    XtSetArg(args[1], XmNvisibleItemCount, 8);
    *list = XmCreateScrolledList(form, const_cast<char*>(listName), args, 2);
    XtManageChild(*list);
    KLXmGnome::RegisterWidget(*list);
    fill(XtParent(*list), l);
    *nameLabel = make(xmLabelWidgetClass, itemLabel, form, " ");
    fill(*nameLabel, XtParent(*list));
    Widget frame = make(xmFrameWidgetClass, "frame", form);
    fill(frame, *nameLabel);
    XtVaSetValues(frame, XmNbottomAttachment, XmATTACH_FORM, XmNbottomOffset, 4, nullptr);
    Widget view = KLImageView::Create(frame, const_cast<char*>(imageName), nullptr, 0);
    XtManageChild(view);
    XtVaSetValues(view, XmNwidth, 96, XmNheight, 96, nullptr);
    *image = dynamic_cast<KLImageView*>(KLXmGnome::FindFiend(imageName, frame));
    return form;
}

// The text of the one selected item of `list`, read in either character set; empty unless
// exactly one item is selected.
std::string link_item(Widget list) {
    int* positions = nullptr;
    int count = 0;
    if (!list || !XmListGetSelectedPos(list, &positions, &count))
        return std::string();
    XtFree(reinterpret_cast<char*>(positions));
    if (count != 1)
        return std::string();
    XmStringTable items = nullptr;
    XtVaGetValues(list, XmNselectedItems, &items, nullptr);
    if (!items)
        return std::string();
    char* text = nullptr;
    std::string out;
    for (const char* tag : {kLinked, kUnlinked})
        if (XmStringGetLtoR(items[0], const_cast<char*>(tag), &text) && text) {
            out = text;
            XtFree(text);
            break;
        }
    if (out.empty() &&
        XmStringGetLtoR(items[0], const_cast<char*>(XmFONTLIST_DEFAULT_TAG), &text) && text) {
        out = text;
        XtFree(text);
    }
    return out;
}

CueRecognizer::Target* selected_target(CueRecognizer* r) {
    const std::string name = link_item(theLink.targetLister);
    return r && !name.empty() ? r->FindTarget(name.c_str()) : nullptr;
}

// Selects item `position` (1-based) of `list` alone and scrolls it into view: to the top
// when it lies above the visible part, to the bottom when below.
void select_and_reveal(Widget list, int position) {
    XmListDeselectAllItems(list);
    XmListSelectPos(list, position, False);
    int top = 1, visible = 1;
    XtVaGetValues(list, XmNtopItemPosition, &top, XmNvisibleItemCount, &visible, nullptr);
    if (position < top)
        XmListSetPos(list, position);
    else if (position >= top + visible)
        XmListSetBottomPos(list, position);
}

void show_keyshape(KLKeySet* keyset, int index) {
    set_label(theLink.keyshapeLabel, keyset ? keyset->GetKeyShapeName(index) : "");
    if (theLink.keyshapeImage)
        theLink.keyshapeImage->SetImage(keyset ? keyset->GetKeyShapeImage(index) : nullptr);
}

}  // namespace

void Gnome::create_link_dialog() {
    Widget dialog = FindWidget("linkDialog");
    if (!dialog || theLink.targetLister)
        return;
    XtVaSetValues(dialog, XmNautoUnmanage, False, nullptr);
    Widget top = make(xmFormWidgetClass, "top_form", dialog);
    fill(top, nullptr);
    half(top, true, "targetListerBox", "targetListerLabel", "Link Target", "targetLister",
         "targetLabel", "targetImage", &theLink.targetLister, &theLink.targetLabel,
         &theLink.targetImage);
    half(top, false, "keyshapeListerBox", "keyshapeListerLabel", "... to\tKeyshape",
         "keyshapeLister", "keyshapeLabel", "keyshapeImage", &theLink.keyshapeLister,
         &theLink.keyshapeLabel, &theLink.keyshapeImage);
    Widget separator = make(xmSeparatorWidgetClass, "horiz_separator", dialog);
    fill(separator, top);
    Widget buttonForm = make(xmFormWidgetClass, "button_form", dialog);
    fill(buttonForm, separator);
    XtVaSetValues(buttonForm, XmNbottomAttachment, XmATTACH_FORM, XmNbottomOffset, 4, nullptr);
    Widget bottom = make(xmFormWidgetClass, "bottom_buttons", buttonForm);
    fill(bottom, nullptr);
    XtVaSetValues(bottom, XmNfractionBase, 3, nullptr);
    struct {
        const char* name;
        const char* label;
        Widget* widget;
    } const buttons[] = {{"link_button", "Link", &theLink.linkButton},
                         {"audition_button", "Audition", &theLink.auditionButton},
                         {"done_button", "Dismiss", &theLink.doneButton}};
    for (int i = 0; i < 3; ++i) {
        Widget w = make(xmPushButtonWidgetClass, buttons[i].name, bottom, buttons[i].label);
        XtVaSetValues(w, XmNleftAttachment, XmATTACH_POSITION, XmNleftPosition, i,
                      XmNrightAttachment, XmATTACH_POSITION, XmNrightPosition, i + 1, XmNleftOffset,
                      4, XmNrightOffset, 4, XmNtopAttachment, XmATTACH_FORM, XmNbottomAttachment,
                      XmATTACH_FORM, nullptr);
        *buttons[i].widget = w;
    }
    XtSetSensitive(theLink.auditionButton, False);
    // Other dialogs have a "done_button" too: the callback goes on this one.
    XtAddCallback(theLink.doneButton, XmNactivateCallback, link_done_cb, nullptr);
}

void Gnome::update_link_dialog(KLKeySet* keyset, CueRecognizer* recognizer) {
    update_target_lister(recognizer);
    update_keyshape_lister(keyset);
}

void Gnome::update_target_lister(CueRecognizer* recognizer) {
    Widget list = theLink.targetLister;
    if (!list)
        return;
    linkRecognizer = recognizer;
    rebind(list, XmNbrowseSelectionCallback, select_target_cb, recognizer);
    for (Widget w : {theLink.targetLister, theLink.keyshapeLister})
        rebind(w, XmNdefaultActionCallback, link_link_cb, recognizer);
    rebind(theLink.linkButton, XmNactivateCallback, link_link_cb, recognizer);
    refill(list, recognizer ? int(recognizer->targets.size()) : 0, [&](int i) {
        const CueRecognizer::Target& t = recognizer->targets[size_t(i)];
        return XmStringCreate(const_cast<char*>(t.name.c_str()),
                              const_cast<char*>(t.keyShapeIndex >= 0 ? kLinked : kUnlinked));
    });
}

void Gnome::update_keyshape_lister(KLKeySet* keyset) {
    Widget list = theLink.keyshapeLister;
    if (!list)
        return;
    linkKeyset = keyset;
    rebind(list, XmNbrowseSelectionCallback, select_keyshape_cb, keyset);
    refill(list, keyset ? keyset->keyShapeCount : 0, [&](int i) {
        return XmStringCreateLocalized(const_cast<char*>(keyset->GetKeyShapeName(i)));
    });
}

void Gnome::select_target_cb(Widget, XtPointer client, XtPointer) {
    Gnome* g = TheGnome();
    CueRecognizer::Target* target = selected_target(static_cast<CueRecognizer*>(client));
    if (!g || !target)
        return;
    set_label(theLink.targetLabel, target->name.c_str());
    theTargetPicture.reset();
    if (!target->pictureFile.empty())
        theTargetPicture = KLImageSGI::Load(target->pictureFile.c_str());
    if (theLink.targetImage)
        theLink.targetImage->SetImage(theTargetPicture.get());
    XtRemoveAllCallbacks(theLink.auditionButton, XmNactivateCallback);
    if (!target->soundFile.empty()) {
        XtSetSensitive(theLink.auditionButton, True);
        XtAddCallback(theLink.auditionButton, XmNactivateCallback, link_audition_cb, target);
    } else {
        XtSetSensitive(theLink.auditionButton, False);
    }
    KLKeySet* keyset = g->linkKeyset;
    if (target->keyShapeIndex >= 0 && keyset && target->keyShapeIndex < keyset->keyShapeCount) {
        select_and_reveal(theLink.keyshapeLister, target->keyShapeIndex + 1);
        show_keyshape(keyset, target->keyShapeIndex);
    }
}

void Gnome::select_keyshape_cb(Widget, XtPointer client, XtPointer) {
    auto* keyset = static_cast<KLKeySet*>(client);
    const std::string name = link_item(theLink.keyshapeLister);
    if (!keyset || name.empty())
        return;
    show_keyshape(keyset, keyset->GetKeyShapeId(name.c_str()));
}

void Gnome::link_link_cb(Widget, XtPointer client, XtPointer) {
    Gnome* g = TheGnome();
    auto* r = static_cast<CueRecognizer*>(client);
    CueRecognizer::Target* target = selected_target(r);
    if (!g || !target || !g->linkKeyset)
        return;
    const std::string shape = link_item(theLink.keyshapeLister);
    const int id = shape.empty() ? -1 : g->linkKeyset->GetKeyShapeId(shape.c_str());
    if (id < 0)
        return;
    target->keyShapeIndex = id;
    theImp.keysetModified = 1;
    g->ShowRecognizerGui(r);
    // The list is refilled; the linked target stays selected and in view.
    int top = 1;
    XtVaGetValues(theLink.targetLister, XmNtopItemPosition, &top, nullptr);
    const int position = r->TargetIndex(target->name.c_str()) + 1;
    g->update_target_lister(r);
    XmListSetPos(theLink.targetLister, top);
    select_and_reveal(theLink.targetLister, position);
}

void Gnome::link_audition_cb(Widget, XtPointer client, XtPointer) {
    auto* target = static_cast<CueRecognizer::Target*>(client);
    if (!target || target->soundFile.empty())
        return;
    stop_audition();
    auto sound = std::make_unique<CueSound>(target->soundFile.c_str());
    if (!sound->Valid()) {
        if (Gnome* g = TheGnome())
            g->Inform(sound->ErrorText().c_str(), "Dismiss");
        return;
    }
    theAuditionTimer = std::make_unique<KLTimer>(
        CueTime(), CueTime::FromSeconds(double(sound->FrameCount()) / sound->Rate()));
    theAuditionSound = std::move(sound);
    theAuditionTimer->start();
    KLSoundControl::Play(theAuditionSound.get(), theAuditionTimer.get(), CueTime());
}

void Gnome::link_done_cb(Widget, XtPointer, XtPointer) {
    if (theAuditionSound)
        stop_audition();
    if (Widget dialog = FindWidget("linkDialog"))
        XtUnmanageChild(dialog);
}
