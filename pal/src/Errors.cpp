// The calling thread's last platform error, and the one table that maps OS
// errors onto the platform's codes.
#include <KD/kd.h>

#include <cerrno>

#include "OsError.h"

namespace {

// Each thread sees only the errors of its own calls, as with errno.
thread_local KDint lastError = 0;

}  // namespace

KDint kdGetError(void) {
    return lastError;
}

void kdSetError(KDint error) {
    lastError = error;
}

namespace pal::detail {

KDint errorFromErrno(int osError) {
    switch (osError) {
        case ENOENT:
        case ENOTDIR:
            return KD_ENOENT;
        case EACCES:
        case EPERM:
        case EROFS:
        case EISDIR:
        case EBUSY:
        case ETXTBSY:
            return KD_EACCES;
        case EEXIST:
        // POSIX lets rmdir report a non-empty directory with either code.
        case ENOTEMPTY:
            return KD_EEXIST;
        case EINVAL:
        case ENAMETOOLONG:
        case ELOOP:
        case ESPIPE:
        case EOVERFLOW:
            return KD_EINVAL;
        case ENOSPC:
        case EDQUOT:
        case EFBIG:
            return KD_ENOSPC;
        // The platform has no code of its own for running out of handles.
        case ENOMEM:
        case EMFILE:
        case ENFILE:
            return KD_ENOMEM;
        case EBADF:
            return KD_EBADF;
        default:
            return KD_EIO;
    }
}

void setErrorFromErrno() {
    kdSetError(errorFromErrno(errno));
}

}  // namespace pal::detail
