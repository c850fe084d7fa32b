#include <gtest/gtest.h>

#include <boost/shared_ptr.hpp>
#include <string>

#include "util/callback.h"

namespace {

class Counter {
public:
    int add(int amount) { return total += amount; }
    int subtract(int amount) { return total -= amount; }
    void reset() { total = 0; }
    int total = 0;
};

int lastSeen = 0;
int remember(int value) {
    return lastSeen = value;
}
int readShared(boost::shared_ptr<int> pointer) {
    return *pointer;
}

typedef callback<int (*)(int)> IntCallback;

}  // namespace

TEST(CallbackTest, EmptyCallbackDoesNothingAndReturnsValueInitialisedResult) {
    EXPECT_EQ(0, IntCallback()(42));
    EXPECT_FALSE((callback<bool (*)()>()()));
    EXPECT_EQ(nullptr, (callback<boost::shared_ptr<std::string> (*)()>()()));
    EXPECT_EQ("", (callback<std::string (*)(const std::string&)>()("x")));
    callback<void (*)()>()();
}

TEST(CallbackTest, MethodAndFunctionCallbacksCallTheirTargetAsDoTheirCopies) {
    Counter counter;
    IntCallback add = IntCallback::make<Counter, &Counter::add>(&counter);
    IntCallback copy = add;
    EXPECT_EQ(5, add(5));
    EXPECT_EQ(8, copy(3));
    EXPECT_EQ(8, counter.total);
    callback<void (*)()>::make<Counter, &Counter::reset> (&counter)();
    EXPECT_EQ(0, counter.total);

    EXPECT_EQ(7, IntCallback::make<&remember>()(7));
    EXPECT_EQ(7, lastSeen);
    // A function callback ignores the object word.
    EXPECT_EQ(9, IntCallback(&lastSeen, &IntCallback::func_converter<&remember>)(9));
    // Arguments are passed through without keeping a copy.
    boost::shared_ptr<int> value(new int(4));
    EXPECT_EQ(4, (callback<int (*)(boost::shared_ptr<int>)>::make<&readShared>()(value)));
    EXPECT_EQ(1, value.use_count());
}

TEST(CallbackTest, EqualOnlyWhenReceiverAndTrampolineMatch) {
    Counter first;
    Counter second;
    IntCallback firstAdd = IntCallback::make<Counter, &Counter::add>(&first);

    EXPECT_TRUE(firstAdd == (IntCallback::make<Counter, &Counter::add>(&first)));
    EXPECT_FALSE(firstAdd == (IntCallback::make<Counter, &Counter::add>(&second)));
    EXPECT_FALSE(firstAdd == (IntCallback::make<Counter, &Counter::subtract>(&first)));
    EXPECT_TRUE(firstAdd != IntCallback());
    EXPECT_TRUE(IntCallback() == IntCallback());
    EXPECT_TRUE(IntCallback::make<&remember>() == IntCallback::make<&remember>());
}
