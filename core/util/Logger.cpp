#include "util/Logger.h"

#include <KD/kd.h>

int Logger::level = Logger::Debug;

void Logger::log(Level messageLevel, const char* format, ...) {
    if (messageLevel > level) {
        return;
    }
    va_list args;
    va_start(args, format);
    kdLogFormatMessageVargs(format, args);
    va_end(args);
}
