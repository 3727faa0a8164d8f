#include "appliance/recycle/CommandLine.h"

#include <absl/time/time.h>

#include <algorithm>
#include <charconv>
#include <limits>
#include <set>
#include <string_view>
#include <utility>

#include "appliance/recycle/ByteText.h"
#include "appliance/util/Text.h"

namespace orva {
namespace {

constexpr std::string_view kExtensions = "-file_ext=";
constexpr std::string_view kRoot = "--root";

constexpr const char* kHelp =
    R"(Usage: orvarecycle --enable  [SHARE...]
       orvarecycle --disable [SHARE...]
       orvarecycle --clean   [RULE...] [SHARE...]

Switches the recycle bins of shared folders on or off, or removes what is in them. Without SHARE:
all shares; for --clean, all that have a bin.

What a clean removes (without -t and -s: everything that no other rule keeps)
  -t DAYS            what has been in the bin for more than DAYS days
  -s BYTES           files until the bin holds at most BYTES; not together with -t
  -o 1 | -o 2        with -s: oldest first (as without -o) | largest first
What it keeps
  -file_ext="A.B"    files with one of these extensions; upper and lower case are the same
  -m BYTES           files larger than BYTES
  -l BYTES           files smaller than BYTES
How
  --dry-run          remove nothing; list what would go, and why each other file stays
  --at INSTANT       with --dry-run: as if it were INSTANT (UTC, such as 2027-01-31T12:00:00Z)
  --json             with --dry-run: report as one JSON document
  --root DIR         use the appliance below DIR (otherwise the environment's ORVA_ROOT, or /);
                     stands before the action, but for --dry-run
  --                 only names of shares follow, at least one
  --help             show this text

Exit status: 0 done, 1 something could not be done (it is named), 2 the command line is wrong
and nothing was touched.
)";

std::optional<std::uint64_t> ParseNumber(std::string_view text) {
    std::uint64_t number = 0;
    const char* end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, number);
    if (error != std::errc() || stop != end) {
        return std::nullopt;
    }
    return number;
}

// Tasks carry sizes from 2048 to 4095 MB as a negative 32-bit count widened to 64 bits. No disk
// holds that many bytes, so such a count can only mean its low 32 bits.
std::uint64_t MeantBytes(std::uint64_t bytes) {
    constexpr std::uint64_t kLow32Bits = std::numeric_limits<std::uint32_t>::max();
    constexpr std::uint64_t kFirstWidened = ~std::uint64_t{0} - (std::uint64_t{1} << 31) + 1;
    return bytes >= kFirstWidened ? bytes & kLow32Bits : bytes;
}

std::vector<std::string> ParseExtensions(std::string_view list) {
    std::vector<std::string> extensions;
    while (!list.empty()) {
        const std::size_t dot = std::min(list.find('.'), list.size());
        std::string extension(TrimBlanks(list.substr(0, dot)));
        for (char& byte : extension) {
            byte = byte >= 'A' && byte <= 'Z' ? static_cast<char>(byte - 'A' + 'a') : byte;
        }
        if (!extension.empty()) {
            extensions.push_back(std::move(extension));
        }
        list.remove_prefix(std::min(dot + 1, list.size()));
    }
    return extensions;
}

bool HasForm(std::string_view text, std::string_view form) {
    return std::equal(text.begin(), text.end(), form.begin(), form.end(), [](char byte, char want) {
        return want == '0' ? byte >= '0' && byte <= '9' : byte == want;
    });
}

std::optional<FileTime> ParseInstant(std::string_view text) {
    if (!HasForm(text, "0000-00-00T00:00:00Z")) {
        return std::nullopt;
    }
    absl::Time instant;
    std::string ignored;
    if (!absl::ParseTime("%Y-%m-%dT%H:%M:%SZ", {text.data(), text.size()}, &instant, &ignored)) {
        return std::nullopt;
    }
    return ToFileTime(absl::ToUnixSeconds(instant), 0);
}

class Parser {
  public:
    explicit Parser(std::span<const char* const> arguments) : rest(arguments) {}

    ParsedCommandLine Parse() {
        while (error.empty() && !rest.empty()) {
            const std::string argument = rest.front();
            rest = rest.subspan(1);
            if (onlyShares) {
                noShareFollows = false;
                dashedName = dashedName || argument.starts_with('-');
                AddShare(argument);
            } else if (!argument.starts_with('-')) {
                AddShare(argument);
            } else if (argument == "--") {
                onlyShares = true;
                noShareFollows = true;
            } else {
                ParseSwitch(argument);
            }
        }
        if (error.empty() && !help) {
            CheckTogether();
        }
        ParsedCommandLine parsed;
        if (!error.empty()) {
            parsed.error = error;
            return parsed;
        }
        if (help) {
            command = RecycleCommand();
        }
        parsed.command = std::move(command);
        return parsed;
    }

  private:
    void AddShare(const std::string& name) {
        if (std::find(command.shares.begin(), command.shares.end(), name) == command.shares.end()) {
            command.shares.push_back(name);
        }
    }

