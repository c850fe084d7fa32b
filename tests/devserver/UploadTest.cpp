#include <cstdio>
#include <fstream>
#include <map>
#include <sstream>

#include "DevServerFixture.h"
#include "statistics/wifipool/UploadConstants.h"

namespace {

const char kDocument[] =
    "<?xml version=\"1.0\" encoding=\"windows-1251\" ?>\n"
    "<wifipool uuid=\"dev-1\" app_version=\"325\" app_platform=\"android\" clid=\"0\" manufacter=\"ACME\" "
    "model=\"Phone &amp; Co\"><chunk type=\"normal\" time=\"04122026:175951\" connection=\"wifi\">"
    "<cellinfos network_type=\"UNKNOWN\" radio_type=\"NONE\"><cellinfo cellid=\"23011\" lac=\"4021\" "
    "operatorid=\"26201\" countrycode=\"262\" sigstr=\"-85\" age=\"0\"></cellinfo></cellinfos>"
    "<bssids ><bssid name=\"aG9tZQ==\" channel=\"0\" sigstr=\"-48\" age=\"0\">001A2B3C4D5E</bssid>"
    "<bssid name=\"\" channel=\"0\" sigstr=\"-80\" age=\"0\">001A2B3C4D5F</bssid></bssids></chunk>"
    "<chunk type=\"disconnected\" time=\"04122026:175955\" connection=\"none\"><bssids ></bssids></chunk>"
    "</wifipool>";

const std::string kBoundary = Statistics::kUploadBoundary;

std::string readFile(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    std::ostringstream text;
    text << in.rdbuf();
    return text.str();
}

class UploadTest : public DevServerFixture {
protected:
    DevServer::Config configure(DevServer::Config config) override {
        config = DevServerFixture::configure(config);
        config.maxBodyBytes = 256 * 1024;
        config.maxDocumentBytes = 1024 * 1024;
        return config;
    }

    // The body Python makes of document: gzip, scrambling and multipart.
    // Remembered, since starting Python takes seconds on a loaded machine.
    std::string encode(const std::string& document, const std::string& key = Statistics::kUploadScrambleKey,
                       const std::string& boundary = kBoundary, int cut = 0) {
        static std::map<std::string, std::string> made;
        const std::string name = key + " " + boundary + " " + std::to_string(cut) + " " + document;
        if (made.count(name) == 0) {
            made[name] = runEncoder(document, key, boundary, cut);
        }
        return made[name];
    }

    std::string runEncoder(const std::string& document, const std::string& key, const std::string& boundary,
                           int cut) {
        const std::string path = dataFolder + "/document";
        std::ofstream(path, std::ios::binary) << document;
        const std::string command = std::string("python3 ") + UPLOAD_ENCODER + " " + key + " " + boundary +
                                    " " + path + " " + std::to_string(cut);
        FILE* pipe = popen(command.c_str(), "r");
        EXPECT_NE(nullptr, pipe);
        std::string body;
        char buffer[4096];
        std::size_t got = 0;
        while (pipe != nullptr && (got = std::fread(buffer, 1, sizeof(buffer), pipe)) > 0) {
            body.append(buffer, got);
        }
        EXPECT_TRUE(pipe != nullptr && pclose(pipe) == 0) << command;
        return body;
    }

