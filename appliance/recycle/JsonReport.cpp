#include <cinttypes>
#include <cstring>
#include <ctime>

#include "appliance/recycle/ByteText.h"
#include "appliance/recycle/CleanReport.h"

namespace orva {
namespace {

struct CloseFile {
    void operator()(std::FILE* file) const { std::fclose(file); }
};

// Text that is written after other text has ended; what is more than a little waits in a file
// without a name, so that a preview of millions of files needs no memory for them.
class Spool {
  public:
    void Append(const std::string& text) {
        waiting += text;
        if (waiting.size() < kInMemory) {
            return;
        }
        if (!file) {
            file.reset(std::tmpfile());
        }
        if (file) {
            failed = std::fwrite(waiting.data(), 1, waiting.size(), file.get()) != waiting.size() ||
                     failed;
            waiting.clear();
        }
    }

    // Writes everything to `out` and starts empty again. False when something was lost.
    bool MoveTo(std::FILE* out) {
        bool good = !failed;
        if (file) {
            good = std::fseek(file.get(), 0, SEEK_SET) == 0 && good;
            std::string part(kInMemory, '\0');
            for (std::size_t size = 0;
                 (size = std::fread(part.data(), 1, part.size(), file.get())) > 0;) {
                std::fwrite(part.data(), 1, size, out);
            }
            good = std::ferror(file.get()) == 0 && good;
        }
        std::fwrite(waiting.data(), 1, waiting.size(), out);
        waiting.clear();
        file.reset();
        failed = false;
        return good;
    }

  private:
    static constexpr std::size_t kInMemory = std::size_t{1} << 20;

    std::string waiting;
    std::unique_ptr<std::FILE, CloseFile> file;
    bool failed = false;
};

const char* KindWord(FileKind kind) {
    switch (kind) {
        case FileKind::kFile:
            return "file";
        case FileKind::kDirectory:
            return "folder";
        case FileKind::kLink:
            return "link";
        case FileKind::kOther:
            break;
    }
    return "other";
}

// A member "key" and, when the bytes are no UTF-8 and the text can only resemble them,
// "key_base64".
std::string BytesMember(const std::string& key, std::string_view bytes) {
    std::string text = QuoteForJson(key) + ":" + QuoteForJson(bytes);
    if (!IsUtf8(bytes)) {
        text += "," + QuoteForJson(key + "_base64") + ":\"" + Base64(bytes) + "\"";
    }
    return text;
}

std::string UtcText(FileTime instant) {
    std::time_t seconds = instant / kNanosecondsPerSecond - (instant % kNanosecondsPerSecond < 0);
    std::tm parts{};
    ::gmtime_r(&seconds, &parts);
    std::string text(32, '\0');
    text.resize(std::strftime(text.data(), text.size(), "%Y-%m-%dT%H:%M:%SZ", &parts));
    return text;
}

class JsonReport final : public CleanReport {
  public:
    JsonReport(std::FILE* outStream, std::FILE* errStream, bool isPreview, FileTime instant)
        : CleanReport(outStream, errStream, isPreview), now(instant) {
        std::fprintf(out, "{\"dry_run\":%s,\"at\":\"%s\",\"bins\":[", preview ? "true" : "false",
                     UtcText(now).c_str());
    }

    void BeginBin(const std::string& name) override {
        share = name;
        std::fprintf(out, "%s\n{%s", anyBin ? "," : "", BytesMember("share", share).c_str());
        anyBin = true;
        anyGoes = anyStays = anyFailed = false;
        if (preview) {
            std::fputs(",\"remove\":[", out);
        }
    }

    void Goes(const ReportedEntry& entry) override {
        const std::string text = (anyGoes ? ",\n{" : "\n{") + EntryMembers(entry) + "}";
        std::fwrite(text.data(), 1, text.size(), out);
        anyGoes = true;
    }

    void Stays(const ReportedEntry& entry, KeepReason reason) override {
        kept.Append((anyStays ? ",\n{" : "\n{") + EntryMembers(entry) + ",\"reason\":\"" +
                    std::string(KeepReasonWord(reason)) + "\"}");
        anyStays = true;
    }

    void Failed(std::string_view path, std::string_view action, int error) override {
        failed.Append((anyFailed ? ",\n{" : "\n{") + BytesMember("path", path) +
                      ",\"action\":" + QuoteForJson(action) +
                      ",\"message\":" + QuoteForJson(std::strerror(error)) + "}");
        anyFailed = true;
    }

    void Problem(const std::string& name, const std::string& message) override {
        Append(problems, name, message);
    }

    void Note(const std::string& name, const std::string& message) override {
        Append(notes, name, message);
    }

    void EndBin(const CleanTotals& totals) override {
        ClearProgress();
        std::fputs(preview ? "],\n\"keep\":[" : ",\n\"keep\":[", out);
        complete = kept.MoveTo(out) && complete;
        std::fputs("],\n\"failures\":[", out);
        complete = failed.MoveTo(out) && complete;
        std::fprintf(out,
                     "],\n\"totals\":{\"removed_files\":%" PRIu64 ",\"removed_bytes\":%" PRIu64
                     ",\"removed_folders\":%" PRIu64 ",\"kept_files\":%" PRIu64
                     ",\"kept_bytes\":%" PRIu64 ",\"failures\":%" PRIu64
                     ",\"over_limit_bytes\":%" PRIu64 "}}",
                     totals.removedFiles, totals.removedBytes, totals.removedDirectories,
                     totals.keptFiles, totals.keptBytes, totals.failures, totals.overLimit);
    }

    bool Finish() override {
        std::fprintf(out, "],\n\"notes\":[%s],\n\"problems\":[%s]}\n", notes.c_str(),
                     problems.c_str());
        return std::fflush(out) == 0 && std::ferror(out) == 0 && complete;
    }

  private:
    static void Append(std::string& list, const std::string& name, const std::string& message) {
        list += (list.empty() ? "{" : ",{") + BytesMember("share", name) +
                ",\"message\":" + QuoteForJson(message) + "}";
    }

    std::string EntryMembers(const ReportedEntry& entry) const {
        std::string text = BytesMember("path", entry.path);
        text += ",\"kind\":\"";
        text += KindWord(entry.kind);
        text += "\",\"bytes\":" + std::to_string(entry.bytes);
        if (entry.kind != FileKind::kDirectory) {
            text += ",\"since\":\"" + UtcText(entry.changed) +
                    "\",\"age_days\":" + DaysBetween(entry.changed, now);
        }
        return text;
    }

    FileTime now;
    bool complete = true;
    bool anyBin = false;
    bool anyGoes = false;
    bool anyStays = false;
    bool anyFailed = false;
    Spool kept;
    Spool failed;
    std::string notes;
    std::string problems;
};

}  // namespace

std::unique_ptr<CleanReport> MakeJsonReport(std::FILE* out, std::FILE* err, bool preview,
                                            FileTime now) {
    return std::make_unique<JsonReport>(out, err, preview, now);
}

}  // namespace orva
