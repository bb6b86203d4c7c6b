#include "toolkit/xm/KLFileManager.h"

#include <Xm/FileSB.h>
#include <Xm/Protocols.h>
#include <Xm/TextF.h>
#include <Xm/Xm.h>
#include <sys/stat.h>

#include <algorithm>
#include <map>
#include <vector>

#include "toolkit/KLString.h"
#include "toolkit/xm/KLAlert.h"
#include "toolkit/xm/KLXmGnome.h"

namespace {
struct Memory {
    std::string directory;
    std::string name;
};

// Last directory and name per kind of file, for the whole run.
std::map<std::string, Memory>& memory() {
    static std::map<std::string, Memory> kinds;
    return kinds;
}

std::string directory_of(const std::string& path) {
    size_t slash = path.rfind('/');
    return slash == std::string::npos ? std::string(".") : path.substr(0, slash);
}

std::string base_of(const std::string& path) {
    size_t slash = path.rfind('/');
    return slash == std::string::npos ? path : path.substr(slash + 1);
}

XmString make_string(const std::string& text) {
    return XmStringCreateLocalized(const_cast<char*>(text.c_str()));
}
}  // namespace

KLFileManager::KLFileManager(Widget parent) : parent_(parent) {}

KLFileManager::~KLFileManager() = default;

std::string KLFileManager::FilterMask(const char* pattern, const char* extension) {
    if (pattern && *pattern)
        return pattern;
    if (extension && *extension)
        return std::string("*.") + extension;
    return "*";
}

std::string KLFileManager::LastDirectory() {
    return memory()[FileTypeName()].directory;
}
std::string KLFileManager::LastName() {
    return memory()[FileTypeName()].name;
}

void KLFileManager::ResetDirectory() {
    memory()[FileTypeName()].directory.clear();
}

void KLFileManager::InstallRetrieveCallback(Widget widget, const char* callbackName) {
    if (widget)
        XtAddCallback(widget, callbackName, retrieve_cb, this);
}

void KLFileManager::InstallStoreAsCallback(Widget widget, const char* callbackName) {
    if (widget)
        XtAddCallback(widget, callbackName, store_cb, this);
}

void KLFileManager::retrieve_cb(Widget, XtPointer clientData, XtPointer) {
    static_cast<KLFileManager*>(clientData)->Retrieve();
}

void KLFileManager::store_cb(Widget, XtPointer clientData, XtPointer) {
    static_cast<KLFileManager*>(clientData)->StoreAs(1);
}

Widget KLFileManager::Browser() {
    if (browser_)
        return browser_;
    Arg args[2];
    Cardinal n = 0;
    XtSetArg(args[n], XmNdialogStyle, XmDIALOG_FULL_APPLICATION_MODAL), n++;
    XtSetArg(args[n], XmNautoUnmanage, False), n++;
    std::string name = std::string(FileTypeName()) + "Browser";
    browser_ = XmCreateFileSelectionDialog(parent_, const_cast<char*>(name.c_str()), args, n);
    XtUnmanageChild(XmFileSelectionBoxGetChild(browser_, XmDIALOG_HELP_BUTTON));
    XtAddCallback(browser_, XmNokCallback, answer_cb, this);
    XtAddCallback(browser_, XmNcancelCallback, answer_cb, this);
    Widget shell = XtParent(browser_);
    XtVaSetValues(shell, XmNdeleteResponse, XmDO_NOTHING, nullptr);
    Atom wmDelete = XmInternAtom(XtDisplay(shell), const_cast<char*>("WM_DELETE_WINDOW"), False);
    XmAddWMProtocolCallback(shell, wmDelete, close_cb, this);
    alert_ = std::make_unique<KLAlert>(parent_, "Attention");
    XtVaGetValues(browser_, XmNfileSearchProc, &defaultSearch_, nullptr);
    XtVaSetValues(browser_, XmNfileSearchProc, &KLFileManager::search_proc, XmNuserData,
                  XtPointer(this), nullptr);
    return browser_;
}

std::string KLFileManager::choose(const char* title) {
    Widget browser = Browser();
    Memory& remembered = memory()[FileTypeName()];
    std::string dir = remembered.directory;
    if (dir.empty()) {
        const char* def = DefaultDirectory();
        dir = def && *def ? def : ".";
    }
    std::string mask = FilterMask(Pattern(), Extension());
    XmString dirString = make_string(dir);
    XmString maskString = make_string(dir + "/" + mask);
    XmString titleString = make_string(title);
    XtVaSetValues(browser, XmNdirectory, dirString, XmNdirMask, maskString, XmNdialogTitle,
                  titleString, nullptr);
    XmStringFree(dirString);
    XmStringFree(maskString);
    XmStringFree(titleString);
    XmFileSelectionDoSearch(browser, nullptr);
    if (!remembered.name.empty()) {
        Widget text = XmFileSelectionBoxGetChild(browser, XmDIALOG_TEXT);
        std::string last = dir + "/" + remembered.name;
        XmTextFieldSetString(text, const_cast<char*>(last.c_str()));
    }
    answer_ = -1;
    chosen_.clear();
    waiting_ = true;
    XtManageChild(browser);
    KLXmGnome::ProcessUntil([this] { return answer_ >= 0; });
    waiting_ = false;
    XtUnmanageChild(browser);
    if (answer_ != 1 || chosen_.empty())
        return "";
    remembered.directory = directory_of(chosen_);
    remembered.name = base_of(chosen_);
    return chosen_;
}

