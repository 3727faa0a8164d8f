#include "appliance/recycle/SizeCleaner.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <limits>
#include <vector>

#include "appliance/recycle/BinWalker.h"
#include "appliance/recycle/NameStore.h"
#include "appliance/recycle/RemoveEntry.h"

namespace orva {
namespace {

// Sparse files may claim more bytes together than 64 bits can count.
__extension__ using ByteSum = unsigned __int128;

using Index = DirectoryTree::Index;

// A directory moved out of the bin must not be cleaned through a descriptor from before, so that
// the place of each is looked at anew after this many removals.
constexpr unsigned kRemovalsPerCheck = 64;

struct Candidate {
    std::uint64_t bytes;
    FileTime changed;
    std::uint64_t inode;
    NameStore::Place name;
    Index directory;
    FileKind kind;
    bool linked;  // has other hard links, whose removal changes its time
};

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

// Where each directory stands when all are sorted by their paths, a directory before those in it.
std::vector<Index> RankDirectories(const DirectoryTree& tree) {
    std::vector<Index> sorted(tree.Count());
    for (Index at = 0; at < sorted.size(); ++at) {
        sorted[at] = at;
    }
    // The bin, its own parent, comes first.
    std::sort(sorted.begin() + 1, sorted.end(), [&tree](Index left, Index right) {
        const Index leftParent = tree.Parent(left);
        const Index rightParent = tree.Parent(right);
        return leftParent != rightParent ? leftParent < rightParent
                                         : std::strcmp(tree.Name(left), tree.Name(right)) < 0;
    });
    std::vector<Index> firstChild(tree.Count() + std::size_t{1}, 0);
    for (std::size_t at = 1; at < sorted.size(); ++at) {
        ++firstChild[tree.Parent(sorted[at]) + std::size_t{1}];
    }
    firstChild[0] = 1;
    for (std::size_t at = 1; at < firstChild.size(); ++at) {
        firstChild[at] += firstChild[at - 1];
    }
    std::vector<Index> ranks(tree.Count());
    std::vector<Index> waiting = {DirectoryTree::kBin};
    for (Index rank = 0; !waiting.empty(); ++rank) {
        const Index directory = waiting.back();
        waiting.pop_back();
        ranks[directory] = rank;
        for (Index child = firstChild[directory + std::size_t{1}]; child > firstChild[directory];
             --child) {
            waiting.push_back(sorted[child - 1]);
        }
    }
    return ranks;
}

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

void SortCandidates(std::vector<Candidate>& candidates, const DirectoryTree& tree,
                    const NameStore& names, SizeOrder order) {
    const std::vector<Index> ranks = RankDirectories(tree);
    std::sort(candidates.begin(), candidates.end(),
              [&](const Candidate& left, const Candidate& right) {
                  if (order == SizeOrder::kLargestFirst && left.bytes != right.bytes) {
                      return left.bytes > right.bytes;
                  }
                  if (left.changed != right.changed) {
                      return left.changed < right.changed;
                  }
                  if (left.directory != right.directory) {
                      return ranks[left.directory] < ranks[right.directory];
                  }
                  return std::strcmp(names.At(left.name), names.At(right.name)) < 0;
              });
}

}  // namespace

CleanTotals CleanToSize(DirectoryTree& tree, CleanRun& run) {
    const CleanRules& rules = run.judge.Rules();
    const ByteSum limit = rules.sizeLimit.value_or(std::numeric_limits<std::uint64_t>::max());
    CleanTotals totals;
    Collector bin(tree, run, totals);
    BinWalker(tree, bin).Walk();

    Remover remover(tree, run, totals, bin.names, bin.size);
    std::size_t next = 0;
    if (bin.size > limit) {
        SortCandidates(bin.candidates, tree, bin.names, rules.order);
        while (remover.Size() > limit && next < bin.candidates.size()) {
            remover.Remove(bin.candidates[next]);
            ++next;
        }
    }
    for (; next < bin.candidates.size(); ++next) {
        const Candidate& stays = bin.candidates[next];
        totals.AddKept(stays.bytes);
        if (run.preview) {
            run.report.Stays({tree.Path(stays.directory) + bin.names.At(stays.name), stays.kind,
                              stays.bytes, stays.changed},
                             KeepReason::kWithinSize);
        }
    }
    if (remover.Size() > limit) {
        const ByteSum over = remover.Size() - limit;
        constexpr std::uint64_t kLargest = std::numeric_limits<std::uint64_t>::max();
        totals.overLimit = over > kLargest ? kLargest : static_cast<std::uint64_t>(over);
    }
    return totals;
}

}  // namespace orva
