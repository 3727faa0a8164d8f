#include "appliance/recycle/SizeCleaner.h"

#include <algorithm>
#include <cerrno>
#include <limits>
#include <utility>
#include <vector>

#include "appliance/recycle/BinWalker.h"
#include "appliance/recycle/NameStore.h"
#include "appliance/recycle/RemovalPlan.h"
#include "appliance/recycle/RemoveEntry.h"

namespace orva {
namespace {

using Index = DirectoryTree::Index;

// A directory moved out of the bin must not be cleaned through a descriptor from before, so that
// the place of each is looked at anew after this many removals.
constexpr unsigned kRemovalsPerCheck = 64;

// Looks at the whole bin. Only folders that hold nothing go already.
class Collector final : public BinVisitor {
  public:
    Collector(DirectoryTree& binTree, CleanRun& cleanRun, CleanTotals& cleanTotals)
        : tree(binTree), run(cleanRun), totals(cleanTotals) {}

    Fate File(Index directory, int, const char* name, const FileInfo& info) override {
        ++tree.Entries(directory);
        size += info.bytes;
        const FileTime changed = run.links.Changed(info);
        const KeepReason reason = run.judge.Keep(name, info.bytes, changed);
        if (reason == KeepReason::kNone) {
            candidates.push_back({info.bytes, changed, info.inode, names.Add(name), directory,
                                  info.kind, info.links > 1});
        } else {
            totals.AddKept(info.bytes);
            if (run.preview) {
                run.report.Stays({tree.Path(directory) + name, info.kind, info.bytes, changed},
                                 reason);
            }
        }
        run.report.Progress(totals);
        return Fate::kStays;
    }

    Fate EmptyDirectory(Index directory) override {
        return run.preview ? ForeseeDirectory(tree, directory, run, totals)
                           : RemoveDirectory(tree, directory, run, totals);
    }

    bool KeptDirectory(Index directory) override {
        ++tree.Entries(tree.Parent(directory));
        return true;
    }

    void MountPoint(Index parent, const char* name) override {
        ++tree.Entries(parent);
        ReportMountPoint(tree, parent, name, run);
    }

    void Unreadable(Index directory, const char* name, int error) override {
        ++tree.Entries(directory);
        ReportUnreadable(tree, directory, name, error, run, totals);
    }

    bool Removes() const override { return false; }

    ByteSum size = 0;
    std::vector<Candidate> candidates;
    NameStore names;

  private:
    DirectoryTree& tree;
    CleanRun& run;
    CleanTotals& totals;
};

class Remover {
  public:
    Remover(DirectoryTree& binTree, CleanRun& cleanRun, CleanTotals& cleanTotals,
            const NameStore& nameStore, ByteSum binSize)
        : tree(binTree), run(cleanRun), totals(cleanTotals), names(nameStore), size(binSize) {}

    void Remove(const Candidate& candidate) {
        if (run.preview) {
            Foresee(candidate);
            return;
        }
        if (++sinceCheck > kRemovalsPerCheck + tree.Depth(candidate.directory)) {
            tree.Distrust();
            sinceCheck = 0;
        }
        const char* name = names.At(candidate.name);
        FileInfo info;
        const int fd = tree.Fd(candidate.directory);
        const int error = fd < 0 ? errno : ReadFileInfo(fd, name, info);
        if (error == ENOENT || error == ESTALE) {
            Forget(candidate);
        } else if (error != 0) {
            ReportUnreadable(tree, candidate.directory, name, error, run, totals);
        } else if (!IsSame(candidate, info)) {
            // Another file came under this name; whether it may go is the next clean's question.
            size = size - candidate.bytes + info.bytes;
        } else {
            info.changed = candidate.changed;
            if (RemoveFile(tree, candidate.directory, fd, name, info, run, totals) == Fate::kGone) {
                Forget(candidate);
            }
        }
    }

    ByteSum Size() const { return size; }

  private:
    static bool IsSame(const Candidate& candidate, const FileInfo& info) {
        return info.inode == candidate.inode && info.bytes == candidate.bytes &&
               info.kind == candidate.kind &&
               (candidate.linked || info.changed == candidate.changed);
    }

    void Foresee(const Candidate& candidate) {
        totals.AddRemoved(candidate.bytes);
        run.report.Goes({tree.Path(candidate.directory) + names.At(candidate.name), candidate.kind,
                         candidate.bytes, candidate.changed});
        Forget(candidate);
    }

    // The candidate is no longer in the bin; directories that hold nothing else follow it.
    void Forget(const Candidate& candidate) {
        size -= candidate.bytes;
        Index directory = candidate.directory;
        while (--tree.Entries(directory) == 0 && directory != DirectoryTree::kBin) {
            const Index parent = tree.Parent(directory);
            const Fate fate = run.preview ? ForeseeDirectory(tree, directory, run, totals)
                                          : RemoveDirectory(tree, directory, run, totals);
            if (fate != Fate::kGone) {
                return;
            }
            directory = parent;
        }
    }

    DirectoryTree& tree;
    CleanRun& run;
    CleanTotals& totals;
    const NameStore& names;
    ByteSum size;
    unsigned sinceCheck = 0;
};

}  // namespace

CleanTotals CleanToSize(DirectoryTree& tree, CleanRun& run) {
    const CleanRules& rules = run.judge.Rules();
    const ByteSum limit = rules.sizeLimit.value_or(std::numeric_limits<std::uint64_t>::max());
    CleanTotals totals;
    Collector bin(tree, run, totals);
    BinWalker(tree, bin).Walk();

    Remover remover(tree, run, totals, bin.names, bin.size);
    const auto excess = [&remover, limit] {
        return remover.Size() > limit ? remover.Size() - limit : ByteSum{0};
    };
    RemovalPlan plan(std::move(bin.candidates), rules.order, tree, bin.names);
    for (auto chosen = plan.Next(excess()); !chosen.empty(); chosen = plan.Next(excess())) {
        if (!run.preview) {
            ArrangeByFolder(chosen);
        }
        for (const Candidate& candidate : chosen) {
            remover.Remove(candidate);
        }
    }
    for (const Candidate& stays : plan.Rest()) {
        totals.AddKept(stays.bytes);
        if (run.preview) {
            run.report.Stays({tree.Path(stays.directory) + bin.names.At(stays.name), stays.kind,
                              stays.bytes, stays.changed},
                             KeepReason::kWithinSize);
        }
    }
    constexpr std::uint64_t kLargest = std::numeric_limits<std::uint64_t>::max();
    totals.overLimit = static_cast<std::uint64_t>(std::min<ByteSum>(excess(), kLargest));
    return totals;
}

}  // namespace orva
