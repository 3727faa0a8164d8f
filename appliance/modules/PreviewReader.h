#pragma once

#include <json/value.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace orva {

// Reads what `orvarecycle --clean --dry-run --json` prints, line by line: a bin may hold millions
// of files, of which the first few are of interest and the others are counted. It relies on that
// document's layout: one entry, or one member of a bin, a line.
class PreviewReader {
  public:
    // How many files are listed on either side, and how many problems.
    static constexpr Json::ArrayIndex kMostListed = 1000;
    static constexpr Json::ArrayIndex kMostProblems = 100;

    void TakeLine(std::string_view line);

    // Something beside the document that kept the preview from being complete.
    void AddProblem(const std::string& text);

    // "complete", "remove", "keep", "removed", "kept" and "problems", as far as lines have come.
    Json::Value Answer() const;

  private:
    struct Side {
        Json::Int64 count = 0;
        Json::Int64 bytes = 0;
        Json::Value listed{Json::arrayValue};
    };
    enum class Section { kNone, kRemove, kKeep, kFailures };

    void TakeEntry(std::string_view line);
    void TakeFailure(const Json::Value& entry);
    void TakeProblems(std::string_view line);

    Section section = Section::kNone;
    std::string share;
    Side removed;
    Side kept;
    Json::Value problems{Json::arrayValue};
    bool ended = false;
};

}  // namespace orva
