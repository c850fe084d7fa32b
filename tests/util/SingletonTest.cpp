#include <string>
#include <vector>

#include "support/PalTest.h"
#include "util/Singleton.h"

namespace {

std::vector<std::string> destroyed;

class First : public Util::Singleton<First> {
public:
    ~First() override { destroyed.push_back("First"); }
};

class Second : public Util::Singleton<Second> {
public:
    ~Second() override { destroyed.push_back("Second"); }
};

class Third : public Util::Singleton<Third> {
public:
    ~Third() override { destroyed.push_back("Third"); }
};

// Asks for a service that does not exist yet while being torn down.
class Late : public Util::Singleton<Late> {
public:
    ~Late() override { destroyed.push_back("Late"); }
};
class NeedsLateOnExit : public Util::Singleton<NeedsLateOnExit> {
public:
    ~NeedsLateOnExit() override {
        destroyed.push_back("NeedsLateOnExit");
        Late::getInstance();
    }
};

const char* const kTeardownWarning =
    "SingletonStorage::addSingleton adding singleton when isDestroying == true!";

class SingletonTest : public PalTest {
protected:
    void SetUp() override {
        destroyed.clear();
        PalTest::SetUp();
    }
};

}  // namespace

TEST_F(SingletonTest, CreatedOnceOnFirstUseAndDestroyedAtShutdownInReverseOrder) {
    First* first = First::getInstance();
    ASSERT_NE(nullptr, first);
    EXPECT_EQ(first, First::getInstance());
    Second::getInstance();
    Third::getInstance();
    EXPECT_TRUE(destroyed.empty());
    shutdownPal();
    EXPECT_EQ((std::vector<std::string>{"Third", "Second", "First"}), destroyed);
    EXPECT_TRUE(Util::SingletonStorage::getWasDestroyed());
    EXPECT_FALSE(Util::SingletonStorage::getIsDestroying());
}

TEST_F(SingletonTest, SingletonCreatedDuringTeardownWarnsOnceAndIsDestroyedInTheSamePass) {
    First::getInstance();
    NeedsLateOnExit::getInstance();
    Second::getInstance();
    shutdownPal();
    EXPECT_EQ((std::vector<std::string>{"Second", "NeedsLateOnExit", "Late", "First"}), destroyed);
    EXPECT_EQ(1, countLogLines(kTeardownWarning));
}

TEST_F(SingletonTest, EachPlatformRunGetsFreshInstances) {
    First::getInstance();
    shutdownPal();
    ASSERT_EQ((std::vector<std::string>{"First"}), destroyed);
    // The next run of the platform layer in this process.
    TearDown();
    SetUp();
    EXPECT_TRUE(destroyed.empty());
    First::getInstance();
    shutdownPal();
    EXPECT_EQ((std::vector<std::string>{"First"}), destroyed);
}

TEST_F(SingletonTest, TeardownTwiceOrRegisteringAfterTeardownAssertsAndDestroysEachObjectOnce) {
    Second::getInstance();
    shutdownPal();
    Util::SingletonStorage::deleteSingletonStorage(nullptr);
    expectAssertion("instance != nullptr");
    expectAssertion("!wasDestroyed");
    EXPECT_EQ((std::vector<std::string>{"Second"}), destroyed);
    EXPECT_TRUE(Util::SingletonStorage::getWasDestroyed());

    First::getInstance();
    expectAssertion("!wasDestroyed");
    // An embedding program that tears the store down again frees the late one.
    Util::SingletonStorage::deleteSingletonStorage(nullptr);
    expectAssertion("!wasDestroyed");
    EXPECT_EQ((std::vector<std::string>{"Second", "First"}), destroyed);
}
