#include "tests/fakes/RecordingPlatform.h"

#include <gtest/gtest.h>
#include <json/reader.h>
#include <json/writer.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <stdexcept>
#include <utility>

namespace fakes {
namespace {

RecordingPlatform* current = nullptr;

}  // namespace

std::string Task::ToText() const {
    const auto flag = [](const char* word, bool value) {
        return std::string(", ") + word + "=" + (value ? "1" : "0");
    };
    return "id=" + std::to_string(id) + ", name=" + Quoted(name) + ", owner=" + Quoted(owner) +
           flag("enabled", enabled) + ", app=" + Quoted(app) + ", appName=" + Quoted(appName) +
           ", appArgs=" + Quoted(appArgs) + ", action=" + Quoted(action) +
           ", command=" + Quoted(command) + ", editForm=" + Quoted(editForm) +
           ", nextTriggerTime=" + Quoted(nextTriggerTime) + flag("simpleEditForm", simpleEditForm) +
           flag("canEditName", canEditName) + flag("canEditOwner", canEditOwner) +
           flag("canRunTaskSameTime", canRunTaskSameTime) +
           flag("canRunAppSameTime", canRunAppSameTime) + flag("listable", listable) +
           flag("canRunFromUI", canRunFromUI) + flag("canEditFromUI", canEditFromUI) +
           flag("canDeleteFromUI", canDeleteFromUI) + flag("isNew", isNew) +
           ", schedule=" + Compact(schedule);
}

RecordingPlatform::RecordingPlatform() {
    if (current != nullptr) {
        std::abort();
    }
    current = this;
}

RecordingPlatform::~RecordingPlatform() { current = nullptr; }

RecordingPlatform& RecordingPlatform::Current() {
    if (current == nullptr) {
        std::fputs("a platform call outside a test's recording platform\n", stderr);
        std::abort();
    }
    return *current;
}

bool RecordingPlatform::Exists() { return current != nullptr; }

Task& RecordingPlatform::AddTask(Task task) {
    task.isNew = false;
    const int id = task.id;
    return tasks.insert_or_assign(id, std::move(task)).first->second;
}

void RecordingPlatform::FailCall(const std::string& function, int n, LastError error,
                                 int systemError) {
    armed.push_back({function, n, n == 0, std::move(error), systemError, nullptr});
}

void RecordingPlatform::ThrowFrom(const std::string& function, std::function<void()> raise, int n) {
    armed.push_back({function, n, n == 0, {}, 0, std::move(raise)});
}

void RecordingPlatform::ThrowFrom(const std::string& function, int n) {
    ThrowFrom(
        function, [] { throw std::runtime_error("injected"); }, n);
}

bool RecordingPlatform::Enter(const std::string& function, const std::string& arguments,
                              Kind kind) {
    Write(kind, function + "(" + arguments + ")");
    ++calls[function];
    for (auto at = armed.begin(); at != armed.end(); ++at) {
        if (at->function != function || (!at->everyCall && --at->callsUntil > 0)) {
            continue;
        }
        const Armed now = *at;
        if (!now.everyCall) {
            armed.erase(at);
        }
        if (now.raise) {
            now.raise();
        }
        lastError = now.error;
        errno = now.systemError;
        return true;
    }
    return false;
}

bool RecordingPlatform::IsArmed(const std::string& function) const {
    for (const Armed& each : armed) {
        if (each.function == function) {
            return true;
        }
    }
    return false;
}

void RecordingPlatform::Write(Kind kind, const std::string& line) {
    journal.push_back({kind, line});
}

std::vector<std::string> RecordingPlatform::Lines(std::initializer_list<Kind> kinds) const {
    std::vector<std::string> lines;
    for (const Entry& entry : journal) {
        if (std::find(kinds.begin(), kinds.end(), entry.kind) != kinds.end()) {
            lines.push_back(entry.line);
        }
    }
    return lines;
}

std::vector<std::string> RecordingPlatform::Journal() const {
    return Lines({Kind::kCall, Kind::kLog});
}

std::vector<std::string> RecordingPlatform::TextsJournal() const { return Lines({Kind::kTexts}); }

std::vector<std::string> RecordingPlatform::FullJournal() const {
    return Lines({Kind::kCall, Kind::kReader, Kind::kTexts, Kind::kLog});
}

std::vector<std::string> RecordingPlatform::Log() const {
    std::vector<std::string> lines = Lines({Kind::kLog});
    for (std::string& line : lines) {
        line.erase(0, line.find(' ') + 1);
    }
    return lines;
}

int RecordingPlatform::Calls(const std::string& function) const {
    const auto found = calls.find(function);
    return found == calls.end() ? 0 : found->second;
}

void RecordingPlatform::ClearJournal() {
    journal.clear();
    calls.clear();
}

std::string RecordingPlatform::Leftovers() const {
    const std::array<std::pair<const Handles*, const char*>, 4> kinds{{
        {&records, "record(s)"},
        {&lists, "list(s)"},
        {&stringLists, "string list(s)"},
        {&hashes, "hash(es)"},
    }};
    std::string text;
    for (const auto& [handles, what] : kinds) {
        if (handles->live.empty()) {
            continue;
        }
        const std::size_t count = handles->live.size();
        text += (text.empty() ? "" : ", ") + std::to_string(count) + " " + what;
    }
    return text;
}

int RecordingPlatform::Handles::Add(const void* handle) {
    live[handle] = ++created;
    return created;
}

std::string RecordingPlatform::Handles::Name(const void* handle) const {
    if (handle == nullptr) {
        return "null";
    }
    const auto found = live.find(handle);
    return found == live.end() ? "(freed)" : "#" + std::to_string(found->second);
}

bool RecordingPlatform::Handles::Remove(const void* handle) { return live.erase(handle) == 1; }

std::string RecordingPlatform::RecordName(const void* record) const {
    if (listElements.live.contains(record)) {
        return "list" + listElements.Name(record);
    }
    return records.Name(record);
}

std::string Quoted(const std::string& text) {
    std::string quoted = "\"";
    for (const char each : text) {
        switch (each) {
            case '"':
            case '\\':
                quoted += '\\';
                quoted += each;
                break;
            case '\n':
                quoted += "\\n";
                break;
            case '\t':
                quoted += "\\t";
                break;
            default:
                if (static_cast<unsigned char>(each) < 0x20) {
                    std::array<char, 8> code{};
                    std::snprintf(code.data(), code.size(), "\\x%02X",
                                  static_cast<unsigned int>(each));
                    quoted += code.data();
                } else {
                    quoted += each;
                }
        }
    }
    return quoted + "\"";
}

std::string Quoted(const char* text) {
    return text == nullptr ? "null" : Quoted(std::string(text));
}

std::string Compact(const Json::Value& value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = true;
    return Json::writeString(builder, value);
}

Json::Value Document(const std::string& text) {
    Json::CharReaderBuilder builder;
    builder["failIfExtra"] = true;
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    Json::Value value;
    std::string errors;
    EXPECT_TRUE(reader->parse(text.data(), text.data() + text.size(), &value, &errors))
        << text << ": " << errors;
    return value;
}

}  // namespace fakes
