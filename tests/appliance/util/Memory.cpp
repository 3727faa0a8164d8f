#include "tests/appliance/util/Memory.h"

#include <cstddef>
#include <cstdlib>
#include <new>

namespace {

constexpr int kUnlimited = -1;
thread_local int allowedAllocations = kUnlimited;

void* Allocate(std::size_t bytes) {
    if (allowedAllocations == 0) {
        throw std::bad_alloc();
    }
    if (allowedAllocations > 0) {
        --allowedAllocations;
    }
    if (void* memory = std::malloc(bytes > 0 ? bytes : 1)) {
        return memory;
    }
    throw std::bad_alloc();
}

}  // namespace

void* operator new(std::size_t bytes) { return Allocate(bytes); }
void* operator new[](std::size_t bytes) { return Allocate(bytes); }
void operator delete(void* memory) noexcept { std::free(memory); }
void operator delete[](void* memory) noexcept { std::free(memory); }
void operator delete(void* memory, std::size_t) noexcept { std::free(memory); }
void operator delete[](void* memory, std::size_t) noexcept { std::free(memory); }

ShortMemory::ShortMemory(int allowed) { allowedAllocations = allowed; }
ShortMemory::~ShortMemory() { allowedAllocations = kUnlimited; }
