// Files and directories of the platform on the host's POSIX calls.
//
// Every path goes through mapPath first, so a refused path fails before any
// host call is made. Every failure is reported through kdSetError: refused
// paths and bad arguments directly, OS failures through setErrorFromErrno.
// Interrupted system calls are repeated (retryOnEintr, and the loops around
// stdio reads and writes).
//
// Thread safety: any thread may make these calls; one KDFile or KDDir must not
// be used by two threads at once.
#include <KD/kdext.h>
#include <dirent.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <new>
#include <string>

#include "OsError.h"
#include "PathMapper.h"

using pal::detail::MappedPath;
using pal::detail::retryOnEintr;
using pal::detail::setErrorFromErrno;

static_assert(sizeof(off_t) == sizeof(KDoff), "file offsets must be 64-bit on the host");

struct KDFile {
    FILE* stream = nullptr;
    // C forbids switching between reading and writing on one stream without
    // a flush or seek in between; the platform does that step for the caller.
    enum class Direction { None, Reading, Writing };
    Direction direction = Direction::None;
};

struct KDDir {
    DIR* dir = nullptr;
    std::string name;
    KDDirent entry{};
};

namespace {

const KDmode kRegularFileMode = 0x8000;
const KDmode kDirectoryMode = 0x4000;
const KDmode kSymbolicLinkMode = 0x2000;

int fail(KDint error) {
    kdSetError(error);
    return -1;
}

int failFromErrno() {
    setErrorFromErrno();
    return -1;
}

// Maps a path, recording the refusal as the last error.
bool mapOrFail(const char* path, MappedPath& mapped) {
    mapped = pal::detail::mapPath(path);
    if (mapped.error != 0) {
        kdSetError(mapped.error);
        return false;
    }
    return true;
}

// As mapOrFail, for calls that would remove or replace what the path names:
// the root folder belongs to the embedding program and is refused.
bool mapForChangeOrFail(const char* path, MappedPath& mapped) {
    if (!mapOrFail(path, mapped)) {
        return false;
    }
    if (mapped.isRoot) {
        kdSetError(KD_EACCES);
        return false;
    }
    return true;
}

// C's fopen modes: "r", "w" or "a", then optionally "b" and "+" in either
// order, and "x" after "w". Anything else is refused before reaching the host,
// whose fopen would accept its own extensions.
bool isValidOpenMode(const char* mode) {
    if (mode == nullptr || (mode[0] != 'r' && mode[0] != 'w' && mode[0] != 'a')) {
        return false;
    }
    bool binary = false;
    bool update = false;
    bool exclusive = false;
    for (const char* flag = mode + 1; *flag != '\0'; ++flag) {
        bool* seen = nullptr;
        if (*flag == 'b') {
            seen = &binary;
        } else if (*flag == '+') {
            seen = &update;
        } else if (*flag == 'x' && mode[0] == 'w') {
            seen = &exclusive;
        } else {
            return false;
        }
        if (*seen) {
            return false;
        }
        *seen = true;
    }
    return true;
}

KDmode platformMode(mode_t hostMode) {
    if (S_ISREG(hostMode)) {
        return kRegularFileMode;
    }
    if (S_ISDIR(hostMode)) {
        return kDirectoryMode;
    }
    if (S_ISLNK(hostMode)) {
        return kSymbolicLinkMode;
    }
    return 0;
}

void fillStat(const struct stat& hostStat, KDStat* buf) {
    buf->st_mode = platformMode(hostStat.st_mode);
    buf->st_size = hostStat.st_size;
    buf->st_mtime = hostStat.st_mtim.tv_sec;
}

bool isDirectory(const std::string& hostPath) {
    struct stat hostStat;
    return retryOnEintr([&] { return stat(hostPath.c_str(), &hostStat); }) == 0 && S_ISDIR(hostStat.st_mode);
}

void prepareFor(KDFile* file, KDFile::Direction direction) {
    if (file->direction != KDFile::Direction::None && file->direction != direction) {
        fseeko(file->stream, 0, SEEK_CUR);
    }
    file->direction = direction;
}

// True when a stdio call stopped only because a signal interrupted it; the
// error indicator is then cleared so that the call can be repeated.
bool clearedInterruption(FILE* stream) {
    if (ferror(stream) && errno == EINTR) {
        clearerr(stream);
        return true;
    }
    return false;
}

// Repeats a stdio transfer (fread or fwrite of single bytes) until all bytes
// have moved or it stops for a reason other than a signal.
template <typename Transfer>
KDsize transferAll(FILE* stream, KDsize total, Transfer transfer) {
    KDsize done = 0;
    while (done < total) {
        errno = 0;
        done += transfer(done, total - done);
        if (done == total || !clearedInterruption(stream)) {
            break;
        }
    }
    if (done < total && ferror(stream)) {
        setErrorFromErrno();
    }
    return done;
}

// The byte count of size * count elements, or false when it overflows.
bool byteCount(KDsize size, KDsize count, KDsize& total) {
    if (size != 0 && count > static_cast<KDsize>(-1) / size) {
        return false;
    }
    total = size * count;
    return true;
}

}  // namespace

