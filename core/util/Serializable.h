#pragma once

#include <boost/shared_ptr.hpp>
#include <vector>

namespace IO {
class InputStream;
class OutputStream;
}  // namespace IO

namespace Util {

// Base of settings objects kept in a versioned file "/data/<name>": 4 magic bytes, the Int
// format version, then the subclass's fields, all of it one gzip stream when compressed.
// Subclasses override read and write, calling the base versions first for the header.
// One thread uses an object at a time.
class Serializable {
public:
    virtual ~Serializable();

    // Resets the object, then reads "/data/<name>" (or "/tmp/<name>" when that is missing).
    // False when there is no file or it cannot be used; the object is then left reset.
    virtual bool load();
    // Writes a temporary file and moves it over "/data/<name>" in one step, so the old file
    // stays whole until the new one is complete. A failure is logged and leaves the old file.
    virtual void save() const;
    // Puts every field back to its default.
    virtual void reset() = 0;
    // Reads and checks the header: the magic, then a version this code can read.
    virtual bool read(boost::shared_ptr<IO::InputStream> stream);
    virtual void write(boost::shared_ptr<IO::OutputStream> stream) const;

    // Whether files of an older format version are read too.
    void enableSupportPreviousFormatVersions(bool enable) { supportPreviousFormatVersions = enable; }
    // The version found by the last read.
    int getReadFormatVersion() const { return readFormatVersion; }

protected:
    // name and magic are borrowed and must outlive the object; only the first 4 characters of
    // magic are used.
    Serializable(const char* name, const char* magic, int formatVersion, bool compressed);

    // dir + name, inflated when the object is compressed; empty when the file cannot be opened.
    boost::shared_ptr<IO::InputStream> openInput(const char* dir, const char* name) const;

    const char* name;
    const char* magic;
    int formatVersion;
    bool compressed;
    bool supportPreviousFormatVersions = false;
    int readFormatVersion = 0;

private:
    static const int kMagicSize = 4;

    // The whole file content, compressed when the object is; empty when compression failed.
    bool serialize(std::vector<unsigned char>& content) const;
    void magicBytes(char (&bytes)[kMagicSize]) const;
};

}  // namespace Util
