// Maps the platform's file tree onto one host folder (pal::setFileRoot).
//
// A platform path is absolute ("/data/x"); a relative one is taken from "/".
// Empty and "." components are dropped, so "/data//x" and "/data/./x" name
// "/data/x". A ".." component is refused outright rather than resolved: it is
// the only way a path string could name something outside the root, and no
// caller of the platform needs it. Symbolic links inside the root are followed;
// what they point to is the business of whoever owns the root.
//
// Thread safety: may be called from any thread; pal::setFileRoot should happen
// before other threads make file calls.
#pragma once

#include <KD/kd.h>

#include <string>

namespace pal::detail {

struct MappedPath {
    // 0 on success, else the platform error for the refused path: KD_EINVAL
    // for a null path, KD_ENOENT for an empty one, KD_EACCES for one with a
    // ".." component or when no root has been set.
    KDint error = 0;
    std::string host;
    // Length of the root folder at the start of host; what follows is the
    // platform path ("/data/x").
    std::string::size_type rootLength = 0;
    // The path names the root folder itself, which callers may read but must
    // not remove or rename: it belongs to the embedding program.
    bool isRoot = false;
};

MappedPath mapPath(const char* platformPath);

}  // namespace pal::detail
