// A platform for the module's unit tests: every declaration of platform/ acts on the values that a
// test set here, and every call and log line goes into one journal, in order.
#pragma once

#include <json/value.h>

#include <functional>
#include <initializer_list>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "platform/package.h"
#include "platform/schedtask.h"

namespace fakes {

// What the fake store knows of one task. The defaults are those of a new record.
struct Task {
    int id = -1;
    std::string name;
    std::string owner = "admin";
    bool enabled = true;
    std::string app;
    std::string appName;
    std::string appArgs;
    std::string action;
    std::string command;
    std::string editForm;
    std::string nextTriggerTime = "N/A";
    bool simpleEditForm = false;
    bool canEditName = true;
    bool canEditOwner = false;
    bool canRunTaskSameTime = false;
    bool canRunAppSameTime = false;
    bool listable = true;
    bool canRunFromUI = true;
    bool canEditFromUI = true;
    bool canDeleteFromUI = true;
    bool isNew = true;
    // Written as "schedule" by the converter; read into the record as it comes.
    Json::Value schedule{Json::objectValue};
    // When not null, written as "basic" in place of what the properties say.
    Json::Value basic;

    // Every property on one line, in the order above from `name` to `schedule`.
    std::string ToText() const;

    bool operator==(const Task&) const = default;
};

struct LastError {
    int code;
    std::string file;
    int line;
};

class RecordingPlatform {
  public:
    // The platform that the module's calls reach; there is one at a time, from its construction to
    // its destruction. A call while there is none aborts.
    RecordingPlatform();
    ~RecordingPlatform();
    RecordingPlatform(const RecordingPlatform&) = delete;
    RecordingPlatform& operator=(const RecordingPlatform&) = delete;
    static RecordingPlatform& Current();
    static bool Exists();

    // --- What the platform holds ---
    std::map<int, Task> tasks;  // by id
    int nextId = 100;           // of the next new task
    std::vector<std::string> shares;
    // By package id. An id in `damagedPackages` is enumerated but cannot be read.
    std::map<std::string, ORVAPackageTool::PackageInfo> packages;
    std::set<std::string> damagedPackages;
    std::map<std::string, std::string> configuration;
    Json::Value appTexts{Json::objectValue};   // application id -> relative directory
    std::map<std::string, Json::Value> texts;  // absolute directory -> document
    LastError lastError{0, "", 0};
    // What functions that report nothing but success return for it.
    int success = 0;

    // Stores a task under `task.id`, as no longer new, and gives it back for further changes.
    Task& AddTask(Task task);

    // --- What the platform refuses ---
    // The n-th call (1 is the first) of the named function from now on fails and leaves `error` as
    // the last error; n == 0 fails every call. `calloc` can be named too. `systemError` is put into
    // errno. For a failing bool reader or a converter, failure is false, for a text "".
    void FailCall(const std::string& function, int n = 1,
                  LastError error = {0x0900, "platform.cpp", 42}, int systemError = 0);
    // A failed ORVASchedTaskListGet leaves a list behind all the same.
    bool listOfFailedGet = false;
    // QLIBCEncShParam succeeds but writes nothing.
    bool emptyShellWord = false;
    // The n-th call of the named function from now on throws what `raise` throws.
    void ThrowFrom(const std::string& function, std::function<void()> raise, int n = 1);
    // std::runtime_error("injected").
    void ThrowFrom(const std::string& function, int n = 1);

    // --- What was done ---
    // One line a call or log line: `ORVASchedTaskLoad(5, #1)`, `LOG_ERR main.cpp:95 ...`. Records
    // are numbered in the order in which they were allocated (#1), elements of lists likewise
    // (list#1). Without the
    // readers of records, lists and hashes and without the loading of texts and configuration.
    std::vector<std::string> Journal() const;
    // Only what reads texts and configuration.
    std::vector<std::string> TextsJournal() const;
    // Everything.
    std::vector<std::string> FullJournal() const;
    // Only the log lines, without the priority.
    std::vector<std::string> Log() const;
    // How often the named function was called, readers included.
    int Calls(const std::string& function) const;
    void ClearJournal();

    // What has not been freed, as text: "" or for example "1 record(s), 2 list(s)".
    std::string Leftovers() const;

    // --- For the fake functions ---
    enum class Kind { kCall, kReader, kTexts, kLog };
    // Journals the call; true when it has to fail. May throw.
    bool Enter(const std::string& function, const std::string& arguments, Kind kind = Kind::kCall);
    // Whether a failure or an exception is armed for the function.
    bool IsArmed(const std::string& function) const;
    void Write(Kind kind, const std::string& line);

    // Handles that are alive, each with its number in order of creation.
    struct Handles {
        std::map<const void*, int> live;
        int created = 0;
        int Add(const void* handle);
        // "#3", "null", or "(freed)" for what is not alive.
        std::string Name(const void* handle) const;
        bool Remove(const void* handle);
    };
    Handles records;       // of ORVASchedTaskAlloc
    Handles listElements;  // of ORVASchedTaskListGet, numbered on their own
    Handles lists;         // by their first element
    Handles stringLists;
    Handles hashes;
    // "#2" for a record, "list#2" for an element of a list, "null", "(freed)".
    std::string RecordName(const void* record) const;

  private:
    struct Armed {
        std::string function;
        int callsUntil;
        bool everyCall;
        LastError error;
        int systemError;
        std::function<void()> raise;  // empty: the call fails
    };
    struct Entry {
        Kind kind;
        std::string line;
    };
    std::vector<std::string> Lines(std::initializer_list<Kind> kinds) const;

    std::vector<Armed> armed;
    std::vector<Entry> journal;
    std::map<std::string, int> calls;
};

// "text" with quotes; quotes, backslashes and control characters escaped.
std::string Quoted(const std::string& text);
std::string Quoted(const char* text);  // null: null

// Compact JSON text without a final newline.
std::string Compact(const Json::Value& value);

// The document that `text` says; a test failure when it is not JSON.
Json::Value Document(const std::string& text);

}  // namespace fakes
