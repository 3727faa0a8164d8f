#include <cinttypes>
#include <cstring>

#include "appliance/recycle/ByteText.h"
#include "appliance/recycle/CleanReport.h"

namespace orva {
namespace {

std::string Count(std::uint64_t count, const char* one, const char* many) {
    return std::to_string(count) + " " + (count == 1 ? one : many);
}

std::string Bytes(std::uint64_t bytes) { return Count(bytes, "byte", "bytes"); }

class TextReport final : public CleanReport {
  public:
    TextReport(std::FILE* outStream, std::FILE* errStream, bool isPreview, FileTime instant)
        : CleanReport(outStream, errStream, isPreview), now(instant) {}

    void BeginBin(const std::string& name) override { share = name; }

    void Goes(const ReportedEntry& entry) override { Line("remove ", entry, ""); }

    void Stays(const ReportedEntry& entry, KeepReason reason) override {
        Line("keep   ", entry, ": " + std::string(KeepReasonPhrase(reason)));
    }

    void Failed(std::string_view path, std::string_view action, int error) override {
        ClearProgress();
        const std::string what(action);
        std::fprintf(err, "orvarecycle: %s: cannot %s %s: %s\n", QuoteIfNeeded(share).c_str(),
                     what.c_str(), QuoteForTerminal(path).c_str(), std::strerror(error));
    }

    void Problem(const std::string& name, const std::string& message) override {
        ClearProgress();
        std::fprintf(err, "orvarecycle: %s: %s\n", QuoteIfNeeded(name).c_str(), message.c_str());
    }

    void Note(const std::string& name, const std::string& message) override {
        ClearProgress();
        std::fprintf(err, "%s: %s\n", QuoteIfNeeded(name).c_str(), message.c_str());
    }

    void EndBin(const CleanTotals& totals) override {
        ClearProgress();
        std::string line = QuoteIfNeeded(share) + (preview ? ": would remove " : ": removed ");
        line += Count(totals.removedFiles, "file", "files");
        line += " (" + Bytes(totals.removedBytes) + ") and ";
        line += Count(totals.removedDirectories, "folder", "folders");
        line += ", kept " + Count(totals.keptFiles, "file", "files");
        line += " (" + Bytes(totals.keptBytes) + ")";
        if (totals.failures > 0) {
            line += ", failed " + std::to_string(totals.failures);
        }
        if (totals.overLimit > 0) {
            line += "; still " + Bytes(totals.overLimit) + " over the limit";
        }
        std::fprintf(out, "%s\n", line.c_str());
        std::fflush(out);
    }

    bool Finish() override { return std::fflush(out) == 0 && std::ferror(out) == 0; }

  private:
    void Line(const char* verb, const ReportedEntry& entry, const std::string& end) {
        ClearProgress();
        std::string line = QuoteIfNeeded(share) + ": " + verb + QuoteForTerminal(entry.path);
        if (entry.kind != FileKind::kDirectory) {
            line += " (" + Bytes(entry.bytes) + ", " + DaysBetween(entry.changed, now) + " days)";
        }
        std::fprintf(out, "%s%s\n", line.c_str(), end.c_str());
    }

    FileTime now;
};

}  // namespace

std::unique_ptr<CleanReport> MakeTextReport(std::FILE* out, std::FILE* err, bool preview,
                                            FileTime now) {
    return std::make_unique<TextReport>(out, err, preview, now);
}

}  // namespace orva
