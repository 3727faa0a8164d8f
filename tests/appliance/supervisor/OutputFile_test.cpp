#include "appliance/supervisor/OutputFile.h"

#include <sys/stat.h>

#include <cerrno>
#include <thread>

#include "tests/appliance/util/Sandbox.h"

namespace {

constexpr std::size_t kPart = 65536;

// Bytes by which each place of a long output differs from its neighbours.
std::string Pattern(std::size_t size) {
    std::string text(size, '\0');
    for (std::size_t at = 0; at < size; ++at) {
        text[at] = static_cast<char>('!' + (at * 31 + at / 251 + at / 65536) % 90);
    }
    return text;
}

class OutputFileTest : public Sandbox {
  protected:
    std::string Path() const { return RootPath() + "/output"; }

    orva::StoredOutput Stored() const {
        const std::optional<orva::StoredOutput> output = orva::ReadOutput(Path());
        EXPECT_TRUE(output);
        return output.value_or(orva::StoredOutput());
    }
};

TEST_F(OutputFileTest, TakesAllItsSpaceWhenItIsMade) {
    const std::optional<orva::OutputWriter> writer = orva::OutputWriter::Create(Path());
    ASSERT_TRUE(writer);
    struct stat status {};
    ASSERT_EQ(::stat(Path().c_str(), &status), 0);
    EXPECT_GE(status.st_blocks * 512, static_cast<long>(2 * kPart));
    EXPECT_EQ(status.st_mode & 07777, 0640U);
    EXPECT_EQ(Stored(), orva::StoredOutput());
}

TEST_F(OutputFileTest, KeepsAllOfAnOutputUpToTwoParts) {
    for (const std::size_t size :
         {std::size_t{1}, kPart - 1, kPart, kPart + 1, 2 * kPart - 1, 2 * kPart}) {
        std::optional<orva::OutputWriter> writer = orva::OutputWriter::Create(Path());
        ASSERT_TRUE(writer);
        const std::string text = Pattern(size);
        writer->Append(text);
        const orva::StoredOutput output = Stored();
        EXPECT_EQ(output.bytes, size);
        EXPECT_EQ(output.dropped, 0U);
        EXPECT_TRUE(output.head + output.tail == text) << size;
        EXPECT_LE(output.head.size(), kPart);
        EXPECT_LE(output.tail.size(), kPart);
    }
}

TEST_F(OutputFileTest, DropsTheMiddleOfALongOutputWhateverThePiecesAre) {
    const std::string text = Pattern(1'000'003);
    for (const std::size_t piece : {std::size_t{1000}, std::size_t{65536}, std::size_t{70001},
                                    std::size_t{300000}, text.size()}) {
        std::optional<orva::OutputWriter> writer = orva::OutputWriter::Create(Path());
        ASSERT_TRUE(writer);
        for (std::size_t at = 0; at < text.size(); at += piece) {
            writer->Append(std::string_view(text).substr(at, piece));
        }
        EXPECT_TRUE(writer->Sync());
        const orva::StoredOutput output = Stored();
        EXPECT_EQ(output.bytes, 1'000'003U);
        EXPECT_EQ(output.dropped, 1'000'003U - 2 * kPart);
        EXPECT_TRUE(output.head == text.substr(0, kPart)) << piece;
        EXPECT_TRUE(output.tail == text.substr(text.size() - kPart)) << piece;
    }
}

TEST_F(OutputFileTest, AReaderMeanwhileSeesOnlyBytesThatBelongThere) {
    std::optional<orva::OutputWriter> writer = orva::OutputWriter::Create(Path());
    ASSERT_TRUE(writer);
    const std::string text = Pattern(std::size_t{24} * 1024 * 1024);
    std::thread writing([&] {
        for (std::size_t at = 0; at < text.size(); at += 10'007) {
            writer->Append(std::string_view(text).substr(at, 10'007));
        }
    });
    std::uint64_t seen = 0;
    while (seen < text.size()) {
        const orva::StoredOutput output = Stored();
        EXPECT_GE(output.bytes, seen);
        seen = output.bytes;
        EXPECT_EQ(output.head.size() + output.dropped + output.tail.size(), output.bytes);
        EXPECT_EQ(text.compare(0, output.head.size(), output.head), 0);
        EXPECT_EQ(
            text.compare(output.head.size() + output.dropped, output.tail.size(), output.tail), 0);
        if (HasFailure()) {
            break;
        }
    }
    writing.join();
}

TEST_F(OutputFileTest, AFileWithoutItsWholeSpaceIsNone) {
    EXPECT_FALSE(orva::ReadOutput(Path()));
    Write("/output", "half");
    EXPECT_FALSE(orva::ReadOutput(Path()));
}

TEST_F(OutputFileTest, SaysWhyItCannotBeMade) {
    EXPECT_FALSE(orva::OutputWriter::Create(RootPath() + "/none/output"));
    EXPECT_EQ(errno, ENOENT);
}

}  // namespace
