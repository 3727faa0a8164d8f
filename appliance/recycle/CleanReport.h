#pragma once

#include <cstdint>
#include <cstdio>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "appliance/recycle/CleanRules.h"
#include "appliance/recycle/FileInfo.h"

namespace orva {

// What a clean did to one bin, or in a preview would do. Counts stop at their largest value instead
// of starting again at 0.
struct CleanTotals {
    std::uint64_t removedFiles = 0;  // all but directories
    std::uint64_t removedBytes = 0;
    std::uint64_t removedDirectories = 0;
    std::uint64_t keptFiles = 0;  // kept by the rules
    std::uint64_t keptBytes = 0;
    std::uint64_t failures = 0;
    std::uint64_t overLimit = 0;  // bytes by which the bin is still larger than its size limit

    void AddRemoved(std::uint64_t bytes);
    void AddKept(std::uint64_t bytes);
};

// One entry of a bin. The path starts in the bin; a directory's ends with a slash.
struct ReportedEntry {
    std::string path;
    FileKind kind = FileKind::kFile;
    std::uint64_t bytes = 0;
    FileTime changed = 0;
};

// Says what happens, in one of two forms. Bins come one after the other, each between BeginBin and
// EndBin; a bin that cannot be cleaned has a Problem instead.
class CleanReport {
  public:
    virtual ~CleanReport() = default;

    virtual void BeginBin(const std::string& share) = 0;
    virtual void EndBin(const CleanTotals& totals) = 0;

    // Of a preview only.
    virtual void Goes(const ReportedEntry& entry) = 0;

    // Of a preview; otherwise only for what a clean keeps on its own account.
    virtual void Stays(const ReportedEntry& entry, KeepReason reason) = 0;

    // `action`: what could not be done to it ("remove", "open", "read").
    virtual void Failed(std::string_view path, std::string_view action, int error) = 0;

    // A share that nothing could be done for.
    virtual void Problem(const std::string& share, const std::string& message) = 0;

    // Worth knowing, and no failure.
    virtual void Note(const std::string& share, const std::string& message) = 0;

    // Called often: shows how far the bin is, on a terminal only and a few times a second only.
    void Progress(const CleanTotals& totals);

    // Ends the report; false when not all of it could be written.
    [[nodiscard]] virtual bool Finish() = 0;

  protected:
    // `out` and `err` stay the caller's.
    CleanReport(std::FILE* outStream, std::FILE* errStream, bool preview);

    // Takes the progress line off the terminal before another line goes there.
    void ClearProgress();

    std::FILE* out;
    std::FILE* err;
    bool preview;
    std::string share;

  private:
    bool onTerminal;
    bool shown = false;
    unsigned untilLook = 0;
    FileTime nextShow = 0;
};

// Lines for people.
std::unique_ptr<CleanReport> MakeTextReport(std::FILE* out, std::FILE* err, bool preview,
                                            FileTime now);

// One JSON document on `out`; nothing else is written there.
std::unique_ptr<CleanReport> MakeJsonReport(std::FILE* out, std::FILE* err, bool preview,
                                            FileTime now);

// Days between two times, cut after two decimals: "31.25", "-0.50".
std::string DaysBetween(FileTime from, FileTime to);

}  // namespace orva
