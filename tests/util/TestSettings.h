#pragma once

#include <boost/shared_ptr.hpp>
#include <string>
#include <vector>

#include "io/InputStream.h"
#include "io/OutputStream.h"
#include "util/Serializable.h"

// A settings object as an application would write one: version 3 added the points.
class TestSettings : public Util::Serializable {
public:
    static const char* const kName;

    explicit TestSettings(bool compressed = false, int version = 3)
        : Serializable(kName, "MCST", version, compressed) {
        reset();
    }

    void reset() override {
        zoom = 1;
        title = "default";
        points.clear();
    }

    bool read(boost::shared_ptr<IO::InputStream> stream) override {
        if (!Serializable::read(stream)) {
            return false;
        }
        zoom = stream->readInt();
        if (!stream->readString(title)) {
            return false;
        }
        if (getReadFormatVersion() < 3) {
            return true;
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

    void write(boost::shared_ptr<IO::OutputStream> stream) const override {
        Serializable::write(stream);
        stream->writeInt(zoom);
        stream->writeString(title);
        if (formatVersion < 3) {
            return;
        }
        stream->writeInt(static_cast<int>(points.size()));
        for (float point : points) {
            stream->writeFloat(point);
        }
    }

    int zoom;
    std::string title;
    std::vector<float> points;
};
