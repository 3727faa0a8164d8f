#include "appliance/modules/LoginAccounts.h"

#include <pwd.h>
#include <unistd.h>

#include <mutex>
#include <set>

namespace orva {
namespace {

constexpr const char* kRoot = "root";
// What an account without a shell logs in with.
constexpr const char* kUsualShell = "/bin/sh";

std::set<std::string> LoginShells() {
    std::set<std::string> shells;
    ::setusershell();
    while (const char* shell = ::getusershell()) {
        shells.insert(shell);
    }
    ::endusershell();
    return shells;
}

}  // namespace

std::vector<std::string> LoginAccounts() {
    // The C library walks the accounts with one position for the whole process.
    static std::mutex mutex;
    const std::lock_guard lock(mutex);
    const std::set<std::string> shells = LoginShells();
    std::set<std::string> names;
    ::setpwent();
    while (const passwd* account = ::getpwent()) {
        const std::string shell = account->pw_shell == nullptr ? "" : account->pw_shell;
        if (shells.count(shell.empty() ? kUsualShell : shell) != 0) {
            names.insert(account->pw_name);
        }
    }
    ::endpwent();
    names.erase(kRoot);
    std::vector<std::string> accounts = {kRoot};
    accounts.insert(accounts.end(), names.begin(), names.end());
    return accounts;
}

}  // namespace orva
