#pragma once

#include <exception>

namespace IO {

// Thrown by a stream with exceptions enabled when a read cannot deliver what was asked.
// Carries nothing; any thread.
class Exception : public std::exception {};

}  // namespace IO
