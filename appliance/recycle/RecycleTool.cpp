#include "appliance/recycle/RecycleTool.h"

#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "appliance/recycle/BinCleaner.h"
#include "appliance/recycle/BinOpener.h"
#include "appliance/recycle/ByteText.h"
#include "appliance/recycle/CleanReport.h"
#include "appliance/recycle/CommandLine.h"
#include "appliance/root/Root.h"
#include "appliance/share/ShareRegistry.h"
#include "appliance/util/Error.h"
#include "platform/share.h"

namespace orva {
namespace {

constexpr int kDone = 0;
constexpr int kIncomplete = 1;
constexpr int kUsage = 2;

const char* ReasonOfLastError() {
    switch (QLIBCErrGet()) {
        case kErrNotFound:
            return "there is no such share, or its folder is missing";
        case kErrNotAllowed:
            return "a link or a file stands in the place of the recycle bin or the share's folder";
        case kErrBadDocument:
            return "the registry of shares is damaged";
        default:
            return "the registry of shares or the share's folder cannot be used";
    }
}

// The named shares, or all; a share without a folder is one that the registry does not know.
struct ChosenShare {
    std::string name;
    std::optional<std::string> directory;
};

std::optional<std::vector<ChosenShare>> ChooseShares(const std::vector<std::string>& names) {
    const std::optional<std::vector<Share>> known = ShareRegistry().List();
    if (!known) {
        return std::nullopt;
    }
    std::vector<ChosenShare> chosen;
    if (names.empty()) {
        for (const Share& share : *known) {
            chosen.push_back({share.name, ResolvePath(share.path)});
        }
    }
    for (const std::string& name : names) {
        chosen.push_back({name, std::nullopt});
        for (const Share& share : *known) {
            if (share.name == name) {
                chosen.back().directory = ResolvePath(share.path);
            }
        }
    }
    return chosen;
}

int SwitchBins(const std::vector<ChosenShare>& shares, bool enable, std::FILE* out,
               std::FILE* err) {
    int status = kDone;
    for (const ChosenShare& share : shares) {
        const std::string name = QuoteIfNeeded(share.name);
        if (!share.directory) {
            std::fprintf(err, "orvarecycle: %s: there is no such share\n", name.c_str());
            status = kIncomplete;
        } else if (ORVARecycleStatusSet(share.name.c_str(), enable ? 1 : 0) < 0) {
            std::fprintf(err, "orvarecycle: %s: %s\n", name.c_str(), ReasonOfLastError());
            status = kIncomplete;
        } else {
            std::fprintf(out, "%s: recycle bin %s\n", name.c_str(),
                         enable ? "enabled" : "disabled");
        }
    }
    return status;
}

int CleanShares(const RecycleCommand& command, const std::vector<ChosenShare>& shares, FileTime now,
                CleanReport& report) {
    const CleanJudge judge(command.rules, now);
    LinkTimes links;
    CleanRun run{judge, report, links, command.preview};
    int status = kDone;
    for (const ChosenShare& share : shares) {
        if (!share.directory) {
            report.Problem(share.name, "there is no such share");
            status = kIncomplete;
            continue;
        }
        BinOpening opening = OpenAndLockBin(*share.directory, command.preview, [&] {
            report.Note(share.name, "waiting for another clean of this recycle bin");
        });
        const bool named = !command.shares.empty();
        if (opening.noBin) {
            if (named) {
                report.Note(share.name, "there is no recycle bin");
            }
        } else if (opening.noFolder && !named) {
            report.Note(share.name, opening.problem);
        } else if (!opening.bin) {
            report.Problem(share.name, opening.problem);
            status = kIncomplete;
        } else {
            report.BeginBin(share.name);
            const CleanTotals totals = CleanBin(std::move(*opening.bin), run);
            report.EndBin(totals);
            status = totals.failures > 0 ? kIncomplete : status;
        }
    }
    return report.Finish() ? status : kIncomplete;
}

}  // namespace

int RunRecycleTool(std::span<const char* const> arguments, std::FILE* out, std::FILE* err,
                   FileTime now) {
    const ParsedCommandLine parsed = ParseCommandLine(arguments);
    if (!parsed.command) {
        std::fprintf(err, "orvarecycle: %s (see orvarecycle --help)\n", parsed.error.c_str());
        return kUsage;
    }
    const RecycleCommand& command = *parsed.command;
    if (command.action == RecycleAction::kHelp) {
        std::fputs(RecycleHelp(), out);
        return kDone;
    }
    if (command.root) {
        SetRoot(*command.root);
    }
    if (const std::string problem = RootProblem(); !problem.empty()) {
        std::fprintf(err, "orvarecycle: %s\n", problem.c_str());
        return kIncomplete;
    }
    const std::optional<std::vector<ChosenShare>> shares = ChooseShares(command.shares);
    if (!shares) {
        std::fprintf(err, "orvarecycle: %s\n", ReasonOfLastError());
        return kIncomplete;
    }
    if (command.action != RecycleAction::kClean) {
        return SwitchBins(*shares, command.action == RecycleAction::kEnable, out, err);
    }
    const FileTime instant = command.at.value_or(now);
    const std::unique_ptr<CleanReport> report =
        command.json ? MakeJsonReport(out, err, command.preview, instant)
                     : MakeTextReport(out, err, command.preview, instant);
    return CleanShares(command, *shares, instant, *report);
}

}  // namespace orva
