#include "appliance/recycle/BinWalker.h"

#include <dirent.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>

namespace orva {
namespace {

// About ten thousand names: enough that sorting them by inode makes the removals run through the
// inode tables instead of jumping about in them.
constexpr std::size_t kBufferBytes = std::size_t{512} * 1024;

// A file system may skip names when others are removed between two reads of a directory, and files
// may keep coming. The first needs another pass, the second must not keep us forever.
constexpr int kMaxPasses = 4;

// A directory that someone moves out of the bin is noticed after this many removals at the latest,
// and one more per level so that checking stays cheaper than removing.
constexpr std::size_t kRemovalsPerCheck = 32;

bool IsDotOrDotDot(const char* name) {
    return name[0] == '.' && (name[1] == '\0' || (name[1] == '.' && name[2] == '\0'));
}

}  // namespace

BinWalker::BinWalker(DirectoryTree& binTree, BinVisitor& binVisitor)
    : tree(binTree), visitor(binVisitor), buffer(kBufferBytes) {}

void BinWalker::Walk() {
    frames.push_back({DirectoryTree::kBin, {}});
    ReadDirectory(frames.back());
    while (!frames.empty()) {
        Frame& frame = frames.back();
        if (frame.next < frame.pending.size()) {
            const std::string name(frame.pending.c_str() + frame.next);
            frame.next += name.size() + 1;
            Enter(name.c_str());
        } else {
            Leave();
        }
    }
}

void BinWalker::ReadDirectory(Frame& frame) {
    frame.foundAny = false;
    ++frame.passes;
    for (;;) {
        const int fd = tree.Fd(frame.directory);
        const ssize_t size = fd < 0 ? -1 : ::getdents64(fd, buffer.data(), buffer.size());
        if (size < 0) {
            if (errno != ESTALE && errno != ENOENT) {
                visitor.Unreadable(frame.directory, "", errno);
            }
            frame.stays = true;
            return;
        }
        if (size == 0) {
            return;
        }
        batch.clear();
        for (std::size_t at = 0; at < static_cast<std::size_t>(size);) {
            // The kernel aligns each record for its first member.
            const auto* record = reinterpret_cast<const dirent64*>(buffer.data() + at);
            at += record->d_reclen;
            if (!IsDotOrDotDot(record->d_name)) {
                batch.push_back({record->d_ino, record->d_name, record->d_type});
            }
        }
        frame.foundAny = frame.foundAny || !batch.empty();
        std::sort(batch.begin(), batch.end(),
                  [](const DirectoryEntry& left, const DirectoryEntry& right) {
                      return left.inode < right.inode;
                  });
        // What is removed is looked at right before that, and not earlier.
        const EntryInfo* known = visitor.Removes() ? nullptr : reader.Read(fd, batch).data();
        for (const DirectoryEntry& entry : batch) {
            VisitEntry(frame, fd, entry, known == nullptr ? nullptr : known++);
            if (!StillInPlace(frame)) {
                frame.moved = true;
                frame.stays = true;
                frame.pending.clear();
                frame.next = 0;
                return;
            }
        }
    }
}

void BinWalker::VisitEntry(Frame& frame, int fd, const DirectoryEntry& entry,
                           const EntryInfo* known) {
    bool directory = entry.type == DT_DIR;
    if (!directory) {
        EntryInfo read;
        if (known == nullptr) {
            read.error = ReadFileInfo(fd, entry.name, read.info);
            known = &read;
        }
        if (known->error == ENOENT) {
            return;
        }
        if (known->error != 0) {
            visitor.Unreadable(frame.directory, entry.name, known->error);
            frame.stays = true;
            return;
        }
        directory = known->info.kind == FileKind::kDirectory;
        if (!directory) {
            const Fate fate = visitor.File(frame.directory, fd, entry.name, known->info);
            frame.stays = frame.stays || fate != Fate::kGone;
            removedUnchecked += fate == Fate::kGone ? 1 : 0;
        }
    }
    if (directory) {
        frame.pending.append(entry.name, std::strlen(entry.name) + 1);
    }
}

void BinWalker::Enter(const char* name) {
    Frame& parent = frames.back();
    if (!StillInPlace(parent)) {
        parent.moved = true;
    }
    const int parentFd = parent.moved ? -1 : tree.Fd(parent.directory);
    if (parentFd < 0) {
        // The directory is no longer ours to look into; what it holds stays.
        parent.stays = true;
        parent.next = parent.pending.size();
        return;
    }
    FileDescriptor fd(OpenDirectoryAt(parentFd, name));
    FileInfo info;
    const int error = fd.IsOpen() ? ReadFileInfo(fd.Get(), "", info) : errno;
    if (error == ENOENT) {
        return;
    }
    parent.stays = parent.stays || error != 0;
    if (error == ENOTDIR || error == ELOOP) {
        return;  // a link or a file has taken the name; the next clean sees to it
    }
    if (error != 0) {
        visitor.Unreadable(parent.directory, name, error);
        return;
    }
    if (info.mountPoint || info.device != tree.Device()) {
        visitor.MountPoint(parent.directory, name);
        parent.stays = true;
        return;
    }
    const DirectoryTree::Index index = tree.Add(parent.directory, name, std::move(fd), info.inode);
    frames.push_back({index, {}});
    ReadDirectory(frames.back());
}

void BinWalker::Leave() {
    Frame& frame = frames.back();
    const bool isBin = frame.directory == DirectoryTree::kBin;
    Fate fate = frame.stays ? Fate::kStays : Fate::kGone;
    if (fate == Fate::kGone) {
        fate = isBin ? Fate::kRefilled : visitor.EmptyDirectory(frame.directory);
    }
    if (fate == Fate::kRefilled && ReadAgain(frame)) {
        return;
    }
    if (isBin) {
        frames.pop_back();
        return;
    }
    const bool remember = fate != Fate::kGone && visitor.KeptDirectory(frame.directory);
    if (!remember) {
        tree.Drop(frame.directory);
    }
    frames.pop_back();
    Frame& parent = frames.back();
    parent.stays = parent.stays || fate != Fate::kGone;
}

bool BinWalker::StillInPlace(const Frame& frame) {
    if (!visitor.Removes() || removedUnchecked < kRemovalsPerCheck + frames.size()) {
        return true;
    }
    // After a miss the directories above are looked at too before anything else of theirs goes.
    const bool inPlace = tree.IsInPlace(frame.directory);
    if (inPlace) {
        removedUnchecked = 0;
    }
    return inPlace;
}

bool BinWalker::ReadAgain(Frame& frame) {
    const int fd = tree.Fd(frame.directory);
    if (!visitor.Removes() || !frame.foundAny || frame.passes >= kMaxPasses || fd < 0 ||
        ::lseek(fd, 0, SEEK_SET) != 0) {
        return false;
    }
    frame.pending.clear();
    frame.next = 0;
    ReadDirectory(frame);
    return true;
}

}  // namespace orva
