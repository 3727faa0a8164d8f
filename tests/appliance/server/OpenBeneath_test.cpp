#include "appliance/server/OpenBeneath.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>
#include <string>

#include "tests/system/Process.h"

namespace {

using orva::FileDescriptor;
using OpenFunction = FileDescriptor (*)(int, const std::string&);

// Both ways keep the same promises.
class OpenBeneathTest : public testing::TestWithParam<OpenFunction> {
  protected:
    OpenBeneathTest() {
        sandbox.Write("outside", "outside");
        sandbox.Write("folder/file", "inside");
        sandbox.Write("folder/deep/deeper/file", "deep");
        folder = FileDescriptor(
            ::open((sandbox.Path() / "folder").c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    }

    std::string Read(const std::string& path) const {
        const FileDescriptor fd = GetParam()(folder.Get(), path);
        char content[100];
        const ssize_t size = fd.IsOpen() ? ::read(fd.Get(), content, sizeof content) : -1;
        return size < 0 ? "(none)" : std::string(content, static_cast<std::size_t>(size));
    }

    orva::test::Sandbox sandbox;
    FileDescriptor folder;
};

TEST_P(OpenBeneathTest, OpensWhatIsBelowTheFolder) {
    EXPECT_EQ(Read("file"), "inside");
    EXPECT_EQ(Read("deep/deeper/file"), "deep");
}

TEST_P(OpenBeneathTest, FollowsNoLink) {
    const std::filesystem::path inside = sandbox.Path() / "folder";
    std::filesystem::create_symlink("file", inside / "link");
    std::filesystem::create_symlink("../outside", inside / "out");
    std::filesystem::create_symlink(sandbox.Path() / "outside", inside / "absolute");
    std::filesystem::create_directory_symlink("deep", inside / "folderlink");
    std::filesystem::create_directory_symlink("..", inside / "up");
    for (const char* path :
         {"link", "out", "absolute", "folderlink/deeper/file", "up/outside", "up/folder/file"}) {
        EXPECT_EQ(Read(path), "(none)") << path;
    }
}

TEST_P(OpenBeneathTest, LeavesTheFolderByNoOtherWay) {
    const std::string absolute = (sandbox.Path() / "outside").string();
    for (const std::string& path :
         {std::string("../outside"), std::string("deep/../../outside"), absolute, "/" + absolute,
          std::string(".."), std::string("/"), std::string()}) {
        EXPECT_EQ(Read(path), "(none)") << path;
    }
}

TEST_P(OpenBeneathTest, OpensNothingWhereNothingIs) {
    for (const std::string& path :
         {std::string("none"), std::string("deep/none"), std::string("none/file"),
          std::string("file/file"), std::string(5000, 'x')}) {
        EXPECT_EQ(Read(path), "(none)") << path.substr(0, 20);
    }
}

TEST_P(OpenBeneathTest, DoesNotWaitForAPipe) {
    ASSERT_EQ(::mkfifo((sandbox.Path() / "folder/pipe").c_str(), 0600), 0);
    EXPECT_EQ(Read("pipe"), "");
}

INSTANTIATE_TEST_SUITE_P(OpenBeneathTest, OpenBeneathTest,
                         testing::Values(&orva::OpenBeneath, &orva::OpenBeneathByHand),
                         [](const auto& tested) {
                             return tested.index == 0 ? "ByTheKernel" : "ByHand";
                         });

}  // namespace
