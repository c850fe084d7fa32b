#pragma once

#include <string>
#include <vector>

#include "location/simulator/GpxPoint.h"

namespace Simulator {

// Reads the track points of a GPX 1.1 (or 1.0) file: every <trkpt> of every
// <trk>/<trkseg> in document order, with lat/lon, <ele>, <time>, and speed,
// course and accuracy where the file carries them (as GPX 1.0 children or
// inside <extensions>, under any prefix). Without an accuracy a point takes
// 5 m per unit of <hdop>, else 10 m.
//
// The file is untrusted: a point out of range, a time going backwards, a
// time on some points only, a nesting or size beyond reason or broken XML
// rejects the whole file with a message naming the first problem, so that a
// damaged track plays nothing rather than a part. Any thread.
class GpxReader {
public:
    static const size_t kMaxBytes = 32u * 1024u * 1024u;
    static const size_t kMaxPoints = 200000;

    // True with the points, or false with an error and no points.
    static bool parse(const std::vector<unsigned char>& bytes, std::vector<GpxPoint>& points,
                      std::string& error);
    // Reads a file through the platform's file system ("/data/drive.gpx").
    static bool readFile(const char* path, std::vector<GpxPoint>& points, std::string& error);
};

}  // namespace Simulator
