#include "fuzz/ShellWords.h"

#include <cstddef>

namespace {

class Splitter {
  public:
    explicit Splitter(std::string_view lineToSplit) : line(lineToSplit) {}

    std::optional<std::vector<std::string>> Split() {
        constexpr std::string_view kMeaning = "$`;&|<>()*?[]{}#~!=\n";
        while (at < line.size()) {
            const char byte = line[at++];
            bool literal = true;
            if (byte == ' ' || byte == '\t') {
                EndWord();
            } else if (byte == '\'') {
                literal = SingleQuotes();
            } else if (byte == '"') {
                literal = DoubleQuotes();
            } else if (byte == '\\') {
                literal = Backslash();
            } else if (kMeaning.find(byte) != std::string_view::npos) {
                literal = false;
            } else {
                Put(byte);
            }
            if (!literal) {
                return std::nullopt;
            }
        }
        EndWord();
        return words;
    }

  private:
    void Put(char byte) {
        word += byte;
        inWord = true;
    }

    void EndWord() {
        if (inWord) {
            words.push_back(word);
        }
        word.clear();
        inWord = false;
    }

    bool SingleQuotes() {
        const std::size_t end = line.find('\'', at);
        if (end == std::string_view::npos) {
            return false;
        }
        word += line.substr(at, end - at);
        inWord = true;
        at = end + 1;
        return true;
    }

    bool DoubleQuotes() {
        constexpr std::string_view kEscapable = "$`\"\\";
        inWord = true;
        while (at < line.size()) {
            const char byte = line[at++];
            if (byte == '"') {
                return true;
            }
            if (byte == '$' || byte == '`') {
                return false;
            }
            const char next = at < line.size() ? line[at] : '\0';
            if (byte == '\\' && next == '\n') {
                ++at;
            } else if (byte == '\\' && kEscapable.find(next) != std::string_view::npos) {
                word += next;
                ++at;
            } else {
                word += byte;
            }
        }
        return false;
    }

    // Before a newline a backslash joins the lines.
    bool Backslash() {
        if (at == line.size()) {
            return false;
        }
        if (line[at] != '\n') {
            Put(line[at]);
        }
        ++at;
        return true;
    }

    std::string_view line;
    std::size_t at = 0;
    std::vector<std::string> words;
    std::string word;
    bool inWord = false;
};

}  // namespace

std::optional<std::vector<std::string>> SplitShellWords(std::string_view line) {
    return Splitter(line).Split();
}
