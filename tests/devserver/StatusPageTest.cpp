#include "DevServerFixture.h"

namespace {

using StatusPageTest = DevServerFixture;

TEST_F(StatusPageTest, ListsWhatArrivedWithRequestTextEscaped) {
    ASSERT_TRUE(get("/startup?model=%3Cscript%3Ealert(1)%3C%2Fscript%3E&lang=en-US"));
    ASSERT_TRUE(get("/cellid_location/?uuid=%22%3E%3Cb%3E&wifinetworks=001a2b3c4d5e:-60"));
    ASSERT_TRUE(client->Post("/wifipool/2.x/", "x", "text/html<i>"));

    httplib::Result page = get("/");
    ASSERT_TRUE(page);
    EXPECT_EQ(200, page->status);
    EXPECT_EQ("text/html; charset=utf-8", page->get_header_value("Content-Type"));
    const std::string& html = page->body;
    EXPECT_NE(std::string::npos, html.find("model=&lt;script&gt;alert(1)&lt;/script&gt;"));
    EXPECT_NE(std::string::npos, html.find("<td>&quot;&gt;&lt;b&gt;</td>"));
    EXPECT_NE(std::string::npos, html.find("wifi 001a2b3c4d5e -60 (known)"));
    EXPECT_NE(std::string::npos, html.find("refused 415: not a multipart/form-data body"));
    EXPECT_EQ(std::string::npos, html.find("<script>"));
    EXPECT_EQ(std::string::npos, html.find("<b>"));
    EXPECT_EQ(std::string::npos, html.find("<i>"));
}

}  // namespace

namespace {

using ServerLifecycleTest = DevServerFixture;

TEST_F(ServerLifecycleTest, StartsAgainAfterStopWithItsJournal) {
    ASSERT_TRUE(get("/startup"));
    EXPECT_FALSE(server->start());
    server->stop();
    EXPECT_EQ(0, server->port());
    ASSERT_TRUE(server->start());
    EXPECT_EQ("http://127.0.0.1:" + std::to_string(server->port()) + "/", server->baseUrl());
    client.reset(new httplib::Client("127.0.0.1", server->port()));
    ASSERT_TRUE(get("/startup"));
    EXPECT_EQ(2u, server->journal().startups.size());
}

}  // namespace
