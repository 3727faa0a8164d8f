#include "appliance/recycle/CleanReport.h"

#include <unistd.h>

#include <array>
#include <cinttypes>
#include <ctime>
#include <limits>

#include "appliance/recycle/ByteText.h"

namespace orva {
namespace {

constexpr FileTime kShowEvery = kNanosecondsPerSecond / 5;
constexpr unsigned kCallsPerLook = 256;

void AddCapped(std::uint64_t& count, std::uint64_t more) {
    constexpr std::uint64_t kLargest = std::numeric_limits<std::uint64_t>::max();
    count = more > kLargest - count ? kLargest : count + more;
}

FileTime Monotonic() {
    timespec now{};
    ::clock_gettime(CLOCK_MONOTONIC, &now);
    return ToFileTime(now.tv_sec, static_cast<std::uint32_t>(now.tv_nsec));
}

}  // namespace

void CleanTotals::AddRemoved(std::uint64_t bytes) {
    ++removedFiles;
    AddCapped(removedBytes, bytes);
}

void CleanTotals::AddKept(std::uint64_t bytes) {
    ++keptFiles;
    AddCapped(keptBytes, bytes);
}

CleanReport::CleanReport(std::FILE* outStream, std::FILE* errStream, bool isPreview)
    : out(outStream),
      err(errStream),
      preview(isPreview),
      onTerminal(::isatty(::fileno(errStream)) == 1) {}

void CleanReport::Progress(const CleanTotals& totals) {
    if (!onTerminal || untilLook-- > 0) {
        return;
    }
    untilLook = kCallsPerLook;
    const FileTime now = Monotonic();
    if (now < nextShow) {
        return;
    }
    nextShow = now + kShowEvery;
    std::fprintf(err, "\r\033[K%s: %" PRIu64 " files, %s %s, %" PRIu64 " kept",
                 QuoteIfNeeded(share).c_str(), totals.removedFiles,
                 HumanBytes(totals.removedBytes).c_str(), preview ? "would go" : "removed",
                 totals.keptFiles);
    std::fflush(err);
    shown = true;
}

void CleanReport::ClearProgress() {
    if (shown) {
        std::fputs("\r\033[K", err);
        std::fflush(err);
        shown = false;
    }
}

std::string DaysBetween(FileTime from, FileTime to) {
    constexpr FileTime kHundredthOfDay = kNanosecondsPerSecond * 864;
    const bool negative = to < from;
    const std::uint64_t distance =
        negative ? static_cast<std::uint64_t>(from) - static_cast<std::uint64_t>(to)
                 : static_cast<std::uint64_t>(to) - static_cast<std::uint64_t>(from);
    const std::uint64_t hundredths = distance / static_cast<std::uint64_t>(kHundredthOfDay);
    std::array<char, 32> text{};
    std::snprintf(text.data(), text.size(), "%s%" PRIu64 ".%02" PRIu64,
                  negative && hundredths > 0 ? "-" : "", hundredths / 100, hundredths % 100);
    return text.data();
}

}  // namespace orva
