#pragma once

#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

namespace orva {

// What a configuration file says.
struct ConfFile {
    std::unordered_map<std::string, std::string> values;
    // Numbers, from 1, of the lines that are neither empty, nor comments, nor of the form
    // key="value". They count as absent.
    std::vector<std::size_t> damagedLines;
};

// Reads the lines of `content` by these rules. A line ends with LF or CR LF; the last one need not.
// Blanks and tabs count for nothing around a line, its key, its equals sign and its value. A line
// whose first other character is "#" is a comment, and so is what follows a value behind a "#". A
// key is made of ASCII letters, digits, "_", "-" and "."; capitals count. A value stands in double
// quotes; in it \" means a quote and \\ a backslash, any other backslash, a NUL and bytes that are
// no UTF-8 damage the line. The last line of a key wins. A byte order mark before the first line is
// skipped.
[[nodiscard]] ConfFile ParseConf(std::string_view content);

}  // namespace orva
