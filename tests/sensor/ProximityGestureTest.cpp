#include <boost/make_shared.hpp>
#include <list>
#include <string>

#include "sensor/proximity/ProximityGesture.h"
#include "support/PalTest.h"

namespace {

using Sensor::ProximityGesture;
typedef std::list<int> Periods;

boost::shared_ptr<ProximityGesture> gesture(const std::string& timeline) {
    return boost::make_shared<ProximityGesture>(timeline, timeline);
}

class ProximityGestureTest : public PalTest {};

}  // namespace

TEST_F(ProximityGestureTest, TimelineStringsCompileToPeriodsOf150MsPerCharacter) {
    struct Case {
        const char* timeline;
        Periods periods;
        bool endsCovered;
    };
    const Case cases[] = {
        {"**--**", {300, 300, 300}, true},
        {"*", {150}, true},
        {"-*-", {150, 150, 150}, false},
        {"***--", {450, 300}, false},
    };
    for (const Case& c : cases) {
        ProximityGesture compiled("g", c.timeline);
        EXPECT_EQ(c.periods, compiled.getTimeline()) << c.timeline;
        EXPECT_EQ(c.endsCovered, compiled.getEndsCovered()) << c.timeline;
        EXPECT_EQ(c.periods.size(), compiled.getLength()) << c.timeline;
    }
}

TEST_F(ProximityGestureTest, ScoresTheLatestPeriodsWithinToleranceAfterAPause) {
    const boost::shared_ptr<ProximityGesture> pattern = gesture("**--**");
    EXPECT_NEAR(0.9556f, pattern->compare(Periods{1600, 310, 290, 300}, true), 0.0005f);
    // Without an earlier period there is nothing to be a pause.
    EXPECT_NEAR(0.9556f, pattern->compare(Periods{310, 290, 300}, true), 0.0005f);
    EXPECT_EQ(0.0f, pattern->compare(Periods{1000, 310, 290, 300}, true));
    EXPECT_EQ(0.0f, pattern->compare(Periods{1500, 310, 290, 300}, true));
    EXPECT_EQ(-1.0f, pattern->compare(Periods{1600, 310, 290, 300}, false));
    EXPECT_EQ(-1.0f, pattern->compare(Periods{1600, 450, 300, 300}, true));
    EXPECT_EQ(-1.0f, pattern->compare(Periods{1600, 300, 150, 300}, true));
    EXPECT_EQ(-1.0f, pattern->compare(Periods{300, 300}, true));
    const boost::shared_ptr<ProximityGesture> afterPause = gesture("-----------**--**");
    EXPECT_EQ(-1.0f, pattern->compare(afterPause, false));
    EXPECT_EQ(1.0f, pattern->compare(afterPause, true));
}

TEST_F(ProximityGestureTest, CollisionWhenOneEndsLikeOrCouldBeginTheOther) {
    EXPECT_TRUE(gesture("*-*-*")->isCollisionPossible(gesture("*-*")));
    EXPECT_FALSE(gesture("*-*")->isCollisionPossible(gesture("*-*-*")));
    EXPECT_TRUE(gesture("*-*")->isCollisionPossible(gesture("*-*")));
    EXPECT_FALSE(gesture("**--**")->isCollisionPossible(gesture("*-*")));
    EXPECT_FALSE(gesture("*-*")->isCollisionPossible(gesture("******")));
    EXPECT_FALSE(gesture("******")->isCollisionPossible(gesture("*-*")));
    // Overlap of the widened periods decides: 150 and 300 still overlap.
    EXPECT_TRUE(gesture("**-*-*")->isCollisionPossible(gesture("*-")));
    EXPECT_FALSE(gesture("****-*-*")->isCollisionPossible(gesture("*-")));
}

TEST_F(ProximityGestureTest, InvalidTimelinesAreAssertedAndMatchNothing) {
    const std::string invalid[] = {"", "*x-", " *"};
    for (const std::string& timeline : invalid) {
        EXPECT_FALSE(ProximityGesture::isValidTimeline(timeline));
        ProximityGesture broken("broken", timeline);
        EXPECT_FALSE(broken.isValid());
        EXPECT_EQ(-1.0f, broken.compare(Periods{150, 150}, false));
        EXPECT_FALSE(broken.isCollisionPossible(gesture("*")));
    }
    expectAssertion("aTimeline.size() > 0");
    expectAssertion("aTimeline.empty() || isValidTimeline(aTimeline)");
    expectAssertion("aTimeline.empty() || isValidTimeline(aTimeline)");

    ProximityGesture empty("empty", Periods(), true);
    expectAssertion("timeline.size() > 0");
    EXPECT_EQ(-1.0f, empty.compare(Periods{150}, true));
    EXPECT_FALSE(ProximityGesture("zero", Periods{0, 150}, true).isValid());
}
