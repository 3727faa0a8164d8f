#include "appliance/server/Secret.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <set>
#include <string>

#include "appliance/util/FileDescriptor.h"
#include "tests/system/Process.h"

namespace {

TEST(SecretTest, IsAsManyHexadecimalDigitsAsItsBytesNeed) {
    std::set<std::string> secrets;
    for (int i = 0; i < 100; ++i) {
        const std::optional<std::string> secret = orva::MakeSecret(32);
        ASSERT_TRUE(secret.has_value());
        EXPECT_EQ(secret->size(), 64U);
        EXPECT_EQ(secret->find_first_not_of("0123456789abcdef"), std::string::npos);
        secrets.insert(*secret);
    }
    EXPECT_EQ(secrets.size(), 100U);
}

TEST(SecretTest, IsTheSameOnlyWhenEveryByteIs) {
    EXPECT_TRUE(orva::SameSecret("", ""));
    EXPECT_TRUE(orva::SameSecret("secret", "secret"));
    EXPECT_FALSE(orva::SameSecret("secret", "Secret"));
    EXPECT_FALSE(orva::SameSecret("secret", "secreT"));
    EXPECT_FALSE(orva::SameSecret("secret", "secret1"));
    EXPECT_FALSE(orva::SameSecret("secret", ""));
}

TEST(SecretTest, HasTheDigestsThatEverybodyElseMakesToo) {
    EXPECT_EQ(orva::ToHex(orva::Sha256("abc")),
              "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad");
    EXPECT_EQ(orva::ToHex(orva::Sha256Keyed("Jefe", "what do ya want for nothing?")),
              "5bdcc146bf60754e6a042426089575c75a003f089d2739839dec58b964ec3843");
}

TEST(SecretTest, StandsInAFileThatIsForItsOwnerOnly) {
    const orva::test::Sandbox sandbox;
    const std::string file = sandbox.Write("secret", "content");
    const auto examine = [&](mode_t mode) {
        ::chmod(file.c_str(), mode);
        const orva::FileDescriptor fd(::open(file.c_str(), O_RDONLY | O_CLOEXEC));
        return orva::ExamineSecretFile(fd.Get());
    };
    EXPECT_EQ(examine(0600), "");
    EXPECT_EQ(examine(0400), "");
    for (const mode_t mode : {0640U, 0620U, 0610U, 0604U, 0602U, 0601U}) {
        EXPECT_EQ(examine(mode), "group or others may read or write it; chmod 600 is needed")
            << mode;
    }
    const orva::FileDescriptor folder(
        ::open(sandbox.Path().c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    EXPECT_EQ(orva::ExamineSecretFile(folder.Get()), "it is no regular file");
}

}  // namespace
