#include "appliance/recycle/BinCleaner.h"

#include <utility>

#include "appliance/recycle/BinWalker.h"
#include "appliance/recycle/RemoveEntry.h"
#include "appliance/recycle/SizeCleaner.h"

namespace orva {
namespace {

// Decides and removes while walking: no file needs to know of another one.
class PassingCleaner final : public BinVisitor {
  public:
    PassingCleaner(DirectoryTree& binTree, CleanRun& cleanRun) : tree(binTree), run(cleanRun) {}

    Fate File(DirectoryTree::Index directory, int fd, const char* name,
              const FileInfo& info) override {
        FileInfo known = info;
        known.changed = run.links.Changed(info);
        const KeepReason reason = run.judge.Keep(name, known.bytes, known.changed);
        if (reason != KeepReason::kNone) {
            totals.AddKept(known.bytes);
            run.report.Progress(totals);
            if (run.preview) {
                run.report.Stays(Describe(directory, name, known), reason);
            }
            return Fate::kStays;
        }
        if (run.preview) {
            totals.AddRemoved(known.bytes);
            run.report.Goes(Describe(directory, name, known));
            return Fate::kGone;
        }
        return RemoveFile(tree, directory, fd, name, known, run, totals);
    }

    Fate EmptyDirectory(DirectoryTree::Index directory) override {
        return run.preview ? ForeseeDirectory(tree, directory, run, totals)
                           : RemoveDirectory(tree, directory, run, totals);
    }

    bool KeptDirectory(DirectoryTree::Index) override { return false; }

    void MountPoint(DirectoryTree::Index parent, const char* name) override {
        ReportMountPoint(tree, parent, name, run);
    }

    void Unreadable(DirectoryTree::Index directory, const char* name, int error) override {
        ReportUnreadable(tree, directory, name, error, run, totals);
    }

    bool Removes() const override { return !run.preview; }

    const CleanTotals& Totals() const { return totals; }

  private:
    ReportedEntry Describe(DirectoryTree::Index directory, const char* name,
                           const FileInfo& info) const {
        return {tree.Path(directory) + name, info.kind, info.bytes, info.changed};
    }

    DirectoryTree& tree;
    CleanRun& run;
    CleanTotals totals;
};

}  // namespace

CleanTotals CleanBin(OpenBin bin, CleanRun& run) {
    DirectoryTree tree(std::move(bin.share), kBinFolder, std::move(bin.bin), bin.info);
    if (run.judge.Rules().sizeLimit) {
        return CleanToSize(tree, run);
    }
    PassingCleaner cleaner(tree, run);
    BinWalker(tree, cleaner).Walk();
    return cleaner.Totals();
}

}  // namespace orva
