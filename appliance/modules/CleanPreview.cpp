#include "appliance/modules/CleanPreview.h"

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdint>
#include <cstring>
#include <limits>
#include <optional>
#include <string>
#include <vector>

#include "appliance/modules/PreviewReader.h"
#include "appliance/modules/ProgramLines.h"
#include "appliance/root/Root.h"

namespace orva {
namespace {

constexpr const char* kCleaner = "/usr/orva/bin/orvarecycle";
constexpr std::chrono::seconds kLimit{30};
// Longer than any path that a file server makes, in JSON's form.
constexpr std::size_t kLongestLine = std::size_t{256} * 1024;
// Each reads whole bins; more at once would only slow one another down.
constexpr int kMostAtOnce = 2;

constexpr std::size_t kMostShares = 1000;
constexpr std::size_t kMostExtensions = 100;
constexpr std::size_t kLongestExtension = 100;
constexpr std::int64_t kMostDays = 1'000'000;
constexpr std::int64_t kMostBytes = std::numeric_limits<std::int64_t>::max();

// The cleaner's exit statuses after which its document tells what there is to know.
constexpr int kDone = 0;
constexpr int kDoneInPart = 1;

// A task hands its extensions over in a shell's double quotes: with these the command would say
// something else.
bool BreaksCommand(const std::string& extension) {
    return std::any_of(extension.begin(), extension.end(), [](char character) {
        const auto byte = static_cast<unsigned char>(character);
        return byte < 0x20 || byte == 0x7f || std::strchr("\"$`\\", character) != nullptr;
    });
}

void AddNumber(std::vector<std::string>& arguments, const char* option,
               const std::optional<std::int64_t>& number) {
    if (number) {
        arguments.insert(arguments.end(), {option, std::to_string(*number)});
    }
}

void AddOrder(std::vector<std::string>& arguments, const Parameters& parameters) {
    const std::optional<std::string> order = parameters.Text("order");
    if (!order) {
        return;
    }
    if (*order != "oldest" && *order != "largest") {
        RefuseParameter("order", "is neither oldest nor largest");
    }
    arguments.insert(arguments.end(), {"-o", *order == "oldest" ? "1" : "2"});
}

void AddExtensions(std::vector<std::string>& arguments, const Parameters& parameters) {
    const std::vector<std::string> extensions = parameters.Texts("extensions", kMostExtensions);
    std::string list;
    for (const std::string& extension : extensions) {
        if (extension.size() > kLongestExtension) {
            RefuseParameter("extensions", "holds a text of more than " +
                                              std::to_string(kLongestExtension) + " bytes");
        }
        if (BreaksCommand(extension)) {
            RefuseParameter("extensions",
                            "holds a quote, $, `, \\ or a control character, which the command of "
                            "a task cannot carry");
        }
        list += extension + ".";
    }
    if (extensions.empty()) {
        return;
    }
    if (list.find_first_not_of(". ") == std::string::npos) {
        RefuseParameter("extensions", "names no extension");
    }
    arguments.push_back("-file_ext=" + list);
}

std::vector<std::string> CleanerArguments(const Parameters& parameters) {
    std::vector<std::string> arguments = {
        ResolvePath(kCleaner), "--clean", "--dry-run", "--json", "--root", Root()};
    const auto days = parameters.Integer("days", 0, kMostDays);
    const auto bytes = parameters.Integer("bytes", 0, kMostBytes);
    if (days && bytes) {
        RefuseParameter("bytes", "cannot be combined with days");
    }
    AddNumber(arguments, "-t", days);
    AddNumber(arguments, "-s", bytes);
    if (bytes) {
        AddOrder(arguments, parameters);
    }
    AddExtensions(arguments, parameters);
    AddNumber(arguments, "-m", parameters.Integer("keep_larger", 0, kMostBytes));
    AddNumber(arguments, "-l", parameters.Integer("keep_smaller", 0, kMostBytes));
    arguments.emplace_back("--");
    for (const std::string& share : parameters.Texts("shares", kMostShares)) {
        if (share.empty()) {
            RefuseParameter("shares", "holds something that is no name of a share");
        }
        arguments.push_back(share);
    }
    return arguments;
}

// One of the few previews that may go on at once.
class Turn {
  public:
    Turn() {
        if (going.fetch_add(1) >= kMostAtOnce) {
            going.fetch_sub(1);
            throw ApiFailure(ModuleError::kPreviewFailed,
                             "other previews are going on; try again shortly");
        }
    }
    ~Turn() { going.fetch_sub(1); }
    Turn(const Turn&) = delete;
    Turn& operator=(const Turn&) = delete;

  private:
    static inline std::atomic<int> going = 0;
};

}  // namespace

Json::Value CleanPreview(const Parameters& parameters) {
    const std::vector<std::string> arguments = CleanerArguments(parameters);
    const Turn turn;
    PreviewReader reader;
    const ProgramEnd end =
        ReadProgramLines(arguments, kLimit, kLongestLine,
                         [&reader](std::string_view line) { reader.TakeLine(line); });
    switch (end.kind) {
        case ProgramEnd::Kind::kExited:
            if (end.number != kDone && end.number != kDoneInPart) {
                throw ApiFailure(ModuleError::kPreviewFailed,
                                 "the cleaner refused its rules (exit status " +
                                     std::to_string(end.number) + ")");
            }
            break;
        case ProgramEnd::Kind::kSignalled:
            throw ApiFailure(ModuleError::kPreviewFailed,
                             "the cleaner was ended by signal " + std::to_string(end.number));
        case ProgramEnd::Kind::kNotStarted:
            throw ApiFailure(
                ModuleError::kPreviewFailed,
                arguments.front() + " cannot be started: " + std::strerror(end.number));
        case ProgramEnd::Kind::kTimedOut:
            reader.AddProblem("the preview was ended after " + std::to_string(kLimit.count()) +
                              " seconds; there is more");
            break;
    }
    return reader.Answer();
}

}  // namespace orva
