// How the desktop platform layer turns failed POSIX calls into platform
// errors. Every OS failure goes through errorFromErrno, so one table decides
// what a caller of kdGetError sees.
#pragma once

#include <KD/kd.h>

#include <cerrno>

namespace pal::detail {

// The platform error code for an errno value (KD_EIO for anything unexpected).
KDint errorFromErrno(int osError);

// Records the current errno as the calling thread's last platform error.
void setErrorFromErrno();

inline bool callFailed(int result) {
    return result == -1;
}
inline bool callFailed(const void* result) {
    return result == nullptr;
}

// Repeats a system call that was interrupted by a signal before it did any
// work; callers then see only real failures.
template <typename Call>
auto retryOnEintr(Call call) {
    for (;;) {
        auto result = call();
        if (!callFailed(result) || errno != EINTR) {
            return result;
        }
    }
}

}  // namespace pal::detail