KDFile* kdFopen(const KDchar* pathname, const KDchar* mode) {
    MappedPath mapped;
    if (!mapOrFail(pathname, mapped)) {
        return nullptr;
    }
    if (!isValidOpenMode(mode)) {
        kdSetError(KD_EINVAL);
        return nullptr;
    }
    // "e" (close-on-exec) keeps platform files out of child processes.
    const std::string hostMode = std::string(mode) + "e";
    FILE* stream = retryOnEintr([&] { return fopen(mapped.host.c_str(), hostMode.c_str()); });
    if (stream == nullptr) {
        setErrorFromErrno();
        return nullptr;
    }
    // The host opens a directory for reading; a platform file never names one.
    struct stat hostStat;
    if (fstat(fileno(stream), &hostStat) == 0 && S_ISDIR(hostStat.st_mode)) {
        fclose(stream);
        kdSetError(KD_EACCES);
        return nullptr;
    }
    KDFile* file = new (std::nothrow) KDFile;
    if (file == nullptr) {
        fclose(stream);
        kdSetError(KD_ENOMEM);
        return nullptr;
    }
    file->stream = stream;
    return file;
}

KDint kdFclose(KDFile* file) {
    if (file == nullptr) {
        kdSetError(KD_EBADF);
        return KD_EOF;
    }
    // No retry: the descriptor is gone even when close reports EINTR.
    const int result = fclose(file->stream);
    delete file;
    if (result != 0) {
        setErrorFromErrno();
        return KD_EOF;
    }
    return 0;
}

KDint kdFflush(KDFile* file) {
    if (file == nullptr) {
        kdSetError(KD_EBADF);
        return KD_EOF;
    }
    file->direction = KDFile::Direction::None;
    if (retryOnEintr([&] { return fflush(file->stream); }) != 0) {
        setErrorFromErrno();
        return KD_EOF;
    }
    return 0;
}

KDsize kdFread(void* buffer, KDsize size, KDsize count, KDFile* file) {
    KDsize total = 0;
    if (file == nullptr || buffer == nullptr || !byteCount(size, count, total)) {
        kdSetError(file == nullptr ? KD_EBADF : KD_EINVAL);
        return 0;
    }
    if (total == 0) {
        return 0;
    }
    prepareFor(file, KDFile::Direction::Reading);
    char* bytes = static_cast<char*>(buffer);
    const KDsize done = transferAll(file->stream, total, [&](KDsize offset, KDsize length) {
        return fread(bytes + offset, 1, length, file->stream);
    });
    return done / size;
}

KDsize kdFwrite(const void* buffer, KDsize size, KDsize count, KDFile* file) {
    KDsize total = 0;
    if (file == nullptr || buffer == nullptr || !byteCount(size, count, total)) {
        kdSetError(file == nullptr ? KD_EBADF : KD_EINVAL);
        return 0;
    }
    if (total == 0) {
        return 0;
    }
    prepareFor(file, KDFile::Direction::Writing);
    const char* bytes = static_cast<const char*>(buffer);
    const KDsize done = transferAll(file->stream, total, [&](KDsize offset, KDsize length) {
        return fwrite(bytes + offset, 1, length, file->stream);
    });
    return done / size;
}

KDint kdGetc(KDFile* file) {
    if (file == nullptr) {
        kdSetError(KD_EBADF);
        return KD_EOF;
    }
    prepareFor(file, KDFile::Direction::Reading);
    unsigned char byte = 0;
    return transferAll(file->stream, 1, [&](KDsize, KDsize) { return fread(&byte, 1, 1, file->stream); }) == 1
               ? byte
               : KD_EOF;
}

