#include <cerrno>
#include <cstddef>
#include <cstring>
#include <string_view>

#include "appliance/util/Error.h"
#include "platform/qlibc.h"

namespace {

// Writes into a buffer of fixed size and keeps counting when it is full.
class Writer {
  public:
    Writer(char* target, std::size_t bytes) : buffer(target), size(bytes) {}

    void Put(char byte) {
        if (used < size) {
            buffer[used] = byte;
        }
        ++used;
    }

    void Put(std::string_view bytes) {
        for (const char byte : bytes) {
            Put(byte);
        }
    }

    // Ends the text; false when it did not fit.
    bool Finish() {
        Put('\0');
        return used <= size;
    }

  private:
    char* buffer;
    std::size_t size;
    std::size_t used = 0;
};

bool InSingleQuotes(std::string_view text, Writer writer) {
    writer.Put('\'');
    for (const char byte : text) {
        if (byte == '\'') {
            writer.Put("'\\''");
        } else {
            writer.Put(byte);
        }
    }
    writer.Put('\'');
    return writer.Finish();
}

// Bytes that no shell gives a meaning, wherever in a word they stand. Bytes above 127 are not among
// them: in some locales one of them is a blank.
bool IsPlain(char byte) {
    constexpr std::string_view kPlain =
        "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789_-./:,@%+";
    return kPlain.find(byte) != std::string_view::npos;
}

// At most twice the text's length. A backslash before a newline would join two lines, so a text
// with a newline has no such form.
bool WithBackslashes(std::string_view text, Writer writer) {
    if (text.empty() || text.find('\n') != std::string_view::npos) {
        return false;
    }
    for (const char byte : text) {
        if (!IsPlain(byte)) {
            writer.Put('\\');
        }
        writer.Put(byte);
    }
    return writer.Finish();
}

// At most twice the text's length and the two quotes, less one byte for every newline: the form for
// texts with a newline and many single quotes.
bool InDoubleQuotes(std::string_view text, Writer writer) {
    constexpr std::string_view kSpecial = "$`\"\\";
    writer.Put('"');
    for (const char byte : text) {
        if (kSpecial.find(byte) != std::string_view::npos) {
            writer.Put('\\');
        }
        writer.Put(byte);
    }
    writer.Put('"');
    return writer.Finish();
}

}  // namespace

int QLIBCEncShParam(const char* text, char* buffer, int size) {
    if (buffer == nullptr || size <= 0) {
        errno = EINVAL;
        return orva::Fail(orva::kErrBadArgument);
    }
    buffer[0] = '\0';
    if (text == nullptr) {
        errno = EINVAL;
        return orva::Fail(orva::kErrBadArgument);
    }
    const std::string_view word(text);
    const Writer writer(buffer, static_cast<std::size_t>(size));
    if (InSingleQuotes(word, writer) || WithBackslashes(word, writer) ||
        InDoubleQuotes(word, writer)) {
        return 0;
    }
    buffer[0] = '\0';
    errno = ERANGE;
    return orva::Fail(orva::kErrTooLong);
}
