#pragma once

#include <atomic>
#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <mutex>
#include <thread>
#include <vector>

#include "appliance/recycle/FileInfo.h"

namespace orva {

// One name of a directory, as the directory lists it.
struct DirectoryEntry {
    std::uint64_t inode;
    const char* name;
    unsigned char type;  // DT_DIR and so on; DT_UNKNOWN on some file systems
};

// What a name stands for.
struct EntryInfo {
    FileInfo info;
    int error = 0;  // why `info` could not be read: an errno
};

// Reads what many entries of one directory stand for, with a few threads at once: most of the time
// goes into finding names and loading inodes, and disks answer several such questions together
// sooner than one after the other.
class EntryReader {
  public:
    // `helpers`: threads beside the caller's; they are started when there is enough to do.
    explicit EntryReader(unsigned helpers = DefaultHelpers());
    ~EntryReader();
    EntryReader(const EntryReader&) = delete;
    EntryReader& operator=(const EntryReader&) = delete;

    // What each of the entries stands for, in their order and valid until the next call. Those that
    // are listed as directories are not looked at. One call at a time.
    const std::vector<EntryInfo>& Read(int directory, const std::vector<DirectoryEntry>& entries);

    static unsigned DefaultHelpers();

  private:
    void StartHelpers();
    void Help();
    void ReadSome();

    const unsigned wantedHelpers;
    bool started = false;
    std::vector<std::thread> threads;

    std::mutex mutex;
    std::condition_variable changed;
    std::uint64_t round = 0;
    bool open = false;        // whether helpers may still join the round
    std::size_t working = 0;  // helpers in it
    bool ending = false;

    // Of the round; written before it begins.
    int fd = -1;
    const std::vector<DirectoryEntry>* batch = nullptr;
    std::vector<EntryInfo> infos;
    std::atomic<std::size_t> next = 0;
};

}  // namespace orva