    httplib::Result post(const std::string& body, const std::string& boundary = kBoundary) {
        return client->Post("/wifipool/2.x/?uuid=dev-1&lang=en-US&gzip=1", body,
                            ("multipart/form-data; boundary=" + boundary).c_str());
    }
};

TEST_F(UploadTest, DecodesAnUploadMadeElsewhereAndStoresIt) {
    const std::string body = encode(kDocument);
    httplib::Result first = post(body);
    ASSERT_TRUE(first);
    EXPECT_EQ(200, first->status) << first->body;
    httplib::Result second = post(body);
    ASSERT_TRUE(second);

    const DevServer::Journal journal = server->journal();
    ASSERT_EQ(2u, journal.uploads.size());
    const DevServer::UploadRecord& upload = journal.uploads[0];
    EXPECT_TRUE(upload.accepted);
    EXPECT_EQ(2, upload.chunks);
    EXPECT_EQ((std::vector<std::string>{"normal", "disconnected"}), upload.chunkTypes);
    EXPECT_EQ(2, upload.accessPoints);
    EXPECT_EQ("dev-1", upload.uuid);
    EXPECT_EQ("Phone & Co", upload.model);
    EXPECT_EQ(body.size(), upload.bytes);
    EXPECT_EQ(kDocument, upload.document);
    EXPECT_EQ("upload-000001.xml", upload.storedFile);
    EXPECT_EQ("upload-000002.xml", journal.uploads[1].storedFile);
    EXPECT_EQ(kDocument, readFile(dataFolder + "/uploads/upload-000001.xml"));

    std::istringstream index(readFile(dataFolder + "/uploads/index.tsv"));
    std::string line;
    ASSERT_TRUE(std::getline(index, line));
    EXPECT_EQ(0u, line.find("upload-000001.xml\t"));
    EXPECT_NE(std::string::npos,
              line.find("\t" + std::to_string(body.size()) + "\t2\tnormal,disconnected\tdev-1\tPhone & Co"))
        << line;
    ASSERT_TRUE(std::getline(index, line));
    EXPECT_EQ(0u, line.find("upload-000002.xml\t"));
}

TEST_F(UploadTest, NumbersOnAfterTheUploadsOfAnEarlierRun) {
    const std::string body = encode(kDocument);
    ASSERT_TRUE(post(body));
    server.reset(new DevServer::Server(configure(DevServer::Config::defaults()), dataFolder + "/uploads"));
    ASSERT_TRUE(server->start());
    client.reset(new httplib::Client("127.0.0.1", server->port()));
    ASSERT_TRUE(post(body));
    EXPECT_EQ("upload-000002.xml", server->journal().uploads.at(0).storedFile);
}

TEST_F(UploadTest, PrintsOneSummaryLinePerUpload) {
    DevServer::Config config = configure(DevServer::Config::defaults());
    config.quiet = false;
    std::vector<std::string> lines;
    server.reset(new DevServer::Server(config, ""));
    server->setSummarySink([&lines](const std::string& line) { lines.push_back(line); });
    ASSERT_TRUE(server->start());
    client.reset(new httplib::Client("127.0.0.1", server->port()));
    const std::string body = encode(kDocument);
    ASSERT_TRUE(post(body));
    server->stop();
    ASSERT_EQ(1u, lines.size());
    EXPECT_EQ("devserver: upload kept in memory: 2 chunks (normal,disconnected), 2 access points, " +
                  std::to_string(body.size()) + " bytes, uuid dev-1, model Phone & Co",
              lines[0]);
}

// In its UTF-8 mode TinyXML would take "\xE0</" for one character, so these
// end tags would vanish and the elements nest a hundred thousand deep.
TEST_F(UploadTest, ReadsLeadBytesBeforeEndTagsAsSingleCharacters) {
    std::string document = "<?xml version=\"1.0\" encoding=\"UTF-8\"?><wifipool>";
    for (int i = 0; i < 100000; ++i) {
        document += "<a>\xE0</a>";
    }
    document += "</wifipool>";
    httplib::Result result = post(encode(document));
    ASSERT_TRUE(result);
    EXPECT_EQ(200, result->status) << result->body;
    expectServing();
}

struct BadUpload {
    const char* name;
    int status;
    const char* reason;
    // Makes the body and its Content-Type.
    std::string (*make)(UploadTest& test, std::string& contentType);
};

class BadUploadTest : public UploadTest, public ::testing::WithParamInterface<BadUpload> {
public:
    using UploadTest::encode;
};

std::string multipart(std::string& contentType, const std::string& body) {
    contentType = "multipart/form-data; boundary=" + kBoundary;
    return body;
}

TEST_P(BadUploadTest, IsRefusedLoggedAndRecorded) {
    std::string contentType;
    const std::string body = GetParam().make(*this, contentType);
    httplib::Result result = client->Post("/wifipool/2.x/?gzip=1", body, contentType.c_str());
    ASSERT_TRUE(result);
    EXPECT_EQ(GetParam().status, result->status) << result->body;
    EXPECT_TRUE(logged("refused POST /wifipool/2.x/ from 127.0.0.1")) << ::testing::PrintToString(logLines());
    const DevServer::Journal journal = server->journal();
    ASSERT_EQ(1u, journal.uploads.size());
    EXPECT_FALSE(journal.uploads[0].accepted);
    EXPECT_EQ(GetParam().status, journal.uploads[0].status);
    EXPECT_NE(std::string::npos, journal.uploads[0].reason.find(GetParam().reason))
        << journal.uploads[0].reason;
    EXPECT_FALSE(std::filesystem::exists(dataFolder + "/uploads/upload-000001.xml"));
    expectServing();
}

INSTANTIATE_TEST_SUITE_P(
    Uploads, BadUploadTest,
    ::testing::Values(
        BadUpload{"ScrambledWithAnotherKey", 400, "does not unscramble to gzip",
                  [](UploadTest& test, std::string& type) {
                      std::string key = Statistics::kUploadScrambleKey;
                      key[0] = key[0] == 'A' ? 'B' : 'A';
                      return multipart(type, static_cast<BadUploadTest&>(test).encode(kDocument, key));
                  }},
        BadUpload{"NotXml", 400, "not well-formed XML",
                  [](UploadTest& test, std::string& type) {
                      return multipart(type, static_cast<BadUploadTest&>(test).encode("plain text <not xml"));
                  }},
        BadUpload{"AnotherRoot", 400, "root is not <wifipool>",
                  [](UploadTest& test, std::string& type) {
                      return multipart(type, static_cast<BadUploadTest&>(test).encode("<other></other>"));
                  }},
        // 389 KB that TinyXML's pairwise duplicate check once took 17.7 s over.
        BadUpload{"FortyThousandAttributes", 400, "element <wifipool> has more than 32 attributes",
                  [](UploadTest& test, std::string& type) {
                      std::string document = "<wifipool";
                      for (int i = 0; i < 40000; ++i) {
                          document += " a" + std::to_string(i) + "=\"\"";
                      }
                      document += "></wifipool>";
                      return multipart(type, static_cast<BadUploadTest&>(test).encode(document));
                  }},
        BadUpload{"NestedTooDeep", 400, "elements nested deeper than 32 levels",
                  [](UploadTest& test, std::string& type) {
                      std::string bomb = "<wifipool>";
                      for (int i = 0; i < 200000; ++i) {
                          bomb += "<a>";
                      }
                      return multipart(type, static_cast<BadUploadTest&>(test).encode(bomb));
                  }},
        BadUpload{"DocumentTooLarge", 413, "document larger than 1048576 bytes",
                  [](UploadTest& test, std::string& type) {
                      const std::string big =
                          "<wifipool>" + std::string(2 * 1024 * 1024, ' ') + "</wifipool>";
                      return multipart(type, static_cast<BadUploadTest&>(test).encode(big));
                  }},
        BadUpload{"GzipCutShort", 400, "gzip data ends early",
                  [](UploadTest& test, std::string& type) {
                      return multipart(type, static_cast<BadUploadTest&>(test).encode(
                                                 kDocument, Statistics::kUploadScrambleKey, kBoundary, 12));
                  }},
        BadUpload{"AnotherBoundary", 400, "is not this build's",
                  [](UploadTest& test, std::string& type) {
                      const std::string other = "0123456789ABCDEF012";
                      type = "multipart/form-data; boundary=" + other;
                      return static_cast<BadUploadTest&>(test).encode(kDocument,
                                                                      Statistics::kUploadScrambleKey, other);
                  }},
        BadUpload{"NoDataPart", 400, "no \"data\" part",
                  [](UploadTest&, std::string& type) {
                      return multipart(
                          type, "--" + kBoundary +
                                    "\r\nContent-Disposition: form-data; name=\"lang\"\r\n\r\nen\r\n--" +
                                    kBoundary + "--\r\n");
                  }},
        BadUpload{"MultipartNeverClosed", 400, "malformed request or multipart body",
                  [](UploadTest&, std::string& type) {
                      return multipart(
                          type,
                          "--" + kBoundary + "\r\nContent-Disposition: form-data; name=\"data\"\r\n\r\nabc");
                  }},
        BadUpload{"NotMultipart", 415, "not a multipart/form-data body",
                  [](UploadTest&, std::string& type) {
                      type = "application/octet-stream";
                      return std::string("data");
                  }},
        BadUpload{
            "BodyTooLarge", 413, "body larger than 262144 bytes",
            [](UploadTest&, std::string& type) { return multipart(type, std::string(300 * 1024, 'x')); }}),
    [](const ::testing::TestParamInfo<BadUpload>& info) { return std::string(info.param.name); });

}  // namespace
