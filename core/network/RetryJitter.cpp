#include "network/RetryJitter.h"

#include <KD/kd.h>

namespace Network {

namespace {

const unsigned long long kGoldenGamma = 0x9e3779b97f4a7c15ull;

}  // namespace

RetryJitter::RetryJitter(unsigned long long seed) : state(seed) {}

unsigned long long RetryJitter::seedFromClock() {
    const unsigned long long uptime = kdGetTimeUST();
    const unsigned long long wallSeconds = static_cast<unsigned long long>(kdTime(nullptr));
    return uptime * kGoldenGamma ^ wallSeconds;
}

long long RetryJitter::between(long long low, long long high) {
    if (high <= low) {
        return low;
    }
    const unsigned long long span = static_cast<unsigned long long>(high - low) + 1;
    // Draws above the last whole multiple of span are redrawn, so that no
    // value is favoured by the modulo.
    const unsigned long long limit = ~0ull - (~0ull % span + 1) % span;
    unsigned long long value = next();
    while (value > limit) {
        value = next();
    }
    return low + static_cast<long long>(value % span);
}

unsigned long long RetryJitter::next() {
    unsigned long long z = (state += kGoldenGamma);
    z = (z ^ (z >> 30)) * 0xbf58476d1ce4e5b9ull;
    z = (z ^ (z >> 27)) * 0x94d049bb133111ebull;
    return z ^ (z >> 31);
}

}  // namespace Network
