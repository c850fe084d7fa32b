#pragma once

// Uniform random numbers from the C library's 48-bit generator (seeded with srand48). The
// generator's state is process-wide and unguarded: use it from one thread at a time.
class Random {
public:
    // A uniform value between t0 and t1, given in either order.
    static float nextFloat(float t0, float t1);
};
