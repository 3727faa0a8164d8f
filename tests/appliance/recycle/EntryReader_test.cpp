#include "appliance/recycle/EntryReader.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <fstream>

#include "appliance/recycle/DirectoryTree.h"
#include "tests/appliance/recycle/BinTest.h"

namespace orva {
namespace {

class EntryReaderTest : public BinTest {
  protected:
    // Files of 0, 1, 2 and so on bytes.
    void Files(std::size_t count) {
        for (std::size_t at = 0; at < count; ++at) {
            names.push_back("file" + std::to_string(at));
            std::ofstream(InBin(names.back())) << std::string(at, 'x');
        }
    }

    std::vector<DirectoryEntry> Entries() const {
        std::vector<DirectoryEntry> entries;
        for (const std::string& name : names) {
            entries.push_back({0, name.c_str(), DT_REG});
        }
        return entries;
    }

    FileDescriptor OpenBinFolder() const {
        return FileDescriptor(OpenDirectoryAt(AT_FDCWD, BinPath().c_str()));
    }

    std::vector<std::string> names;
};

TEST_F(EntryReaderTest, DescribesEveryEntryInItsPlaceHoweverManyHelp) {
    Files(300);
    const FileDescriptor bin = OpenBinFolder();
    for (const unsigned helpers : {0U, 1U, 3U}) {
        EntryReader reader(helpers);
        for (int round = 0; round < 10; ++round) {
            const std::vector<EntryInfo>& infos = reader.Read(bin.Get(), Entries());
            ASSERT_EQ(infos.size(), 300U);
            for (std::size_t at = 0; at < 300; ++at) {
                ASSERT_EQ(infos[at].error, 0);
                ASSERT_EQ(infos[at].info.bytes, at);
            }
        }
    }
}

TEST_F(EntryReaderTest, TellsWhichEntriesAreGone) {
    Files(200);
    ASSERT_EQ(::unlink(InBin("file3").c_str()), 0);
    ASSERT_EQ(::unlink(InBin("file199").c_str()), 0);
    const FileDescriptor bin = OpenBinFolder();
    EntryReader reader(1);
    const std::vector<EntryInfo>& infos = reader.Read(bin.Get(), Entries());
    for (std::size_t at = 0; at < 200; ++at) {
        EXPECT_EQ(infos[at].error, at == 3 || at == 199 ? ENOENT : 0) << at;
    }
}

TEST_F(EntryReaderTest, ForgetsTheErrorsOfAnEarlierRead) {
    const FileDescriptor bin = OpenBinFolder();
    Files(2);
    EntryReader reader(1);
    ASSERT_EQ(::unlink(InBin("file1").c_str()), 0);
    EXPECT_EQ(reader.Read(bin.Get(), Entries())[1].error, ENOENT);
    std::ofstream(InBin("file1")) << "x";
    EXPECT_EQ(reader.Read(bin.Get(), Entries())[1].error, 0);
}

TEST_F(EntryReaderTest, DescribesLinksThemselves) {
    Files(1);
    ASSERT_EQ(::symlink("file0", InBin("link").c_str()), 0);
    names.emplace_back("link");
    const FileDescriptor bin = OpenBinFolder();
    EntryReader reader(1);
    const std::vector<EntryInfo>& infos = reader.Read(bin.Get(), Entries());
    EXPECT_EQ(infos[0].info.kind, FileKind::kFile);
    EXPECT_EQ(infos[1].info.kind, FileKind::kLink);
}

}  // namespace
}  // namespace orva
