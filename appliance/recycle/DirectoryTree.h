#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "appliance/recycle/FileInfo.h"
#include "appliance/util/FileDescriptor.h"

namespace orva {

// The directories of one bin that a clean is concerned with, each known by its parent, its name and
// its inode. Gives open descriptors of them, of which only a bounded number is kept: a directory
// whose descriptor was closed is opened again name by name from the bin, following no link, and
// must be the same inode as before. Whether an open one is still in the bin is told by what lies
// above it. So neither a tree of any depth nor one that is changed meanwhile leads out of the bin.
//
// Threads: one at a time.
class DirectoryTree {
  public:
    using Index = std::uint32_t;
    static constexpr Index kBin = 0;

    // `binName` is the bin's name in the directory `parent`; both descriptors stay open as long as
    // the tree lives.
    DirectoryTree(FileDescriptor parent, const std::string& binName, FileDescriptor bin,
                  FileInfo binInfo);

    // Takes over the open directory `name` of `parent`. Throws std::length_error after 2^32-2 of
    // them.
    Index Add(Index parent, const char* name, FileDescriptor fd, std::uint64_t inode);

    // Forgets the directory that was added last.
    void DropLast();

    // Forgets `index` if it was added last; its descriptor is closed either way.
    void Drop(Index index);

    // An open descriptor, valid until the next call of Add, Fd or Drop; it is the tree's. -1 with
    // errno when the directory cannot be reached; ESTALE: it is not where it was.
    int Fd(Index index);

    // Whether the directory is still in the bin, and the bin under its name. Someone may have moved
    // either away since it was opened. Descriptors stay valid.
    bool IsInPlace(Index index);

    // Lets Fd look after the place of each directory anew, once, before it is used again.
    void Distrust() { ++trust; }

    // 0 for the bin, 1 for the directories in it.
    std::uint32_t Depth(Index index) const { return nodes[index].depth; }

    Index Parent(Index index) const { return nodes[index].parent; }
    const char* Name(Index index) const { return names.data() + nodes[index].name; }
    std::uint64_t Device() const { return device; }
    Index Count() const { return static_cast<Index>(nodes.size()); }

    // From the bin, with a slash at the end; empty for the bin itself.
    std::string Path(Index index) const;

    // Entries that are left in a directory, counted by the owner of the tree.
    std::uint32_t& Entries(Index index) { return nodes[index].entries; }

  private:
    static constexpr std::int16_t kNoSlot = -1;

    struct Node {
        std::uint64_t inode;
        std::uint64_t name;
        Index parent;
        std::uint32_t entries;
        std::uint32_t depth;
        std::int16_t slot;
    };
    struct Slot {
        FileDescriptor fd;
        Index node = 0;
        bool used = false;  // since the hand of its ring came by
        std::uint64_t trusted = 0;
    };
    // Slots of which the hand gives away the next that was not used since it came by last.
    struct Ring {
        std::vector<Slot>::size_type first, end, hand;
    };

    Slot& SlotOf(Index index) { return slots[static_cast<std::size_t>(nodes[index].slot)]; }
    bool IsBinNamed() const;
    bool IsBelowBin(int fd, std::uint32_t depth) const;
    bool IsOpenAndTrusted(Index index);
    int OpenChild(int parent, Index index);
    void Keep(Index index, FileDescriptor fd);
    void Close(Index index);

    FileDescriptor binParent;
    FileDescriptor binDirectory;
    std::uint64_t device;
    std::vector<Node> nodes;
    std::vector<char> names;
    std::vector<Slot> slots;
    Ring recent;
    Ring milestones;
    std::uint64_t trust = 0;  // counts how often trust ended
    std::uint64_t binTrusted = 0;
};

// Opens a directory without following a link; -1 with errno.
int OpenDirectoryAt(int parent, const char* name);

}  // namespace orva
