#include "appliance/recycle/RemovalPlan.h"

#include <algorithm>
#include <cstring>
#include <tuple>
#include <utility>

namespace orva {
namespace {

using Index = DirectoryTree::Index;

// Where each directory stands when all are sorted by their paths, a directory before those in it.
std::vector<Index> RankDirectories(const DirectoryTree& tree) {
    std::vector<Index> sorted(tree.Count());
    for (Index at = 0; at < sorted.size(); ++at) {
        sorted[at] = at;
    }
    // The bin, its own parent, comes first.
    std::sort(sorted.begin() + 1, sorted.end(), [&tree](Index left, Index right) {
        const Index leftParent = tree.Parent(left);
        const Index rightParent = tree.Parent(right);
        return leftParent != rightParent ? leftParent < rightParent
                                         : std::strcmp(tree.Name(left), tree.Name(right)) < 0;
    });
    std::vector<Index> firstChild(tree.Count() + std::size_t{1}, 0);
    for (std::size_t at = 1; at < sorted.size(); ++at) {
        ++firstChild[tree.Parent(sorted[at]) + std::size_t{1}];
    }
    firstChild[0] = 1;
    for (std::size_t at = 1; at < firstChild.size(); ++at) {
        firstChild[at] += firstChild[at - 1];
    }
    std::vector<Index> ranks(tree.Count());
    std::vector<Index> waiting = {DirectoryTree::kBin};
    for (Index rank = 0; !waiting.empty(); ++rank) {
        const Index directory = waiting.back();
        waiting.pop_back();
        ranks[directory] = rank;
        for (Index child = firstChild[directory + std::size_t{1}]; child > firstChild[directory];
             --child) {
            waiting.push_back(sorted[child - 1]);
        }
    }
    return ranks;
}

}  // namespace

RemovalPlan::RemovalPlan(std::vector<Candidate> candidates, SizeOrder sizeOrder,
                         const DirectoryTree& binTree, const NameStore& nameStore)
    : files(std::move(candidates)), order(sizeOrder), tree(binTree), names(nameStore) {}

void RemovalPlan::Sort() {
    sorted = true;
    const std::vector<Index> ranks = RankDirectories(tree);
    std::sort(files.begin(), files.end(), [&](const Candidate& left, const Candidate& right) {
        if (order == SizeOrder::kLargestFirst && left.bytes != right.bytes) {
            return left.bytes > right.bytes;
        }
        if (left.changed != right.changed) {
            return left.changed < right.changed;
        }
        if (left.directory != right.directory) {
            return ranks[left.directory] < ranks[right.directory];
        }
        return std::strcmp(names.At(left.name), names.At(right.name)) < 0;
    });
}

std::span<Candidate> RemovalPlan::Next(ByteSum excess) {
    const std::size_t first = next;
    // Most bins are small enough; those need no order.
    if (excess > 0 && !sorted) {
        Sort();
    }
    for (; excess > 0 && next < files.size(); ++next) {
        excess -= std::min<ByteSum>(excess, files[next].bytes);
    }
    return std::span<Candidate>(files).subspan(first, next - first);
}

std::span<const Candidate> RemovalPlan::Rest() const {
    return std::span<const Candidate>(files).subspan(next);
}

void ArrangeByFolder(std::span<Candidate> files) {
    // Numbers of folders and of inodes rise as they were made, so that the removals run through the
    // inode tables instead of jumping about in them.
    std::sort(files.begin(), files.end(), [](const Candidate& left, const Candidate& right) {
        return std::tie(left.directory, left.inode) < std::tie(right.directory, right.inode);
    });
}

}  // namespace orva
