#include "appliance/recycle/DirectoryTree.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <limits>
#include <stdexcept>
#include <utility>

namespace orva {
namespace {

constexpr int kDirectoryFlags = O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC | O_NONBLOCK;

bool IsInode(int fd, std::uint64_t device, std::uint64_t inode) {
    struct stat status {};
    return ::fstat(fd, &status) == 0 && status.st_dev == device && status.st_ino == inode;
}

}  // namespace

int ReadFileInfo(int directory, const char* name, FileInfo& info) {
    struct statx status {};
    constexpr unsigned kWanted = STATX_TYPE | STATX_CTIME | STATX_INO | STATX_SIZE | STATX_NLINK;
    constexpr int kFlags = AT_SYMLINK_NOFOLLOW | AT_NO_AUTOMOUNT | AT_STATX_SYNC_AS_STAT;
    const int empty = *name == '\0' ? AT_EMPTY_PATH : 0;
    if (::statx(directory, name, kFlags | empty, kWanted, &status) != 0) {
        return errno;
    }
    switch (status.stx_mode & S_IFMT) {
        case S_IFREG:
            info.kind = FileKind::kFile;
            break;
        case S_IFDIR:
            info.kind = FileKind::kDirectory;
            break;
        case S_IFLNK:
            info.kind = FileKind::kLink;
            break;
        default:
            info.kind = FileKind::kOther;
            break;
    }
    const bool sized = info.kind == FileKind::kFile || info.kind == FileKind::kLink;
    info.bytes = sized ? status.stx_size : 0;
    info.changed = ToFileTime(status.stx_ctime.tv_sec, status.stx_ctime.tv_nsec);
    info.device = makedev(status.stx_dev_major, status.stx_dev_minor);
    info.inode = status.stx_ino;
    info.links = status.stx_nlink;
    info.mountPoint = (status.stx_attributes & STATX_ATTR_MOUNT_ROOT) != 0;
    return 0;
}

int OpenDirectoryAt(int parent, const char* name) {
    return ::openat(parent, name, O_RDONLY | kDirectoryFlags);
}

DirectoryTree::DirectoryTree(FileDescriptor parent, const std::string& binName, FileDescriptor bin,
                             FileInfo binInfo)
    : binParent(std::move(parent)), binDirectory(std::move(bin)), device(binInfo.device) {
    names.assign(binName.c_str(), binName.c_str() + binName.size() + 1);
    nodes.push_back({binInfo.inode, 0, kBin, 0, 0, kNoSlot});
}

DirectoryTree::Index DirectoryTree::Add(Index parent, const char* name, FileDescriptor fd,
                                        std::uint64_t inode) {
    if (nodes.size() >= std::numeric_limits<Index>::max() - 1) {
        throw std::length_error("too many directories in one bin");
    }
    const auto index = static_cast<Index>(nodes.size());
    nodes.push_back({inode, names.size(), parent, 0, nodes[parent].depth + 1, kNoSlot});
    names.insert(names.end(), name, name + std::strlen(name) + 1);
    Keep(index, std::move(fd));
    return index;
}

void DirectoryTree::DropLast() {
    const auto last = static_cast<Index>(nodes.size() - 1);
    if (last == kBin) {
        return;
    }
    Close(last);
    names.resize(nodes.back().name);
    nodes.pop_back();
}

void DirectoryTree::Drop(Index index) {
    if (index + 1 == nodes.size()) {
        DropLast();
    } else {
        Close(index);
    }
}

int DirectoryTree::Fd(Index index) {
    if (index == kBin) {
        return binDirectory.Get();
    }
    const std::vector<Index> chain = ChainFrom(index, true);
    // The chain ends at the directory that is open: the bin or one in a slot.
    Index open = chain.empty() ? index : nodes[chain.back()].parent;
    for (std::size_t left = chain.size(); left > 0; --left) {
        const Index next = chain[left - 1];
        const int parent = open == kBin
                               ? binDirectory.Get()
                               : slots[static_cast<std::size_t>(nodes[open].slot)].fd.Get();
        FileDescriptor fd(OpenChild(parent, next));
        if (!fd.IsOpen()) {
            return -1;
        }
        if (!IsInode(fd.Get(), device, nodes[next].inode)) {
            errno = ESTALE;
            return -1;
        }
        Keep(next, std::move(fd));
        open = next;
    }
    Slot& slot = slots[static_cast<std::size_t>(nodes[index].slot)];
    slot.lastUse = ++clock;
    return slot.fd.Get();
}

bool DirectoryTree::IsInPlace(Index index) const {
    constexpr int kFlags = O_PATH | kDirectoryFlags;
    FileDescriptor fd(::openat(binParent.Get(), Name(kBin), kFlags));
    const std::vector<Index> chain = ChainFrom(index, false);
    for (std::size_t left = chain.size(); left > 0 && fd.IsOpen(); --left) {
        fd = FileDescriptor(::openat(fd.Get(), Name(chain[left - 1]), kFlags));
    }
    return fd.IsOpen() && IsInode(fd.Get(), device, nodes[index].inode);
}

void DirectoryTree::CloseAll() {
    for (Slot& slot : slots) {
        if (slot.fd.IsOpen()) {
            Close(slot.node);
        }
    }
}

std::string DirectoryTree::Path(Index index) const {
    const std::vector<Index> chain = ChainFrom(index, false);
    std::string path;
    for (std::size_t left = chain.size(); left > 0; --left) {
        path += Name(chain[left - 1]);
        path += '/';
    }
    return path;
}

// From `index` up to, and without, the bin or with `stopAtOpen` the nearest open directory.
std::vector<DirectoryTree::Index> DirectoryTree::ChainFrom(Index index, bool stopAtOpen) const {
    std::vector<Index> chain;
    for (Index at = index; at != kBin; at = nodes[at].parent) {
        if (stopAtOpen && nodes[at].slot != kNoSlot) {
            break;
        }
        chain.push_back(at);
    }
    return chain;
}

int DirectoryTree::OpenChild(int parent, Index index) {
    const int fd = OpenDirectoryAt(parent, Name(index));
    // ENOTDIR and ELOOP: another kind of file has taken the name.
    if (fd < 0 && (errno == ENOTDIR || errno == ELOOP || errno == ENOENT)) {
        errno = ESTALE;
    }
    return fd;
}

void DirectoryTree::Keep(Index index, FileDescriptor fd) {
    const bool milestone = nodes[index].depth % kMilestone == 0;
    const auto first = slots.begin() + (milestone ? kRecentSlots : 0);
    const auto last = milestone ? slots.end() : slots.begin() + kRecentSlots;
    // A free slot has never been used, or counts as if it had not: its time is 0.
    const auto slot = std::min_element(first, last, [](const Slot& left, const Slot& right) {
        return left.lastUse < right.lastUse;
    });
    if (slot->fd.IsOpen()) {
        Close(slot->node);
    }
    slot->fd = std::move(fd);
    slot->node = index;
    slot->lastUse = ++clock;
    nodes[index].slot = static_cast<std::int16_t>(slot - slots.begin());
}

void DirectoryTree::Close(Index index) {
    Node& node = nodes[index];
    if (node.slot == kNoSlot) {
        return;
    }
    Slot& slot = slots[static_cast<std::size_t>(node.slot)];
    slot.fd = FileDescriptor();
    slot.lastUse = 0;
    node.slot = kNoSlot;
}

}  // namespace orva
