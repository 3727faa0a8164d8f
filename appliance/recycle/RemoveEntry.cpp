#include "appliance/recycle/RemoveEntry.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>

namespace orva {

Fate RemoveFile(const DirectoryTree& tree, DirectoryTree::Index directory, int fd, const char* name,
                const FileInfo& info, CleanRun& run, CleanTotals& totals) {
    if (::unlinkat(fd, name, 0) == 0) {
        totals.AddRemoved(info.bytes);
        run.links.Removed(info);
        run.report.Progress(totals);
        return Fate::kGone;
    }
    const int error = errno;
    if (error == ENOENT) {
        return Fate::kGone;
    }
    // A directory has taken the name: the next clean meets it as one.
    if (error != EISDIR) {
        ++totals.failures;
        run.report.Failed(tree.Path(directory) + name, "remove", error);
    }
    return Fate::kStays;
}

Fate RemoveDirectory(DirectoryTree& tree, DirectoryTree::Index directory, CleanRun& run,
                     CleanTotals& totals) {
    const int parent = tree.Fd(tree.Parent(directory));
    if (parent >= 0 && ::unlinkat(parent, tree.Name(directory), AT_REMOVEDIR) == 0) {
        ++totals.removedDirectories;
        return Fate::kGone;
    }
    const int error = errno;
    switch (error) {
        case ENOENT:
            return Fate::kGone;
        case ENOTEMPTY:
        case EEXIST:
            return Fate::kRefilled;
        case ESTALE:   // moved away with the directory it is in
        case ENOTDIR:  // something else has taken the name
            return Fate::kStays;
        default:
            ++totals.failures;
            run.report.Failed(tree.Path(directory), "remove", error);
            return Fate::kStays;
    }
}

Fate ForeseeDirectory(const DirectoryTree& tree, DirectoryTree::Index directory, CleanRun& run,
                      CleanTotals& totals) {
    ++totals.removedDirectories;
    run.report.Goes({tree.Path(directory), FileKind::kDirectory, 0, 0});
    return Fate::kGone;
}

void ReportMountPoint(const DirectoryTree& tree, DirectoryTree::Index directory, const char* name,
                      CleanRun& run) {
    run.report.Stays({tree.Path(directory) + name + "/", FileKind::kDirectory, 0, 0},
                     KeepReason::kMountPoint);
}

void ReportUnreadable(const DirectoryTree& tree, DirectoryTree::Index directory, const char* name,
                      int error, CleanRun& run, CleanTotals& totals) {
    ++totals.failures;
    run.report.Failed(tree.Path(directory) + name, "read", error);
}

}  // namespace orva
