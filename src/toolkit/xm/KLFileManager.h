#pragma once

#include <memory>
#include <string>

#include <X11/Intrinsic.h>

class KLAlert;

// The file browser of one kind of file. A derived manager names the kind, its directory and
// its name filter and says what retrieving and storing a chosen file does; this base runs the
// browser (a modal file selection dialog), remembers the last directory and name per kind for
// the whole run, refuses folders and missing files, and asks before storing over a file.
class KLFileManager {
  public:
    explicit KLFileManager(Widget parent);
    virtual ~KLFileManager();
    KLFileManager(const KLFileManager&) = delete;
    KLFileManager& operator=(const KLFileManager&) = delete;

    // What a chosen file does; 1 success, 0 failure.
    virtual int RetrieveFile(const char* name) = 0;
    virtual int StoreFile(const char* name) = 0;
    virtual const char* DefaultDirectory() = 0;
    virtual const char* FileTypeName() = 0;
    // Name filter: a pattern ("*.aif[cf]") or an extension without its point; null for none.
    virtual const char* Pattern() { return nullptr; }
    virtual const char* Extension() { return nullptr; }
    // Nonzero: Retrieve calls RetrieveFile(null) without showing the browser.
    virtual int OverrideRetrieve() { return 0; }
    // Keeps the names to list (compacting `names`); the number kept. Used when DoPostFilter.
    virtual int FilterFileList(int count, char** names) { return (void)names, count; }
    virtual int DoPostFilter() { return 0; }

    // Binds Retrieve / StoreAs(1) to a callback list of a widget (a menu item's activate).
    void InstallRetrieveCallback(Widget widget, const char* callbackName);
    void InstallStoreAsCallback(Widget widget, const char* callbackName);

    // Shows the browser for opening: the result of RetrieveFile, or -1 when cancelled or no
    // usable file was chosen.
    int Retrieve();
    // Shows the browser for storing under a new name: the result of StoreFile, or -1 when
    // cancelled. With `askOverwrite`, storing over an existing file asks first.
    int StoreAs(int askOverwrite);
    // Forgets the remembered directory of this kind: the next browser starts in
    // DefaultDirectory (after a project change).
    void ResetDirectory();

    // The browser's name filter for a pattern or an extension ("*" for neither).
    static std::string FilterMask(const char* pattern, const char* extension);
    // The remembered directory and name of this kind (empty before the first choice).
    std::string LastDirectory();
    std::string LastName();

    // The browser (made on first use) and whether it is waiting for an answer, for tests.
    Widget Browser();
    bool Waiting() const { return waiting_; }

  private:
    // Runs the browser titled `title`; the chosen path, or empty when cancelled.
    std::string choose(const char* title);
    // Whether `path` may be opened: a message and false for a folder or a missing file.
    bool check_retrievable(const std::string& path);
    static void retrieve_cb(Widget, XtPointer clientData, XtPointer);
    static void store_cb(Widget, XtPointer clientData, XtPointer);
    static void answer_cb(Widget, XtPointer clientData, XtPointer callData);
    static void close_cb(Widget, XtPointer clientData, XtPointer);
    // The browser's file search: Motif's own, then FilterFileList when DoPostFilter.
    static void search_proc(Widget browser, XtPointer searchData);

    Widget parent_;
    Widget browser_ = nullptr;
    void (*defaultSearch_)(Widget, XtPointer) = nullptr;  // Motif's search, run first
    std::unique_ptr<KLAlert> alert_;
    std::string chosen_;
    int answer_ = -1;
    bool waiting_ = false;
};
