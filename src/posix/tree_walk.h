// A walk through the directories of a tree that other users may change meanwhile.
#pragma once

#include <ftw.h>
#include <sys/stat.h>

#include <functional>

namespace vela {

/// One step of a walk, with the parameters and the action codes of the C library's nftw under
/// FTW_ACTIONRETVAL. The type flag is one of
///   FTW_D    a directory, which is open; only then `status` is filled
///   FTW_DNR  a directory that cannot be opened
///   FTW_SL   a symbolic link to a directory that is not followed
///   FTW_SLN  a symbolic link that leads nowhere, such as one to itself
///   FTW_NS   another entry that cannot be examined
///   FTW_F    the root when it is not a directory
/// Other files are not reported, which saves examining them.
using TreeStep = std::function<int(const char* path, const struct stat* status, int typeFlag,
                                   struct FTW* place)>;

/// Calls `step` for the directory `root` and everything below it on the same file system, a
/// directory before its entries, these in the order in which the system lists them. Symbolic links
/// to directories are followed when their owner is root, the effective user or the owner of the
/// target; `root` is always followed. A directory with several names is reported once.
///
/// The walk works on descriptors, at most about a hundred at a time, so that neither the length of
/// a path nor its depth is limited, and it does not end at what it cannot examine or at what is
/// moved or removed while it is there.
///
/// Returns 0, or what a step returned to end the walk. Returns -1 with errno set when `root` does
/// not exist or, after everything else, when a part of the tree could not be read for another
/// reason than a missing permission or a symbolic link that leads nowhere.
int WalkTree(const char* root, const TreeStep& step);

}  // namespace vela
