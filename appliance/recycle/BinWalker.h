#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "appliance/recycle/DirectoryTree.h"
#include "appliance/recycle/EntryReader.h"
#include "appliance/recycle/FileInfo.h"

namespace orva {

enum class Fate : std::uint8_t {
    kGone,      // removed, or no longer there; in a preview: would be removed
    kStays,     // kept, or could not be removed
    kRefilled,  // a directory that has entries again
};

// What a walk does with what it meets. Directories are named by their place in the walk's tree; a
// descriptor and a name are valid during the call only.
class BinVisitor {
  public:
    virtual ~BinVisitor() = default;

    // Anything but a directory.
    virtual Fate File(DirectoryTree::Index directory, int fd, const char* name,
                      const FileInfo& info) = 0;

    // A directory below the bin in which nothing stayed. kGone: it is forgotten by the tree.
    virtual Fate EmptyDirectory(DirectoryTree::Index directory) = 0;

    // A directory below the bin in which something stayed. Returns whether the tree is to remember
    // it.
    virtual bool KeptDirectory(DirectoryTree::Index directory) = 0;

    // A directory that is the root of a mount. It is not entered.
    virtual void MountPoint(DirectoryTree::Index parent, const char* name) = 0;

    // `name`, empty for the directory itself, could not be read.
    virtual void Unreadable(DirectoryTree::Index directory, const char* name, int error) = 0;

    // Whether File removes: then directories are looked after for being moved away meanwhile, and
    // read again until nothing is found.
    virtual bool Removes() const = 0;
};

// Walks a bin depth first: the files of a directory before its directories, a directory after
// everything in it. Needs memory for the names of the directories that it has yet to enter, and
// neither stack nor descriptors for its depth. What appears or vanishes meanwhile may be met or
// not.
class BinWalker {
  public:
    BinWalker(DirectoryTree& binTree, BinVisitor& binVisitor);

    void Walk();

  private:
    struct Frame {
        DirectoryTree::Index directory;
        std::string pending;   // names of directories to enter, each ended by a zero byte
        std::size_t next = 0;  // into pending
        bool stays = false;
        bool moved = false;
        bool foundAny = false;
        int passes = 0;
    };

    void ReadDirectory(Frame& frame);
    void VisitEntry(Frame& frame, int fd, const DirectoryEntry& entry, const EntryInfo* known);
    void Enter(const char* name);
    void Leave();
    bool StillInPlace(const Frame& frame);
    bool ReadAgain(Frame& frame);

    DirectoryTree& tree;
    BinVisitor& visitor;
    std::vector<Frame> frames;
    std::vector<char> buffer;
    std::vector<DirectoryEntry> batch;
    EntryReader reader;
    std::size_t removedUnchecked = 0;
};

}  // namespace orva
