// Whole application lives played by the scenario engine from fixed seeds: the
// same engine the ApplicationLife fuzz target runs, here a few thousand steps
// long in total, on the virtual clock against loopback servers. Every
// promise the engine checks after each step must hold in every life.
#include <gtest/gtest.h>

#include "engine/ApplicationLife.h"
#include "engine/ByteScript.h"
#include "engine/ChaosServer.h"

namespace {

const int kStepsPerLife = 1000;
// Each step reads at most a handful of bytes.
const std::size_t kScriptBytes = 8 * kStepsPerLife;

class ApplicationLifeTest : public ::testing::TestWithParam<std::uint64_t> {};

TEST_P(ApplicationLifeTest, KeepsEveryPromiseThroughALifeFromASeed) {
    ChaosServer server;
    ApplicationLife life(server);
    const std::vector<std::uint8_t> bytes = ByteScript::expandSeed(GetParam(), kScriptBytes);
    ByteScript script(bytes.data(), bytes.size());

    EXPECT_TRUE(life.live(script, kStepsPerLife)) << life.failure();
    EXPECT_EQ(kStepsPerLife, life.stepsPlayed());
    EXPECT_GT(server.requestCount(), 0u);
}

INSTANTIATE_TEST_SUITE_P(Seeds, ApplicationLifeTest, ::testing::Range<std::uint64_t>(1, 9));

}  // namespace