bool KLFileManager::check_retrievable(const std::string& path) {
    struct stat st;
    if (stat(path.c_str(), &st) != 0) {
        alert_->Notify(KLFmt("Can't find the %s file %s.", FileTypeName(), path.c_str()).c_str(),
                       "Dismiss");
        return false;
    }
    if (S_ISDIR(st.st_mode)) {
        alert_->Notify(
            KLFmt("%s is a folder; choose a %s file.", path.c_str(), FileTypeName()).c_str(),
            "Dismiss");
        return false;
    }
    return true;
}

int KLFileManager::Retrieve() {
    if (OverrideRetrieve())
        return RetrieveFile(nullptr);
    std::string title = std::string("Open ") + FileTypeName();
    std::string path = choose(title.c_str());
    if (path.empty() || !check_retrievable(path))
        return -1;
    return RetrieveFile(path.c_str());
}

int KLFileManager::StoreAs(int askOverwrite) {
    std::string title = std::string("Save ") + FileTypeName() + " As";
    for (;;) {
        std::string path = choose(title.c_str());
        if (path.empty())
            return -1;
        struct stat st;
        if (stat(path.c_str(), &st) == 0) {
            if (S_ISDIR(st.st_mode)) {
                alert_->Notify(
                    KLFmt("%s is a folder; give the %s a file name.", path.c_str(), FileTypeName())
                        .c_str(),
                    "Dismiss");
                continue;
            }
            if (askOverwrite &&
                !alert_->Confirm(KLFmt("%s already exists. Replace it?", path.c_str()).c_str(),
                                 "Replace", "Cancel"))
                continue;
        }
        return StoreFile(path.c_str());
    }
}

void KLFileManager::answer_cb(Widget, XtPointer clientData, XtPointer callData) {
    auto* manager = static_cast<KLFileManager*>(clientData);
    auto* cbs = static_cast<XmFileSelectionBoxCallbackStruct*>(callData);
    if (cbs->reason == XmCR_OK) {
        char* text = nullptr;
        XmStringGetLtoR(cbs->value, const_cast<char*>(XmFONTLIST_DEFAULT_TAG), &text);
        manager->chosen_ = text ? text : "";
        XtFree(text);
        // An empty name or a name ending in "/" is no choice: keep the browser up.
        if (manager->chosen_.empty() || manager->chosen_.back() == '/')
            return;
        manager->answer_ = 1;
    } else {
        manager->answer_ = 0;
    }
}

void KLFileManager::search_proc(Widget browser, XtPointer searchData) {
    XtPointer self = nullptr;
    XtVaGetValues(browser, XmNuserData, &self, nullptr);
    auto* manager = static_cast<KLFileManager*>(self);
    if (!manager || !manager->defaultSearch_)
        return;
    manager->defaultSearch_(browser, searchData);
    if (!manager->DoPostFilter())
        return;
    XmStringTable items = nullptr;
    int count = 0;
    XtVaGetValues(browser, XmNfileListItems, &items, XmNfileListItemCount, &count, nullptr);
    std::vector<std::string> names(count);
    std::vector<char*> pointers(count);
    for (int i = 0; i < count; i++) {
        char* text = nullptr;
        XmStringGetLtoR(items[i], const_cast<char*>(XmFONTLIST_DEFAULT_TAG), &text);
        names[i] = text ? text : "";
        XtFree(text);
        pointers[i] = names[i].data();
    }
    int kept = std::clamp(manager->FilterFileList(count, pointers.data()), 0, count);
    std::vector<XmString> filtered(kept);
    for (int i = 0; i < kept; i++)
        filtered[i] = XmStringCreateLocalized(pointers[i]);
    XtVaSetValues(browser, XmNfileListItems, filtered.data(), XmNfileListItemCount, kept,
                  XmNlistUpdated, True, nullptr);
    for (XmString x : filtered)
        XmStringFree(x);
}

void KLFileManager::close_cb(Widget, XtPointer clientData, XtPointer) {
    auto* manager = static_cast<KLFileManager*>(clientData);
    if (manager->waiting_)
        manager->answer_ = 0;
}
