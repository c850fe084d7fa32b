#pragma once

#include <boost/noncopyable.hpp>
#include <boost/shared_ptr.hpp>

#include "io/ByteArrayOutputStream.h"

namespace IO {
namespace Zip {

// Collects what is written and, when destroyed, writes it gzip-compressed to out; nothing
// reaches out before that, so out must outlive this stream. Not thread-safe: one thread uses it.
class GzipOutputStream : public OutputStream, private boost::noncopyable {
public:
    explicit GzipOutputStream(OutputStream* out);
    ~GzipOutputStream() override;

    int write(const void* data, int length) override;

private:
    boost::shared_ptr<ByteArrayOutputStream> buffer;
    OutputStream* out;
};

}  // namespace Zip
}  // namespace IO