KDint kdPutc(KDint c, KDFile* file) {
    if (file == nullptr) {
        kdSetError(KD_EBADF);
        return KD_EOF;
    }
    prepareFor(file, KDFile::Direction::Writing);
    const unsigned char byte = static_cast<unsigned char>(c);
    return transferAll(file->stream, 1, [&](KDsize, KDsize) { return fwrite(&byte, 1, 1, file->stream); }) ==
                   1
               ? byte
               : KD_EOF;
}

KDint kdFseek(KDFile* file, KDoff offset, KDfileSeekOrigin origin) {
    if (file == nullptr) {
        return fail(KD_EBADF);
    }
    int whence = 0;
    switch (origin) {
        case KD_SEEK_SET:
            whence = SEEK_SET;
            break;
        case KD_SEEK_CUR:
            whence = SEEK_CUR;
            break;
        case KD_SEEK_END:
            whence = SEEK_END;
            break;
        default:
            return fail(KD_EINVAL);
    }
    file->direction = KDFile::Direction::None;
    if (retryOnEintr([&] { return fseeko(file->stream, offset, whence); }) != 0) {
        return failFromErrno();
    }
    return 0;
}

KDoff kdFtell(KDFile* file) {
    if (file == nullptr) {
        return fail(KD_EBADF);
    }
    const off_t position = ftello(file->stream);
    if (position < 0) {
        return failFromErrno();
    }
    return position;
}

KDint kdFEOF(KDFile* file) {
    if (file == nullptr) {
        kdSetError(KD_EBADF);
        return KD_EOF;
    }
    return feof(file->stream) ? KD_EOF : 0;
}

KDint kdFerror(KDFile* file) {
    if (file == nullptr) {
        kdSetError(KD_EBADF);
        return KD_EOF;
    }
    return ferror(file->stream) ? KD_EOF : 0;
}

void kdClearerr(KDFile* file) {
    if (file == nullptr) {
        kdSetError(KD_EBADF);
        return;
    }
    clearerr(file->stream);
}

KDint kdMkdir(const KDchar* pathname) {
    MappedPath mapped;
    if (!mapOrFail(pathname, mapped)) {
        return -1;
    }
    if (retryOnEintr([&] { return mkdir(mapped.host.c_str(), 0777); }) != 0) {
        return failFromErrno();
    }
    return 0;
}

KDint kdMkdirAllZVR(const KDchar* pathname) {
    MappedPath mapped;
    if (!mapOrFail(pathname, mapped)) {
        return -1;
    }
    const std::string& host = mapped.host;
    std::string::size_type end = mapped.rootLength;
    while (end < host.size()) {
        end = host.find('/', end + 1);
        if (end == std::string::npos) {
            end = host.size();
        }
        const std::string directory = host.substr(0, end);
        // Creating and then accepting EEXIST, rather than testing first, lets
        // two threads create the same tree at once.
        if (retryOnEintr([&] { return mkdir(directory.c_str(), 0777); }) == 0) {
            continue;
        }
        if (errno != EEXIST) {
            return failFromErrno();
        }
        if (!isDirectory(directory)) {
            return fail(KD_EEXIST);
        }
    }
    return 0;
}

KDint kdRmdir(const KDchar* pathname) {
    MappedPath mapped;
    if (!mapForChangeOrFail(pathname, mapped)) {
        return -1;
    }
    if (retryOnEintr([&] { return rmdir(mapped.host.c_str()); }) != 0) {
        return failFromErrno();
    }
    return 0;
}

KDint kdRename(const KDchar* src, const KDchar* dest) {
    MappedPath from;
    MappedPath to;
    if (!mapForChangeOrFail(src, from) || !mapForChangeOrFail(dest, to)) {
        return -1;
    }
    if (retryOnEintr([&] { return rename(from.host.c_str(), to.host.c_str()); }) != 0) {
        return failFromErrno();
    }
    return 0;
}

KDint kdRemove(const KDchar* pathname) {
    MappedPath mapped;
    if (!mapForChangeOrFail(pathname, mapped)) {
        return -1;
    }
    // Files only: directories go through kdRmdir.
    if (retryOnEintr([&] { return unlink(mapped.host.c_str()); }) != 0) {
        return failFromErrno();
    }
    return 0;
}

