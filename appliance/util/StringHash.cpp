#include <algorithm>
#include <cstddef>
#include <functional>
#include <memory>
#include <new>
#include <string>
#include <string_view>
#include <unordered_map>

#include "appliance/util/Error.h"
#include "platform/qlibc.h"

namespace {

// A caller's guess must not take memory that may never be used; beyond this the table simply grows.
constexpr int kMaxReserved = 65536;

struct TextHash {
    using is_transparent = void;
    std::size_t operator()(std::string_view text) const {
        return std::hash<std::string_view>()(text);
    }
};

}  // namespace

struct QLIBC_SZHASH {
    // Entries keep their place when the table grows, so that pointers from QLIBCSzHashGetValue stay
    // good.
    std::unordered_map<std::string, std::string, TextHash, std::equal_to<>> values;
};

QLIBC_SZHASH* QLIBCSzHashAlloc(int size) {
    if (size <= 0) {
        orva::Fail(orva::kErrBadArgument);
        return nullptr;
    }
    try {
        auto hash = std::make_unique<QLIBC_SZHASH>();
        hash->values.reserve(static_cast<std::size_t>(std::min(size, kMaxReserved)));
        return hash.release();
    } catch (const std::bad_alloc&) {
        orva::Fail(orva::kErrNoMemory);
        return nullptr;
    }
}

int QLIBCSzHashSetValue(QLIBC_SZHASH** hash, const char* key, const char* value) {
    if (hash == nullptr || *hash == nullptr || key == nullptr || value == nullptr) {
        return orva::Fail(orva::kErrBadArgument);
    }
    try {
        (*hash)->values.insert_or_assign(key, value);
    } catch (const std::bad_alloc&) {
        return orva::Fail(orva::kErrNoMemory);
    }
    return 0;
}

const char* QLIBCSzHashGetValue(const QLIBC_SZHASH* hash, const char* key) {
    if (hash == nullptr || key == nullptr) {
        orva::Fail(orva::kErrBadArgument);
        return nullptr;
    }
    const auto found = hash->values.find(std::string_view(key));
    return found != hash->values.end() ? found->second.c_str() : nullptr;
}

void QLIBCSzHashFree(QLIBC_SZHASH* hash) { delete hash; }
