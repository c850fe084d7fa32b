#pragma once

#include <minizip/zip.h>

#include <boost/noncopyable.hpp>
#include <boost/shared_ptr.hpp>
#include <vector>

#include "io/OutputStream.h"

namespace IO {
namespace Zip {

// Writes a zip archive: entries are opened, written and closed in turn. The archive is built in
// memory and reaches out in one write when this stream is destroyed.
// Not thread-safe: one thread uses the stream.
class ZipOutputStream : public OutputStream, private boost::noncopyable {
public:
    explicit ZipOutputStream(boost::shared_ptr<OutputStream> out);
    // Finishes the archive and writes it to out.
    ~ZipOutputStream() override;

    // Starts an entry, deflated or stored.
    void openEntry(const char* name, bool compressed);
    // The same, with the entry's central-directory extra field stored as given.
    void openEntry(const char* name, bool compressed, const std::vector<unsigned char>& centralExtra);
    // Adds to the open entry; returns length.
    int write(const void* data, int length) override;
    void closeEntry();

private:
    static voidpf ZCALLBACK openFile(voidpf opaque, const char* filename, int mode);
    static uLong ZCALLBACK readFile(voidpf opaque, voidpf stream, void* buffer, uLong size);
    static uLong ZCALLBACK writeFile(voidpf opaque, voidpf stream, const void* buffer, uLong size);
    static long ZCALLBACK tellFile(voidpf opaque, voidpf stream);
    static long ZCALLBACK seekFile(voidpf opaque, voidpf stream, uLong offset, int origin);
    static int ZCALLBACK closeFile(voidpf opaque, voidpf stream);
    static int ZCALLBACK testError(voidpf opaque, voidpf stream);

    boost::shared_ptr<OutputStream> out;
    zipFile file = nullptr;
    zlib_filefunc_def functions;
    std::vector<unsigned char> buffer;
    unsigned int bufferPosition = 0;
};

}  // namespace Zip
}  // namespace IO
