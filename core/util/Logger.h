#pragma once

// Levelled logging into the platform log. Any thread; `level` is meant to be
// set once at start.
class Logger {
public:
    enum Level { Error = 0, Warning = 1, Info = 2, Debug = 3 };

    // Messages above this level are dropped.
    static int level;

    static void log(Level messageLevel, const char* format, ...) __attribute__((format(printf, 2, 3)));
};
