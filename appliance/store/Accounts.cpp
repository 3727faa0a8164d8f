#include "appliance/store/Accounts.h"

#include <pwd.h>
#include <unistd.h>

#include <cerrno>
#include <vector>

namespace orva {
namespace {

constexpr std::size_t kUsualEntry = 1024;
constexpr std::size_t kLargestEntry = 1024 * kUsualEntry;

// Calls `lookUp(entry, buffer, size, result)`, one of the reentrant look-ups, with a buffer that
// grows until the account fits. Yields the account's name; empty when there is none.
template <class LookUp>
std::string NameOf(LookUp lookUp) {
    std::vector<char> buffer(kUsualEntry);
    for (;;) {
        passwd entry{};
        passwd* found = nullptr;
        const int error = lookUp(&entry, buffer.data(), buffer.size(), &found);
        if (error == ERANGE && buffer.size() < kLargestEntry) {
            buffer.resize(buffer.size() * 2);
            continue;
        }
        return error == 0 && found != nullptr ? found->pw_name : "";
    }
}

}  // namespace

bool AccountExists(const std::string& name) {
    // The C interface would look for what stands before the NUL.
    if (name.empty() || name.find('\0') != std::string::npos) {
        return false;
    }
    return !NameOf([&name](passwd* entry, char* buffer, std::size_t size, passwd** found) {
                return ::getpwnam_r(name.c_str(), entry, buffer, size, found);
            }).empty();
}

std::string AccountName(uid_t user) {
    return NameOf([user](passwd* entry, char* buffer, std::size_t size, passwd** found) {
        return ::getpwuid_r(user, entry, buffer, size, found);
    });
}

const std::string& OwnAccount() {
    static const std::string account = AccountName(::geteuid());
    return account;
}

}  // namespace orva
