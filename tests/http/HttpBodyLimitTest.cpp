// Bodies are bounded by what the caller allows, not by what a server sends:
// a server that keeps streaming is cut off with a failure of its own, and
// what is kept of an error answer's body stays small.
#include "HttpTest.h"

namespace {

class HttpBodyLimitTest : public HttpTest {
protected:
    // A chunked answer of piece repeated count times; the server stops by
    // itself after that, or when the client leaves.
    std::string stream(const std::string& path, const std::string& piece, std::size_t count,
                       int status = 200) {
        Reply reply;
        reply.mode = Reply::Repeated;
        reply.body = piece;
        reply.repeatCount = count;
        reply.status = status;
        server->on(path, reply);
        return server->url(path);
    }
};

TEST_F(HttpBodyLimitTest, AServerThatKeepsStreamingIsCutOffAtTheDefaultLimitInWholeBodyMode) {
    // 64 MiB, twice the default limit.
    const std::string url = stream("/endless", std::string(64 << 10, 's'), 1024);
    std::unique_ptr<Recorder> recorder = fetch(url);
    EXPECT_EQ(recorder->code, Network::HTTP_BODY_TOO_LARGE_ERROR_CODE);
    EXPECT_EQ(recorder->events, (std::vector<std::string>{"response", "finished"}));
    EXPECT_EQ(recorder->status(), 200);
    EXPECT_TRUE(recorder->body.empty());
    EXPECT_EQ(countLogLines("the body is larger than 33554432 bytes"), 1);
}

TEST_F(HttpBodyLimitTest, ALimitSetByTheCallerAdmitsABodyOfExactlyThatSizeInEitherMode) {
    const std::string exact = serve("/exact", Reply::Whole, std::string(100000, 'e'));
    const std::string over = stream("/over", std::string(1000, 'o'), 101);
    for (bool wholeBody : {true, false}) {
        Recorder fits(Recorder::get(exact), wholeBody);
        Recorder beyond(Recorder::get(over), wholeBody);
        fits.connection->setMaxBodySize(100000);
        beyond.connection->setMaxBodySize(100000);
        ASSERT_TRUE(Recorder::runAll({&fits, &beyond}));

        EXPECT_EQ(fits.code, Network::HTTP_FINISHED_OK) << wholeBody;
        EXPECT_EQ(fits.body.size(), 100000u) << wholeBody;
        EXPECT_EQ(beyond.code, Network::HTTP_BODY_TOO_LARGE_ERROR_CODE) << wholeBody;
        EXPECT_EQ(beyond.events.back(), "finished") << wholeBody;
        // Parts already handed over stay within the limit; a whole body is never handed over.
        EXPECT_LE(beyond.body.size(), wholeBody ? 0u : 100000u) << wholeBody;
    }
}

TEST_F(HttpBodyLimitTest, PartsModeHasNoDefaultLimitButZeroLiftsTheWholeBodyOne) {
    // Beyond the default limit of whole bodies, a MiB at a time.
    const std::size_t count = (Network::HttpConnection::kDefaultMaxWholeBodySize >> 20) + 1;
    const std::string url = stream("/long", std::string(1 << 20, 'l'), count);
    Recorder parts(Recorder::get(url), false);
    Recorder whole(Recorder::get(url), true);
    whole.connection->setMaxBodySize(0);
    ASSERT_TRUE(Recorder::runAll({&parts, &whole}));
    for (Recorder* recorder : {&parts, &whole}) {
        EXPECT_EQ(recorder->code, Network::HTTP_FINISHED_OK);
        EXPECT_EQ(recorder->body.size(), count << 20);
    }
}

TEST_F(HttpBodyLimitTest, OnlyTheStartOfAnErrorAnswersBodyIsKeptAndTheExchangeStillCompletes) {
    const std::string url = stream("/error", std::string(4096, 'e'), 256, 500);
    std::unique_ptr<Recorder> recorder = fetch(url);
    EXPECT_EQ(recorder->code, Network::HTTP_FINISHED_OK);
    EXPECT_EQ(recorder->status(), 500);
    EXPECT_EQ(recorder->body, std::string(Network::HttpConnection::kMaxKeptErrorBodySize, 'e'));

    // In parts the caller sees everything and decides for itself.
    std::unique_ptr<Recorder> parts = fetch(url, 10000, false);
    EXPECT_EQ(parts->code, Network::HTTP_FINISHED_OK);
    EXPECT_EQ(parts->body.size(), 4096u * 256);
}

}  // namespace
