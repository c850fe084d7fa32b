// Assertions and the log, both with a replaceable receiver.

#include <KD/kd.h>
#include <pal/Simulation.h>

#include <cstdio>
#include <cstdlib>
#include <mutex>
#include <string>
#include <vector>

#include "Runtime.h"

namespace {

// Recursive: a sink or handler that logs must not deadlock.
std::recursive_mutex& receiversMutex() {
    static std::recursive_mutex* mutex = new std::recursive_mutex();
    return *mutex;
}
pal::LogSink& logSink() {
    static pal::LogSink* sink = new pal::LogSink();
    return *sink;
}
pal::AssertionHandler& assertionHandler() {
    static pal::AssertionHandler* handler = new pal::AssertionHandler();
    return *handler;
}

std::string formatMessage(const char* format, va_list ap) {
    va_list measure;
    va_copy(measure, ap);
    const int length = std::vsnprintf(nullptr, 0, format, measure);
    va_end(measure);
    if (length < 0) {
        return format;
    }
    std::vector<char> buffer(static_cast<std::size_t>(length) + 1);
    std::vsnprintf(buffer.data(), buffer.size(), format, ap);
    return std::string(buffer.data(), static_cast<std::size_t>(length));
}

}  // namespace

namespace pal {

void setAssertionHandler(AssertionHandler handler) {
    std::lock_guard<std::recursive_mutex> lock(receiversMutex());
    assertionHandler() = std::move(handler);
}

void setLogSink(LogSink sink) {
    std::lock_guard<std::recursive_mutex> lock(receiversMutex());
    logSink() = std::move(sink);
}

namespace detail {

void writeLogLine(const char* line) {
    std::string text(line);
    while (!text.empty() && text.back() == '\n') {
        text.pop_back();
    }
    std::lock_guard<std::recursive_mutex> lock(receiversMutex());
    if (logSink()) {
        logSink()(text.c_str());
    } else {
        std::fprintf(stderr, "%s\n", text.c_str());
    }
}

}  // namespace detail

}  // namespace pal

extern "C" {

void kdHandleAssertion(const KDchar* condition, const KDchar* filename, KDint linenumber) {
    {
        std::lock_guard<std::recursive_mutex> lock(receiversMutex());
        if (assertionHandler()) {
            assertionHandler()(condition, filename, linenumber);
            return;
        }
    }
    kdLogFormatMessage("%s:%d: Assertion failed: %s", filename, linenumber, condition);
#ifndef NDEBUG
    // A debug build stops where the fault is; a release build keeps the user's
    // application running, so the code after every assertion must be safe.
    std::abort();
#endif
}

void kdLogMessage(const KDchar* string) {
    pal::detail::writeLogLine(string != nullptr ? string : "");
}

void kdLogFormatMessage(const KDchar* format, ...) {
    va_list ap;
    va_start(ap, format);
    kdLogFormatMessageVargs(format, ap);
    va_end(ap);
}

void kdLogFormatMessageVargs(const KDchar* format, va_list ap) {
    pal::detail::writeLogLine(formatMessage(format != nullptr ? format : "", ap).c_str());
}

}  // extern "C"