KDint kdTruncate(const KDchar* pathname, KDoff length) {
    MappedPath mapped;
    if (!mapOrFail(pathname, mapped)) {
        return -1;
    }
    if (retryOnEintr([&] { return truncate(mapped.host.c_str(), length); }) != 0) {
        return failFromErrno();
    }
    return 0;
}

KDint kdStat(const KDchar* pathname, KDStat* buf) {
    MappedPath mapped;
    if (!mapOrFail(pathname, mapped)) {
        return -1;
    }
    if (buf == nullptr) {
        return fail(KD_EINVAL);
    }
    struct stat hostStat;
    if (retryOnEintr([&] { return stat(mapped.host.c_str(), &hostStat); }) != 0) {
        return failFromErrno();
    }
    fillStat(hostStat, buf);
    return 0;
}

KDint kdLstatZVR(const KDchar* pathname, KDStat* buf) {
    MappedPath mapped;
    if (!mapOrFail(pathname, mapped)) {
        return -1;
    }
    if (buf == nullptr) {
        return fail(KD_EINVAL);
    }
    struct stat hostStat;
    if (retryOnEintr([&] { return lstat(mapped.host.c_str(), &hostStat); }) != 0) {
        return failFromErrno();
    }
    fillStat(hostStat, buf);
    return 0;
}

KDint kdFstat(KDFile* file, KDStat* buf) {
    if (file == nullptr) {
        return fail(KD_EBADF);
    }
    if (buf == nullptr) {
        return fail(KD_EINVAL);
    }
    // Bytes still in the stream's buffer belong to the file as the caller
    // sees it, so they must reach the host before its size is asked.
    if (kdFflush(file) != 0) {
        return -1;
    }
    struct stat hostStat;
    if (retryOnEintr([&] { return fstat(fileno(file->stream), &hostStat); }) != 0) {
        return failFromErrno();
    }
    fillStat(hostStat, buf);
    return 0;
}

KDint kdAccess(const KDchar* pathname, KDint amode) {
    MappedPath mapped;
    if (!mapOrFail(pathname, mapped)) {
        return -1;
    }
    if ((amode & ~(KD_R_OK | KD_W_OK | KD_X_OK)) != 0) {
        return fail(KD_EINVAL);
    }
    const int hostMode =
        ((amode & KD_R_OK) ? R_OK : 0) | ((amode & KD_W_OK) ? W_OK : 0) | ((amode & KD_X_OK) ? X_OK : 0);
    if (retryOnEintr([&] { return access(mapped.host.c_str(), hostMode); }) != 0) {
        return failFromErrno();
    }
    return 0;
}

KDDir* kdOpenDir(const KDchar* pathname) {
    MappedPath mapped;
    if (!mapOrFail(pathname, mapped)) {
        return nullptr;
    }
    DIR* hostDir = retryOnEintr([&] { return opendir(mapped.host.c_str()); });
    if (hostDir == nullptr) {
        setErrorFromErrno();
        return nullptr;
    }
    KDDir* dir = new (std::nothrow) KDDir;
    if (dir == nullptr) {
        closedir(hostDir);
        kdSetError(KD_ENOMEM);
        return nullptr;
    }
    dir->dir = hostDir;
    return dir;
}

KDDirent* kdReadDir(KDDir* dir) {
    if (dir == nullptr) {
        kdSetError(KD_EBADF);
        return nullptr;
    }
    for (;;) {
        // readdir reports the end and a failure both as null; only errno
        // tells them apart.
        errno = 0;
        const dirent* hostEntry = readdir(dir->dir);
        if (hostEntry == nullptr) {
            if (errno != 0) {
                setErrorFromErrno();
            }
            return nullptr;
        }
        if (std::strcmp(hostEntry->d_name, ".") != 0 && std::strcmp(hostEntry->d_name, "..") != 0) {
            dir->name = hostEntry->d_name;
            dir->entry.d_name = dir->name.c_str();
            return &dir->entry;
        }
    }
}

KDint kdCloseDir(KDDir* dir) {
    if (dir == nullptr) {
        return fail(KD_EBADF);
    }
    const int result = closedir(dir->dir);
    delete dir;
    if (result != 0) {
        return failFromErrno();
    }
    return 0;
}