    void ParseSwitch(const std::string& argument) {
        const bool extensions = argument.starts_with(kExtensions);
        const bool rootInside = argument.starts_with(std::string(kRoot) + "=");
        const std::string name(extensions   ? kExtensions.substr(0, kExtensions.size() - 1)
                               : rootInside ? kRoot
                                            : std::string_view(argument));
        if (name == "--help") {
            help = true;
        } else if (name == "--enable") {
            TakeAction(name, RecycleAction::kEnable);
        } else if (name == "--disable") {
            TakeAction(name, RecycleAction::kDisable);
        } else if (name == "--clean") {
            TakeAction(name, RecycleAction::kClean);
        } else if (!given.insert(name).second) {
            error = name + " is given twice";
        } else if (extensions) {
            command.rules.keepExtensions = ParseExtensions(argument.substr(kExtensions.size()));
            if (command.rules.keepExtensions.empty()) {
                error = "-file_ext= names no extension";
            }
        } else if (name == "-t") {
            command.rules.days = TakeNumber(name, "a number of days");
        } else if (name == "-s") {
            command.rules.sizeLimit = TakeBytes(name);
        } else if (name == "-m") {
            command.rules.keepLarger = TakeBytes(name);
        } else if (name == "-l") {
            command.rules.keepSmaller = TakeBytes(name);
        } else if (name == "-o") {
            TakeOrder();
        } else if (name == "--dry-run") {
            command.preview = true;
        } else if (name == "--json") {
            command.json = true;
        } else if (name == "--at") {
            TakeInstant();
        } else if (name == kRoot) {
            TakeRoot(rootInside ? std::optional(argument.substr(kRoot.size() + 1)) : std::nullopt);
        } else {
            given.erase(name);
            error = "unknown switch " + QuoteForTerminal(argument);
        }
    }

    void TakeAction(const std::string& name, RecycleAction action) {
        if (!actionName.empty()) {
            error = actionName == name ? name + " is given twice"
                                       : name + " cannot be combined with " + actionName;
        }
        actionName = name;
        command.action = action;
    }

    // The next argument; the switch lacks its value when there is none.
    std::optional<std::string> TakeValue() {
        if (rest.empty()) {
            return std::nullopt;
        }
        std::string value = rest.front();
        rest = rest.subspan(1);
        return value;
    }

    std::optional<std::uint64_t> TakeNumber(const std::string& name, const char* what) {
        const std::optional<std::string> value = TakeValue();
        const std::optional<std::uint64_t> number = value ? ParseNumber(*value) : std::nullopt;
        if (!number) {
            error = name + " needs " + what;
            error += value ? ", not " + QuoteForTerminal(*value) : std::string();
        }
        return number;
    }

    std::optional<std::uint64_t> TakeBytes(const std::string& name) {
        const std::optional<std::uint64_t> number = TakeNumber(name, "a number of bytes");
        return number ? std::optional(MeantBytes(*number)) : std::nullopt;
    }

    void TakeOrder() {
        const std::optional<std::string> value = TakeValue();
        if (value == "1") {
            command.rules.order = SizeOrder::kOldestFirst;
        } else if (value == "2") {
            command.rules.order = SizeOrder::kLargestFirst;
        } else {
            error = "-o needs 1 (oldest first) or 2 (largest first)";
        }
    }

    void TakeInstant() {
        const std::optional<std::string> value = TakeValue();
        command.at = value ? ParseInstant(*value) : std::nullopt;
        if (!command.at) {
            error = "--at needs an instant in UTC, such as 2027-01-31T12:00:00Z";
        }
    }

    void TakeRoot(std::optional<std::string> inside) {
        lateRoot = !actionName.empty();
        command.root = inside ? std::move(inside) : TakeValue();
        if (!command.root || command.root->empty()) {
            error = "--root needs a directory";
        }
    }

    void CheckTogether() {
        if (actionName.empty()) {
            error = "one of --enable, --disable and --clean is needed";
        } else if (command.action != RecycleAction::kClean) {
            for (const std::string& name : given) {
                if (name != kRoot) {
                    error = name + " goes with --clean only";
                    return;
                }
            }
            CheckSelection();
        } else if (given.contains("-t") && given.contains("-s")) {
            error = "-t and -s cannot be combined";
        } else if (given.contains("-o") && !given.contains("-s")) {
            error = "-o goes with -s only";
        } else if (command.at && !command.preview) {
            error = "--at goes with --dry-run only";
        } else if (command.json && !command.preview) {
            error = "--json goes with --dry-run only";
        } else if (!command.preview) {
            CheckSelection();
        }
    }

    // Tasks hand over the names of the chosen shares as they are, after the action and before the
    // rules. One that reads as a switch must neither turn the selection into all shares, here or
    // below another root, nor the rules after it into names.
    void CheckSelection() {
        if (lateRoot) {
            error = "--root stands before " + actionName;
        } else if (noShareFollows) {
            error = "-- needs the name of a share";
        } else if (dashedName) {
            error = "no share's name begins with a dash";
        }
    }

    std::span<const char* const> rest;
    RecycleCommand command;
    std::string actionName;
    std::set<std::string> given;
    std::string error;
    bool onlyShares = false;
    bool noShareFollows = false;
    bool dashedName = false;
    bool lateRoot = false;
    bool help = false;
};

}  // namespace

ParsedCommandLine ParseCommandLine(std::span<const char* const> arguments) {
    return Parser(arguments).Parse();
}

const char* RecycleHelp() { return kHelp; }

}  // namespace orva
