#include "appliance/util/CallScope.h"

namespace orva {
namespace {

thread_local std::uint64_t calls = 0;
thread_local std::uint64_t current = 0;

}  // namespace

CallScope::CallScope() { current = ++calls; }

CallScope::~CallScope() { current = 0; }

std::uint64_t CallScope::Current() { return current; }

}  // namespace orva
