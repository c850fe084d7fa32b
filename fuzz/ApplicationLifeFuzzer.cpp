// One application life per input: the scenario engine of the chaos test area
// reads its steps from the input (pause and resume, views, reachability,
// offline mode, tasks, positioning, location, statistics, server answers,
// re-entries from callbacks, time) and checks its promises after each step.
// A broken promise stops the run as a finding; the sanitizers catch the rest.
// MAPCORE_CHAOS_LOG=1 echoes the library's log while reproducing.
#include <cstdint>
#include <cstdio>
#include <cstdlib>

#include "engine/ApplicationLife.h"
#include "engine/ByteScript.h"
#include "engine/ChaosServer.h"

namespace {

const int kMaxSteps = 400;

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static ChaosServer* server = new ChaosServer();
    ApplicationLife life(*server);
    ByteScript script(data, size);
    if (!life.live(script, kMaxSteps)) {
        std::fprintf(stderr, "mapcore chaos: broken promise: %s\n", life.failure().c_str());
        std::abort();
    }
    return 0;
}
