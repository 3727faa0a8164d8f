#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <memory>
#include <optional>
#include <ostream>
#include <random>
#include <string>
#include <vector>

#include "platform/qlibc.h"

namespace {

// The encoded word in a buffer of `size` bytes; nothing when it was refused.
std::optional<std::string> EncodeInto(const std::string& text, std::size_t size) {
    std::string buffer(size + 1, '\x7F');
    const int result = QLIBCEncShParam(text.c_str(), buffer.data(), static_cast<int>(size));
    EXPECT_EQ(buffer[size], '\x7F') << "written beyond the buffer";
    if (result < 0) {
        EXPECT_TRUE(size == 0 || buffer[0] == '\0');
        return std::nullopt;
    }
    return buffer.c_str();
}

// In the buffer that callers give: twice the length plus two bytes.
std::optional<std::string> Encode(const std::string& text) {
    return EncodeInto(text, 2 * (text.size() + 1));
}

// Has `shell` read the words and say what it read: prints each with a zero behind it.
std::vector<std::string> ReadBack(const std::string& shell, const std::string& locale,
                                  const std::vector<std::string>& words) {
    std::string path = testing::TempDir() + "orva-words-XXXXXX";
    const int file = ::mkstemp(path.data());
    EXPECT_GE(file, 0);
    ::close(file);
    {
        std::ofstream script(path, std::ios::binary);
        for (const std::string& word : words) {
            script << "printf '%s\\0' " << word << "\n";
        }
    }
    const std::string command = "LC_ALL=" + locale + " " + shell + " " + path + " 2>&1";
    std::string output;
    const std::unique_ptr<FILE, int (*)(FILE*)> pipe(::popen(command.c_str(), "r"), ::pclose);
    std::vector<char> block(1 << 16);
    while (pipe != nullptr) {
        const std::size_t got = std::fread(block.data(), 1, block.size(), pipe.get());
        if (got == 0) {
            break;
        }
        output.append(block.data(), got);
    }
    ::unlink(path.c_str());
    std::vector<std::string> texts;
    std::size_t at = 0;
    while (at < output.size()) {
        const std::size_t end = std::min(output.find('\0', at), output.size());
        texts.push_back(output.substr(at, end - at));
        at = end + 1;
    }
    return texts;
}

std::string Hex(const std::string& text) {
    std::string hex;
    for (const char byte : text) {
        char digits[3];
        std::snprintf(digits, sizeof digits, "%02x", static_cast<unsigned char>(byte));
        hex += digits;
    }
    return hex;
}

struct Shell {
    const char* command;
    const char* locale;
};

std::ostream& operator<<(std::ostream& out, const Shell& shell) {
    return out << shell.command << " in " << shell.locale;
}

class ShellEncodeTest : public testing::TestWithParam<Shell> {
  protected:
    // Every text that can be encoded comes back as the one unchanged word.
    static void ExpectUnchanged(const std::vector<std::string>& texts) {
        std::vector<std::string> words;
        for (const std::string& text : texts) {
            const std::optional<std::string> word = Encode(text);
            ASSERT_TRUE(word.has_value()) << Hex(text);
            words.push_back(*word);
        }
        const std::vector<std::string> read =
            ReadBack(GetParam().command, GetParam().locale, words);
        ASSERT_EQ(read.size(), texts.size());
        for (std::size_t i = 0; i < texts.size(); ++i) {
            ASSERT_EQ(Hex(read[i]), Hex(texts[i])) << "encoded as " << words[i];
        }
    }
};

INSTANTIATE_TEST_SUITE_P(Shells, ShellEncodeTest,
                         testing::Values(Shell{"dash", "C"}, Shell{"bash", "C"},
                                         Shell{"bash", "C.UTF-8"}, Shell{"bash --posix", "C"},
                                         Shell{"busybox sh", "C"}, Shell{"busybox sh", "C.UTF-8"}));

TEST_P(ShellEncodeTest, EveryNameOfOneByteArrivesUnchanged) {
    std::vector<std::string> texts;
    for (int byte = 1; byte < 256; ++byte) {
        texts.emplace_back(1, static_cast<char>(byte));
    }
    ExpectUnchanged(texts);
}

TEST_P(ShellEncodeTest, NamesThatMeanSomethingToAShellArriveUnchanged) {
    ExpectUnchanged({"photo",
                     "two words",
                     " leading and trailing ",
                     "it's",
                     "''''",
                     "'\n'",
                     "\n",
                     "\n\n\n",
                     "\n''''''",
                     "\n'\\'\\\n$`\"",
                     "line one\nline two",
                     "say \"yes\"",
                     "$HOME ${HOME} $(id) `id`",
                     "a;b|c&d>e<f(g)",
                     "*?[a-z]{1,2}~!^#=",
                     "~root",
                     "#comment",
                     "A=1",
                     "-rf",
                     "--",
                     "-n",
                     "\\",
                     "\\\\n",
                     "back\\slash",
                     "\t\r\v\f\a\b\x1b[31m",
                     "ごみ箱",
                     "Süden’s",
                     "\U0001F600'",
                     "'é'é'é'é'",
                     "'\xA0'\x85'\xFF'",
                     "\x01\x7F\x81\x88'''''",
                     "if",
                     "{",
                     "!",
                     std::string(5000, '\''),
                     std::string(5000, '\n') + std::string(5000, '\'')});
}

TEST_P(ShellEncodeTest, RandomNamesArriveUnchanged) {
    constexpr unsigned kSeed = 20261121;
    RecordProperty("seed", static_cast<int>(kSeed));
    std::printf("seed %u\n", kSeed);
    std::mt19937 random(kSeed);
    std::vector<std::string> texts;
    // Half of them from the bytes that quoting is about.
    const std::string special = "'\"\\\n$`! \t*~#;&|-=\x81\x88\xA0\xE3";
    for (int i = 0; i < 12000; ++i) {
        std::string text(1 + random() % 24, '\0');
        for (char& byte : text) {
            byte = i % 2 == 0 ? static_cast<char>(1 + random() % 255)
                              : special[random() % special.size()];
        }
        texts.push_back(text);
    }
    ExpectUnchanged(texts);
}

TEST(ShellEncodeFormTest, PrefersSingleQuotes) {
    EXPECT_EQ(Encode("photo"), "'photo'");
    EXPECT_EQ(Encode("a b"), "'a b'");
    EXPECT_EQ(Encode("x"), "'x'");
    EXPECT_EQ(Encode("it's"), R"('it'\''s')");
}

TEST(ShellEncodeFormTest, TakesBackslashesWhereSingleQuotesAreTooLong) {
    EXPECT_EQ(Encode("'"), R"(\')");
    EXPECT_EQ(Encode("a'b'"), R"(a\'b\')");
}

TEST(ShellEncodeFormTest, TakesDoubleQuotesForALineEndAmongManyQuotes) {
    EXPECT_EQ(Encode("\n'''"), "\"\n'''\"");
    EXPECT_EQ(Encode("'\n'$"), "\"'\n'\\$\"");
}

TEST(ShellEncodeFormTest, RefusesTheEmptyTextInItsBuffer) {
    QLIBCErrSetEx(0, "", 0);
    errno = 0;
    EXPECT_EQ(Encode(""), std::nullopt);
    EXPECT_EQ(errno, ERANGE);
    EXPECT_EQ(QLIBCErrGet(), 0x0E00);
    EXPECT_EQ(EncodeInto("", 3), "''");
}

TEST(ShellEncodeFormTest, RefusesABufferThatIsTooSmall) {
    EXPECT_EQ(EncodeInto("abc", 6), "'abc'");
    EXPECT_EQ(EncodeInto("abc", 5), "abc");
    EXPECT_EQ(EncodeInto("abc", 4), "abc");
    errno = 0;
    EXPECT_EQ(EncodeInto("abc", 3), std::nullopt);
    EXPECT_EQ(errno, ERANGE);
    EXPECT_EQ(EncodeInto("\n", 3), std::nullopt);
    EXPECT_EQ(EncodeInto("a b", 1), std::nullopt);
    EXPECT_EQ(EncodeInto("a b", 0), std::nullopt);
}

TEST(ShellEncodeFormTest, RefusesBadArguments) {
    char buffer[4] = "old";
    const auto expectRefused = [](const char* text, char* target, int size) {
        QLIBCErrSetEx(0, "", 0);
        errno = 0;
        EXPECT_LT(QLIBCEncShParam(text, target, size), 0);
        EXPECT_EQ(errno, EINVAL);
        EXPECT_EQ(QLIBCErrGet(), 0x0D00);
    };
    expectRefused("a", nullptr, 4);
    expectRefused("a", buffer, -1);
    expectRefused("a", buffer, 0);
    EXPECT_STREQ(buffer, "old");
    expectRefused(nullptr, buffer, 4);
    EXPECT_STREQ(buffer, "");
}

// Single quotes cost up to four bytes a byte, backslashes two but cannot hold a line end, double
// quotes two and the quotes themselves but one byte less for each line end. So between them every
// text but the empty one fits. All texts of up to six bytes over one byte of each kind show it.
TEST(ShellEncodeFormTest, FitsEveryTextButTheEmptyOne) {
    const std::string kinds = "a'\n\"$ ";
    int tried = 0;
    std::string text;
    const std::function<void(std::size_t)> extend = [&](std::size_t length) {
        if (length > 0) {
            ++tried;
            const std::optional<std::string> word = Encode(text);
            ASSERT_TRUE(word.has_value()) << Hex(text);
        }
        if (length == 6) {
            return;
        }
        for (const char kind : kinds) {
            text.push_back(kind);
            extend(length + 1);
            text.pop_back();
        }
    };
    extend(0);
    EXPECT_EQ(tried, 6 + 36 + 216 + 1296 + 7776 + 46656);
}

}  // namespace
