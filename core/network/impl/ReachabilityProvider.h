#pragma once

#include <KD/kd.h>

#include "util/callback.h"

namespace Network {

// Follows the platform's reachability value, listening to the platform only
// while enabled (someone is interested) and not paused (the application
// runs). Owned by the network manager; its thread only.
class ReachabilityProvider {
public:
    typedef callback<void (*)(int)> OnChangedCallback;

    explicit ReachabilityProvider(OnChangedCallback onChanged);
    ~ReachabilityProvider();

    void enable();
    void disable();
    void onPaused();
    void onResumed();

    // The last value heard while listening, else the platform's current one.
    int getNetworkReachabilityStatus() const;

    static void onReachabilityEvent(const KDEvent* event);

private:
    ReachabilityProvider(const ReachabilityProvider&) = delete;
    ReachabilityProvider& operator=(const ReachabilityProvider&) = delete;

    bool isListening() const { return enabled && !paused; }
    void startListening();
    void stopListening();
    void update(int newStatus);

    // 0 while not listening.
    KDint palListener;
    OnChangedCallback onChanged;
    bool enabled;
    bool paused;
    int status;
};

}  // namespace Network
