// Settings files as Serializable::load finds them in "/data/", plain or gzip-compressed, read by
// a settings class that uses every typed reader. Byte 0 chooses: bit 0 compressed, bit 1 older
// format versions accepted; the rest is the file.
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "FuzzSupport.h"
#include "io/InputStream.h"
#include "util/Serializable.h"

namespace {

class FuzzSettings : public Util::Serializable {
public:
    static constexpr const char* kName = "fuzz/settings.bin";

    FuzzSettings(bool compressed) : Serializable(kName, "MCFZ", 4, compressed) { reset(); }

    void reset() override {
        flag = false;
        level = 0;
        offset = 0;
        id = 0;
        scale = 1.0f;
        title.clear();
        shortName.clear();
        path.clear();
        line.clear();
        points.clear();
    }

    bool read(boost::shared_ptr<IO::InputStream> stream) override {
        if (!Serializable::read(stream)) {
            return false;
        }
        flag = stream->readBool();
        level = stream->readUByte() + stream->readByte();
        offset = stream->readShort();
        id = stream->readLongLong() ^ static_cast<long long>(stream->readULongLong());
        scale = stream->readFloat();
        if (!stream->readString(title) || !stream->readNString(shortName)) {
            return false;
        }
        if (getReadFormatVersion() < 4) {
            return true;
        }
        if (!stream->readZString(path) || !stream->readCRLFString(line)) {
            return false;
        }
        const int count = stream->readInt();
        if (count < 0 || count > stream->available() / 4) {
            return false;
        }
        for (int i = 0; i < count; ++i) {
            points.push_back(stream->readFloat());
        }
        return true;
    }

    bool flag;
    int level;
    short offset;
    long long id;
    float scale;
    std::string title;
    std::string shortName;
    std::string path;
    std::string line;
    std::vector<float> points;
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::bootPlatform();
    if (size == 0) {
        return 0;
    }
    FuzzSettings settings((data[0] & 1) != 0);
    settings.enableSupportPreviousFormatVersions((data[0] & 2) != 0);
    const std::string path = std::string("/data/") + FuzzSettings::kName;
    fuzz::check(fuzz::writePlatformFile(path, data + 1, size - 1), "the settings file is written");
    if (!settings.load()) {
        fuzz::check(settings.title.empty() && settings.points.empty() && settings.scale == 1.0f,
                    "a failed load leaves the defaults");
    }
    return 0;
}
