#include <KD/kd.h>
#include <pal/Simulation.h>

#include "support/PalTest.h"

namespace {

class DiagnosticsTest : public PalTest {};

}  // namespace

// A damaged package must not kill a released application: the default handler only logs
// there. A debug build still stops at the fault.
TEST_F(DiagnosticsTest, TheDefaultAssertionHandlerLogsAndReturnsInAReleaseBuildAndAbortsInADebugBuild) {
    pal::setAssertionHandler(pal::AssertionHandler());
#ifdef NDEBUG
    kdHandleAssertion("x == 1", "lib/file.cpp", 12);
    EXPECT_TRUE(hasLogLine("lib/file.cpp:12: Assertion failed: x == 1"));
#else
    EXPECT_DEATH(kdHandleAssertion("x == 1", "lib/file.cpp", 12), "");
#endif
}
