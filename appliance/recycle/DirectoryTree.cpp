#include "appliance/recycle/DirectoryTree.h"

#include <fcntl.h>
#include <sys/resource.h>
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

constexpr std::size_t kMostRecentSlots = 512;
constexpr std::size_t kFewestRecentSlots = 64;

// Apart from the descriptors used last, those of every 512th level are kept: the way back up from
// deep below is then walked in short pieces instead of from the bin each time.
constexpr std::size_t kMilestoneSlots = 32;
constexpr std::uint32_t kMilestone = 512;

// As many as fit into one path.
constexpr std::uint32_t kMostLevelsUp = 1024;

bool IsInode(int directory, const char* name, int flags, std::uint64_t device,
             std::uint64_t inode) {
    struct stat status {};
    return ::fstatat(directory, name, &status, flags | AT_NO_AUTOMOUNT) == 0 &&
           status.st_dev == device && status.st_ino == inode;
}

// The path of the directory that many levels up, at most kMostLevelsUp.
const char* LevelsUp(std::uint32_t levels) {
    static const std::string path = [] {
        std::string ups;
        for (std::uint32_t level = 0; level < kMostLevelsUp; ++level) {
            ups += "../";
        }
        return ups;
    }();
    return path.c_str() + path.size() - std::size_t{3} * levels;
}

// Half of what this process may have open; scattered removals want many.
std::size_t RecentSlots() {
    rlimit limit{};
    if (::getrlimit(RLIMIT_NOFILE, &limit) != 0) {
        return kFewestRecentSlots;
    }
    return std::clamp<rlim_t>(limit.rlim_cur / 2, kFewestRecentSlots, kMostRecentSlots);
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
    : binParent(std::move(parent)),
      binDirectory(std::move(bin)),
      device(binInfo.device),
      slots(RecentSlots() + kMilestoneSlots),
      recent{kMilestoneSlots, slots.size(), kMilestoneSlots},
      milestones{0, kMilestoneSlots, 0} {
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
    if (binTrusted != trust) {
        if (!IsBinNamed()) {
            errno = ESTALE;
            return -1;
        }
        binTrusted = trust;
    }
    std::vector<Index> closed;
    Index open = index;
    while (open != kBin && !IsOpenAndTrusted(open)) {
        closed.push_back(open);
        open = nodes[open].parent;
    }
    int fd = open == kBin ? binDirectory.Get() : SlotOf(open).fd.Get();
    for (; !closed.empty(); closed.pop_back()) {
        const Index next = closed.back();
        FileDescriptor opened(OpenChild(fd, next));
        if (!opened.IsOpen()) {
            return -1;
        }
        fd = opened.Get();
        if (!IsInode(fd, "", AT_EMPTY_PATH, device, nodes[next].inode)) {
            errno = ESTALE;
            return -1;
        }
        Keep(next, std::move(opened));
    }
    return fd;
}

bool DirectoryTree::IsInPlace(Index index) {
    if (index != kBin && nodes[index].slot == kNoSlot) {
        Distrust();
        return Fd(index) >= 0;
    }
    return IsBinNamed() &&
           (index == kBin || IsBelowBin(SlotOf(index).fd.Get(), nodes[index].depth));
}

bool DirectoryTree::IsBinNamed() const {
    return IsInode(binParent.Get(), Name(kBin), AT_SYMLINK_NOFOLLOW, device, nodes[kBin].inode);
}

// A directory has one place only, and what is above it there is no matter of names or links: it is
// in the bin when the bin is as many levels above it as it was.
bool DirectoryTree::IsBelowBin(int fd, std::uint32_t depth) const {
    FileDescriptor above;
    for (; depth > kMostLevelsUp; depth -= kMostLevelsUp) {
        above = FileDescriptor(::openat(fd, LevelsUp(kMostLevelsUp), O_PATH | kDirectoryFlags));
        fd = above.Get();
        if (!above.IsOpen()) {
            return false;
        }
    }
    return IsInode(fd, LevelsUp(depth), 0, device, nodes[kBin].inode);
}

bool DirectoryTree::IsOpenAndTrusted(Index index) {
    if (nodes[index].slot == kNoSlot) {
        return false;
    }
    Slot& slot = SlotOf(index);
    if (slot.trusted != trust) {
        if (!IsBelowBin(slot.fd.Get(), nodes[index].depth)) {
            Close(index);
            return false;
        }
        slot.trusted = trust;
    }
    slot.used = true;
    return true;
}

std::string DirectoryTree::Path(Index index) const {
    std::vector<Index> chain;
    for (Index at = index; at != kBin; at = nodes[at].parent) {
        chain.push_back(at);
    }
    std::string path;
    for (; !chain.empty(); chain.pop_back()) {
        path += Name(chain.back());
        path += '/';
    }
    return path;
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
    Ring& ring = nodes[index].depth % kMilestone == 0 ? milestones : recent;
    const auto advance = [&ring] {
        const std::size_t at = ring.hand++;
        ring.hand = ring.hand == ring.end ? ring.first : ring.hand;
        return at;
    };
    std::size_t at = advance();
    while (slots[at].used) {
        slots[at].used = false;
        at = advance();
    }
    Slot& slot = slots[at];
    if (slot.fd.IsOpen()) {
        Close(slot.node);
    }
    slot.fd = std::move(fd);
    slot.node = index;
    slot.used = true;
    slot.trusted = trust;
    nodes[index].slot = static_cast<std::int16_t>(at);
}

void DirectoryTree::Close(Index index) {
    Node& node = nodes[index];
    if (node.slot == kNoSlot) {
        return;
    }
    Slot& slot = SlotOf(index);
    slot.fd = FileDescriptor();
    slot.used = false;
    node.slot = kNoSlot;
}

}  // namespace orva
