#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "appliance/recycle/CleanRules.h"
#include "appliance/recycle/DirectoryTree.h"
#include "appliance/recycle/FileInfo.h"
#include "appliance/recycle/NameStore.h"

namespace orva {

// Sparse files may claim more bytes together than 64 bits can count.
__extension__ using ByteSum = unsigned __int128;

// A file that a clean may remove.
struct Candidate {
    std::uint64_t bytes;
    FileTime changed;
    std::uint64_t inode;
    NameStore::Place name;
    DirectoryTree::Index directory;
    FileKind kind;
    bool linked;  // has other hard links, whose removal changes its time
};

// Which files of a bin go when it holds too much: the oldest or the largest first; equally large
// ones the oldest first, those of one time in the order of their paths.
class RemovalPlan {
  public:
    // `binTree` and `nameStore`, those that the candidates refer to, stay the caller's and must
    // outlive the plan.
    RemovalPlan(std::vector<Candidate> candidates, SizeOrder sizeOrder,
                const DirectoryTree& binTree, const NameStore& nameStore);

    // The next files in that order, as many as it takes to free `excess` bytes: none for 0 bytes,
    // all that are left when they do not suffice. The caller may arrange them anew. Valid as long
    // as the plan.
    std::span<Candidate> Next(ByteSum excess);

    // Those that were not given out; in their order if any were.
    std::span<const Candidate> Rest() const;

  private:
    void Sort();

    std::vector<Candidate> files;
    SizeOrder order;
    const DirectoryTree& tree;
    const NameStore& names;
    bool sorted = false;
    std::size_t next = 0;
};

// Puts the files of each folder together. Removed like that, a million files out of many folders
// take half as long as in the order of their sizes, and the file system writes each of its tables
// once.
void ArrangeByFolder(std::span<Candidate> files);

}  // namespace orva
