#pragma once

#include <KD/kd.h>

#include <string>

namespace Simulator {
namespace GpxTime {

// GPX times are xsd:dateTime: "2026-01-01T08:30:00Z", optionally with a
// fraction of a second and an offset instead of "Z". Any thread.

// False when the text is not such a time or a field is out of range.
bool parse(const std::string& text, KDint64& millisecondsSinceEpoch);
// UTC with milliseconds: "2026-01-01T08:30:00.250Z".
std::string format(KDint64 millisecondsSinceEpoch);

}  // namespace GpxTime
}  // namespace Simulator
