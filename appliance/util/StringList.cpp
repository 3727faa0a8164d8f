#include <algorithm>
#include <climits>
#include <cstddef>
#include <cstring>
#include <memory>
#include <stdexcept>
#include <vector>

#include "appliance/util/Error.h"
#include "platform/qlibc.h"

namespace {

// A caller's guess must not take memory that may never be used; beyond this the list simply grows.
constexpr int kMaxReserved = 65536;

struct List : QLIBC_SZLIST {
    // Texts keep their place when the list grows, so that pointers from QLIBCSzListGet stay good.
    std::vector<std::unique_ptr<char[]>> texts;
};

}  // namespace

QLIBC_SZLIST* QLIBCSzListAlloc(int capacity) {
    if (capacity < 0) {
        orva::Fail(orva::kErrBadArgument);
        return nullptr;
    }
    try {
        auto list = std::make_unique<List>();
        list->count = 0;
        list->texts.reserve(static_cast<std::size_t>(std::min(capacity, kMaxReserved)));
        return list.release();
    } catch (const std::bad_alloc&) {
        orva::Fail(orva::kErrNoMemory);
        return nullptr;
    }
}

const char* QLIBCSzListGet(const QLIBC_SZLIST* list, int index) {
    if (list == nullptr || index < 0 || index >= list->count) {
        orva::Fail(orva::kErrBadArgument);
        return nullptr;
    }
    return static_cast<const List*>(list)->texts[static_cast<std::size_t>(index)].get();
}

int QLIBCSzListPush(QLIBC_SZLIST* list, const char* text) {
    if (list == nullptr || text == nullptr || list->count == INT_MAX) {
        return orva::Fail(orva::kErrBadArgument);
    }
    auto& texts = static_cast<List*>(list)->texts;
    try {
        const std::size_t bytes = std::strlen(text) + 1;
        auto copy = std::make_unique<char[]>(bytes);
        std::memcpy(copy.get(), text, bytes);
        texts.push_back(std::move(copy));
    } catch (const std::bad_alloc&) {
        return orva::Fail(orva::kErrNoMemory);
    }
    return ++list->count;
}

void QLIBCSzListFree(QLIBC_SZLIST* list) { delete static_cast<List*>(list); }
