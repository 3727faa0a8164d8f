#include "appliance/util/Journal.h"

#include <fcntl.h>
#include <stdlib.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <string>

#include "appliance/util/FileDescriptor.h"
#include "tests/appliance/util/Sandbox.h"

namespace {

class JournalTest : public Sandbox {
  protected:
    JournalTest()
        : file(::open((RootPath() + "/stream").c_str(), O_CREAT | O_RDWR | O_CLOEXEC, 0600)) {
        EXPECT_EQ(::fstat(file.Get(), &status), 0);
    }
    ~JournalTest() override { ::unsetenv("JOURNAL_STREAM"); }

    static void Name(unsigned long device, unsigned long inode) {
        const std::string name = std::to_string(device) + ":" + std::to_string(inode);
        ::setenv("JOURNAL_STREAM", name.c_str(), 1);
    }

    orva::FileDescriptor file;
    struct stat status {};
};

TEST_F(JournalTest, IsTheStreamThatTheEnvironmentNames) {
    Name(status.st_dev, status.st_ino);
    EXPECT_TRUE(orva::IsJournal(file.Get()));
}

TEST_F(JournalTest, AnotherFileIsNotTheJournalWhereverTheProgramWasStarted) {
    EXPECT_FALSE(orva::IsJournal(file.Get()));
    Name(status.st_dev, status.st_ino + 1);
    EXPECT_FALSE(orva::IsJournal(file.Get()));
    Name(status.st_dev + 1, status.st_ino);
    EXPECT_FALSE(orva::IsJournal(file.Get()));
    ::setenv("JOURNAL_STREAM", "", 1);
    EXPECT_FALSE(orva::IsJournal(file.Get()));
    Name(status.st_dev, status.st_ino);
    EXPECT_FALSE(orva::IsJournal(-1));
}

TEST_F(JournalTest, TheLogGoesToStandardErrorUnlessThatIsTheJournal) {
    struct stat standardError {};
    ASSERT_EQ(::fstat(STDERR_FILENO, &standardError), 0);
    EXPECT_EQ(orva::ForegroundLogOption(), LOG_PERROR);
    Name(standardError.st_dev, standardError.st_ino);
    EXPECT_EQ(orva::ForegroundLogOption(), 0);
}

}  // namespace
