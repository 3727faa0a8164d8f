#include "appliance/server/AccessToken.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <string>
#include <thread>
#include <vector>

#include "tests/system/Process.h"

namespace {

using orva::AccessToken;
using testing::HasSubstr;
using testing::MatchesRegex;

constexpr char kDigits[] = "00112233445566778899aabbccddeeff00112233445566778899AABBCCDDEEFF";

class AccessTokenTest : public testing::Test {
  protected:
    std::string File() const { return (sandbox.Path() / "etc/webapi.token").string(); }

    void Write(const std::string& content, mode_t mode = 0600) const {
        ::chmod(sandbox.Write("etc/webapi.token", content).c_str(), mode);
    }

    // Why the file is refused.
    std::string Refusal() const {
        std::string error;
        EXPECT_FALSE(AccessToken::LoadOrCreate(File(), error).has_value());
        return error;
    }

    orva::test::Sandbox sandbox;
};

TEST_F(AccessTokenTest, IsMadeAtTheFirstStart) {
    std::string error;
    const auto token = AccessToken::LoadOrCreate(File(), error);
    ASSERT_TRUE(token.has_value()) << error;
    const std::string content = orva::test::ReadWholeFile(File());
    EXPECT_THAT(content, MatchesRegex("[0-9a-f]+\n"));
    ASSERT_EQ(content.size(), 65U);
    EXPECT_TRUE(token->Matches(content.substr(0, 64)));
}

TEST_F(AccessTokenTest, IsNotMadeWhereItIsOnlyRead) {
    std::string error;
    EXPECT_FALSE(AccessToken::Load(File(), error).has_value());
    EXPECT_EQ(error, "cannot use the token file " + File() + ": No such file or directory");
    EXPECT_FALSE(std::filesystem::exists(File()));
    Write(kDigits);
    EXPECT_TRUE(AccessToken::Load(File(), error).has_value());
}

TEST_F(AccessTokenTest, SignsWhatOnlyItsHolderCanSign) {
    std::string error;
    Write(kDigits);
    const auto token = AccessToken::Load(File(), error);
    const std::string signature = orva::ToHex(token->Sign("text"));
    EXPECT_EQ(orva::ToHex(token->Sign("text")), signature);
    EXPECT_NE(orva::ToHex(token->Sign("texT")), signature);
    Write(std::string(64, '0'));
    EXPECT_NE(orva::ToHex(AccessToken::Load(File(), error)->Sign("text")), signature);
}

TEST_F(AccessTokenTest, IsReadableForItsOwnerOnlyWhateverTheUmask) {
    const mode_t before = ::umask(0);
    std::string error;
    ASSERT_TRUE(AccessToken::LoadOrCreate(File(), error).has_value()) << error;
    ::umask(before);
    struct stat status {};
    ASSERT_EQ(::stat(File().c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777U, 0600U);
}

TEST_F(AccessTokenTest, LeavesNothingElseBehind) {
    std::string error;
    ASSERT_TRUE(AccessToken::LoadOrCreate(File(), error).has_value()) << error;
    int files = 0;
    for ([[maybe_unused]] const auto& entry :
         std::filesystem::directory_iterator(sandbox.Path() / "etc")) {
        ++files;
    }
    EXPECT_EQ(files, 1);
}

TEST_F(AccessTokenTest, StaysTheSameAtTheNextStart) {
    std::string error;
    ASSERT_TRUE(AccessToken::LoadOrCreate(File(), error).has_value()) << error;
    const std::string content = orva::test::ReadWholeFile(File());
    ASSERT_TRUE(AccessToken::LoadOrCreate(File(), error).has_value()) << error;
    EXPECT_EQ(orva::test::ReadWholeFile(File()), content);
}

TEST_F(AccessTokenTest, DiffersFromApplianceToAppliance) {
    std::string error;
    const std::string other = (sandbox.Path() / "other").string();
    ASSERT_TRUE(AccessToken::LoadOrCreate(File(), error).has_value()) << error;
    ASSERT_TRUE(AccessToken::LoadOrCreate(other, error).has_value()) << error;
    EXPECT_NE(orva::test::ReadWholeFile(File()), orva::test::ReadWholeFile(other));
}

TEST_F(AccessTokenTest, IsOneForAllServersThatStartTogether) {
    std::vector<std::thread> servers;
    std::vector<std::optional<AccessToken>> tokens(8);
    for (std::optional<AccessToken>& token : tokens) {
        servers.emplace_back([this, &token] {
            std::string error;
            token = AccessToken::LoadOrCreate(File(), error);
        });
    }
    for (std::thread& server : servers) {
        server.join();
    }
    const std::string digits = orva::test::ReadWholeFile(File()).substr(0, 64);
    for (const std::optional<AccessToken>& token : tokens) {
        ASSERT_TRUE(token.has_value());
        EXPECT_TRUE(token->Matches(digits));
    }
}

TEST_F(AccessTokenTest, MatchesItselfOnly) {
    Write(kDigits);
    std::string error;
    const auto token = AccessToken::LoadOrCreate(File(), error);
    ASSERT_TRUE(token.has_value()) << error;
    EXPECT_TRUE(token->Matches(kDigits));
    std::string other = kDigits;
    other.back() = '0';
    EXPECT_FALSE(token->Matches(other));
    other = kDigits;
    other.front() = '1';
    EXPECT_FALSE(token->Matches(other));
    EXPECT_FALSE(token->Matches(""));
    EXPECT_FALSE(token->Matches(std::string(kDigits) + "0"));
    EXPECT_FALSE(token->Matches(std::string(kDigits).substr(1)));
    EXPECT_FALSE(token->Matches(std::string(100000, '0')));
}

TEST_F(AccessTokenTest, RefusesAFileThatOthersMayReadOrWrite) {
    for (const mode_t mode : {0640U, 0604U, 0620U, 0602U, 0644U}) {
        Write(kDigits, mode);
        EXPECT_EQ(Refusal(), "cannot use the token file " + File() +
                                 ": group or others may read or write it; chmod 600 is needed");
    }
}

TEST_F(AccessTokenTest, RefusesAFileWithoutAToken) {
    for (const std::string& content :
         {std::string(), std::string("\n"), std::string("secret"), std::string(kDigits, 63),
          std::string(kDigits) + "0", std::string(kDigits) + "\n\n", std::string(kDigits, 63) + "g",
          std::string(64, '\0')}) {
        Write(content);
        EXPECT_EQ(Refusal(), "cannot use the token file " + File() +
                                 ": it does not hold a token of 64 hexadecimal digits");
    }
}

TEST_F(AccessTokenTest, RefusesWhatIsNoRegularFile) {
    std::filesystem::create_directories(File());
    EXPECT_THAT(Refusal(), HasSubstr("it is no regular file"));
    std::filesystem::remove(File());
    sandbox.Write("elsewhere", kDigits);
    std::filesystem::create_symlink(sandbox.Path() / "elsewhere", File());
    EXPECT_THAT(Refusal(), HasSubstr("cannot use the token file"));
    std::filesystem::remove(File());
    ASSERT_EQ(::mkfifo(File().c_str(), 0600), 0);
    EXPECT_THAT(Refusal(), HasSubstr("it is no regular file"));
}

TEST_F(AccessTokenTest, RefusesAFileOfAStranger) {
    if (::geteuid() != 0) {
        // Only root can give a file away; without it a stranger's file cannot be made to order.
        Write(kDigits);
        std::string error;
        EXPECT_TRUE(AccessToken::LoadOrCreate(File(), error).has_value());
        return;
    }
    Write(kDigits);
    ASSERT_EQ(::chown(File().c_str(), 65534, 65534), 0);
    EXPECT_THAT(Refusal(), HasSubstr("it belongs to another account"));
}

TEST_F(AccessTokenTest, SaysWhenTheFileCannotBeMade) {
    sandbox.Write("etc", "a file where the directory should be");
    EXPECT_THAT(Refusal(), HasSubstr("token file " + File() + ": Not a directory"));
}

}  // namespace
