#pragma once

#include "appliance/recycle/BinWalker.h"
#include "appliance/recycle/CleanReport.h"
#include "appliance/recycle/CleanRun.h"
#include "appliance/recycle/DirectoryTree.h"

namespace orva {

// Both count what they do in `totals` and report a failure; kGone also when somebody else was
// quicker. `info` describes the file as it was just before, `fd` is its open directory.
Fate RemoveFile(const DirectoryTree& tree, DirectoryTree::Index directory, int fd, const char* name,
                const FileInfo& info, CleanRun& run, CleanTotals& totals);

// An empty directory other than the bin. kRefilled when it is not empty after all.
Fate RemoveDirectory(DirectoryTree& tree, DirectoryTree::Index directory, CleanRun& run,
                     CleanTotals& totals);

// In a preview's place: tells that the directory would go.
Fate ForeseeDirectory(const DirectoryTree& tree, DirectoryTree::Index directory, CleanRun& run,
                      CleanTotals& totals);

// Tells that `name` of `directory` stays because something is mounted there.
void ReportMountPoint(const DirectoryTree& tree, DirectoryTree::Index directory, const char* name,
                      CleanRun& run);

// Tells that `name` of `directory`, or with an empty name the directory, could not be read.
void ReportUnreadable(const DirectoryTree& tree, DirectoryTree::Index directory, const char* name,
                      int error, CleanRun& run, CleanTotals& totals);

}  // namespace orva
