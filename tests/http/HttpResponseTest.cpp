#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "network/HttpResponse.h"

using Network::HttpResponse;

TEST(HttpResponseTest, ContentLengthIsOneClearNumberOrUnknown) {
    const struct {
        std::vector<std::string> values;
        long long expected;
    } cases[] = {
        {{"11"}, 11},
        {{"0"}, 0},
        {{"9223372036854775807"}, 9223372036854775807LL},
        {{"42, 42"}, 42},
        {{"3", "3"}, 3},
        {{}, -1},
        {{""}, -1},
        {{"abc"}, -1},
        {{"12abc"}, -1},
        {{"-5"}, -1},
        {{"+5"}, -1},
        {{"0x10"}, -1},
        {{"1e3"}, -1},
        {{"9223372036854775808"}, -1},
        {{"99999999999999999999999"}, -1},
        {{"42, 43"}, -1},
        {{"42,"}, -1},
        {{"3", "5"}, -1},
        {{"3", "x"}, -1},
    };
    for (const auto& entry : cases) {
        HttpResponse::Headers headers = {{"Content-Type", "text/plain"}};
        std::string shown;
        for (const std::string& value : entry.values) {
            headers.push_back(std::make_pair("content-length", value));
            shown += "[" + value + "]";
        }
        SCOPED_TRACE(shown);

        EXPECT_EQ(entry.expected, HttpResponse(200, "OK", headers).getContentLength());
    }
}
