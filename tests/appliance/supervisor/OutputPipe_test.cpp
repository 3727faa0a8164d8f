#include "appliance/supervisor/OutputPipe.h"

#include <fcntl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <thread>

#include "tests/appliance/util/Sandbox.h"

namespace {

class OutputPipeTest : public Sandbox {
  protected:
    OutputPipeTest() : writer(orva::OutputWriter::Create(RootPath() + "/output")) {
        EXPECT_TRUE(writer);
        EXPECT_TRUE(pipe.Open());
    }

    static void Print(int file, std::string_view text) {
        ASSERT_EQ(::write(file, text.data(), text.size()), static_cast<ssize_t>(text.size()));
    }

    // Runs `work` in a process of its own and keeps what that prints until it has ended.
    void KeepOutputOf(const std::function<void(int)>& work) {
        const pid_t child = ::fork();
        ASSERT_GE(child, 0);
        if (child == 0) {
            work(pipe.WritingEnd());
            ::_exit(EXIT_SUCCESS);
        }
        const orva::FileDescriptor watch(static_cast<int>(::syscall(SYS_pidfd_open, child, 0)));
        ASSERT_TRUE(watch.IsOpen());
        pipe.KeepUntilEnd(*writer, watch.Get());
        EXPECT_EQ(::waitpid(child, nullptr, 0), child);
    }

    std::string Kept() const { return orva::ReadOutput(RootPath() + "/output")->head; }

    std::optional<orva::OutputWriter> writer;
    orva::OutputPipe pipe;
};

TEST_F(OutputPipeTest, KeepsAllThatIsPrintedUntilTheEnd) {
    KeepOutputOf([](int file) {
        for (int line = 0; line < 1000; ++line) {
            Print(file, "0123456789abcdefghijklmnopqrstuvwxyz\n");
        }
    });
    EXPECT_EQ(orva::ReadOutput(RootPath() + "/output")->bytes, 37'000U);
    EXPECT_EQ(Kept().substr(0, 37), "0123456789abcdefghijklmnopqrstuvwxyz\n");
}

TEST_F(OutputPipeTest, ACommandThatHasClosedItsOutputIsStillWaitedFor) {
    const std::string go = RootPath() + "/go";
    const pid_t child = ::fork();
    ASSERT_GE(child, 0);
    if (child == 0) {
        Print(pipe.WritingEnd(), "early\n");
        pipe.CloseWritingEnd();
        while (::access(go.c_str(), F_OK) != 0) {
            ::usleep(1000);
        }
        ::_exit(EXIT_SUCCESS);
    }
    pipe.CloseWritingEnd();
    const orva::FileDescriptor watch(static_cast<int>(::syscall(SYS_pidfd_open, child, 0)));
    std::thread ends([&go, this] {
        while (Kept() != "early\n") {
            std::this_thread::yield();
        }
        Write("/go", "");
    });
    pipe.KeepUntilEnd(*writer, watch.Get());
    EXPECT_EQ(::access(go.c_str(), F_OK), 0);
    ends.join();
    EXPECT_EQ(::waitpid(child, nullptr, WNOHANG), child);
    EXPECT_EQ(Kept(), "early\n");
}

TEST_F(OutputPipeTest, KeepsWhatIsThereWithoutWaitingForMore) {
    Print(pipe.WritingEnd(), "there");
    pipe.KeepWhatIsThere(*writer);
    EXPECT_EQ(Kept(), "there");
    pipe.KeepWhatIsThere(*writer);
    EXPECT_EQ(Kept(), "there");
}

TEST_F(OutputPipeTest, KeepsWhatIsPrintedForAWhile) {
    Print(pipe.WritingEnd(), "soon");
    pipe.KeepFor(*writer, 20);
    EXPECT_EQ(Kept(), "soon");
    pipe.CloseWritingEnd();
    pipe.KeepFor(*writer, 20);
    EXPECT_EQ(Kept(), "soon");
}

TEST_F(OutputPipeTest, NoProgramThatIsStartedInheritsIt) {
    EXPECT_EQ(::fcntl(pipe.WritingEnd(), F_GETFD), FD_CLOEXEC);
}

}  // namespace
