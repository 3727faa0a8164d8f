#pragma once

#include <cstdint>
#include <cstring>
#include <memory>
#include <vector>

namespace orva {

// Many short names, back to back. A place stays valid as long as the store lives.
class NameStore {
  public:
    using Place = std::uint64_t;

    // `name` is at most 255 bytes long, as names of files are.
    Place Add(const char* name) {
        const std::size_t size = std::strlen(name) + 1;
        if (used + size > kBlock) {
            blocks.push_back(std::make_unique<char[]>(kBlock));
            used = 0;
        }
        std::memcpy(blocks.back().get() + used, name, size);
        const Place place = (blocks.size() - 1) * kBlock + used;
        used += size;
        return place;
    }

    const char* At(Place place) const { return blocks[place / kBlock].get() + place % kBlock; }

  private:
    static constexpr std::size_t kBlock = std::size_t{1} << 20;

    std::vector<std::unique_ptr<char[]>> blocks;
    std::size_t used = kBlock;
};

}  // namespace orva
