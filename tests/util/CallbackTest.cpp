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
    EXPECT_EQ(0.0, (callback<double (*)(double)>()(1.5)));
    EXPECT_EQ(nullptr, (callback<boost::shared_ptr<std::string> (*)()>()()));
    EXPECT_EQ("", (callback<std::string (*)(const std::string&)>()("x")));
    callback<void (*)()>()();
}

TEST(CallbackTest, MethodCallbackCallsItsReceiverAndReturnsTheResult) {
    Counter counter;
    IntCallback add = IntCallback::make<Counter, &Counter::add>(&counter);
    EXPECT_EQ(5, add(5));
    EXPECT_EQ(8, add(3));
    EXPECT_EQ(8, counter.total);

    callback<void (*)()> reset = callback<void (*)()>::make<Counter, &Counter::reset>(&counter);
    reset();
    EXPECT_EQ(0, counter.total);
}

TEST(CallbackTest, FunctionCallbackIgnoresTheObjectWord) {
    IntCallback function = IntCallback::make<&remember>();
    EXPECT_EQ(7, function(7));
    EXPECT_EQ(7, lastSeen);
    EXPECT_EQ(9, IntCallback(&lastSeen, &IntCallback::func_converter<&remember>)(9));
}

TEST(CallbackTest, CopiesCallTheSameReceiver) {
    Counter counter;
    IntCallback original = IntCallback::make<Counter, &Counter::add>(&counter);
    IntCallback copy = original;
    original(1);
    copy(2);
    EXPECT_EQ(3, counter.total);
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

TEST(CallbackTest, PassesSharedPointersThrough) {
    boost::shared_ptr<int> value(new int(4));
    callback<int (*)(boost::shared_ptr<int>)> read =
        callback<int (*)(boost::shared_ptr<int>)>::make<&readShared>();
    EXPECT_EQ(4, read(value));
    EXPECT_EQ(1, value.use_count());
}
