#include "appliance/recycle/EntryReader.h"

#include <dirent.h>

#include <algorithm>
#include <system_error>

namespace orva {
namespace {

// Fewer are read sooner than a sleeping thread wakes up.
constexpr std::size_t kWorthHelp = 128;

// What a thread takes at a time: neighbours in the inode tables.
constexpr std::size_t kShare = 32;

constexpr unsigned kMostHelpers = 3;

}  // namespace

EntryReader::EntryReader(unsigned helpers) : wantedHelpers(helpers) {}

EntryReader::~EntryReader() {
    {
        const std::lock_guard lock(mutex);
        ending = true;
    }
    changed.notify_all();
    for (std::thread& thread : threads) {
        thread.join();
    }
}

unsigned EntryReader::DefaultHelpers() {
    const unsigned processors = std::max(std::thread::hardware_concurrency(), 1U);
    return std::min(processors - 1, kMostHelpers);
}

const std::vector<EntryInfo>& EntryReader::Read(int directory,
                                                const std::vector<DirectoryEntry>& entries) {
    fd = directory;
    batch = &entries;
    infos.resize(entries.size());
    next = 0;
    const bool together = entries.size() >= kWorthHelp;
    if (together) {
        StartHelpers();
        {
            const std::lock_guard lock(mutex);
            ++round;
            open = true;
        }
        changed.notify_all();
    }
    ReadSome();
    if (together) {
        // Only for those who came in time.
        std::unique_lock lock(mutex);
        open = false;
        changed.wait(lock, [this] { return working == 0; });
    }
    return infos;
}

void EntryReader::StartHelpers() {
    if (started) {
        return;
    }
    started = true;
    threads.reserve(wantedHelpers);
    try {
        while (threads.size() < wantedHelpers) {
            threads.emplace_back([this] { Help(); });
        }
    } catch (const std::system_error&) {
        // As many as the machine allows; none will do.
    }
}

void EntryReader::Help() {
    std::uint64_t seen = 0;
    std::unique_lock lock(mutex);
    for (;;) {
        changed.wait(lock, [&] { return ending || (open && round != seen); });
        if (ending) {
            return;
        }
        seen = round;
        ++working;
        lock.unlock();
        ReadSome();
        lock.lock();
        if (--working == 0) {
            changed.notify_all();
        }
    }
}

void EntryReader::ReadSome() {
    for (;;) {
        const std::size_t first = next.fetch_add(kShare, std::memory_order_relaxed);
        if (first >= batch->size()) {
            return;
        }
        const std::size_t last = std::min(first + kShare, batch->size());
        for (std::size_t at = first; at < last; ++at) {
            const DirectoryEntry& entry = (*batch)[at];
            if (entry.type != DT_DIR) {
                infos[at].error = ReadFileInfo(fd, entry.name, infos[at].info);
            }
        }
    }
}

}  // namespace orva
