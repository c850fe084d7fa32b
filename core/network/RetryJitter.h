#pragma once

namespace Network {

// The random part of a retry wait. Clients that fail together (a server
// outage) and waited alike would come back together; drawn waits spread them.
// A small generator of its own (splitmix64), so that the same seed gives the
// same waits on every platform. One owner thread.
class RetryJitter {
public:
    explicit RetryJitter(unsigned long long seed);

    // Differs between devices and between policies made at different times;
    // on the virtual clock of a simulation it repeats with the clock.
    static unsigned long long seedFromClock();

    // Uniform in [low, high], both included; low when high is not above it.
    long long between(long long low, long long high);

private:
    unsigned long long next();

    unsigned long long state;
};

}  // namespace Network
