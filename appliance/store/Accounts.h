// The machine's user accounts, as its name services know them.
//
// Threads: any.
#pragma once

#include <sys/types.h>

#include <string>

namespace orva {

// Whether there is an account of that name. False too when the name services cannot be asked.
bool AccountExists(const std::string& name);

// The name of the account with that user id; empty when there is none.
std::string AccountName(uid_t user);

// The account that this program runs as.
const std::string& OwnAccount();

}  // namespace orva
