#pragma once

#include <gtest/gtest.h>
#include <httplib.h>
#include <stdlib.h>

#include <filesystem>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "devserver/Server.h"

// A quiet development server on a free loopback port with a fresh data
// folder, its log captured, and a plain HTTP client for it.
class DevServerFixture : public ::testing::Test {
protected:
    void SetUp() override { startServer(configure(DevServer::Config::defaults())); }

    void TearDown() override {
        server.reset();
        std::error_code ignored;
        std::filesystem::remove_all(dataFolder, ignored);
    }

    // Tests change the config here before the server starts.
    virtual DevServer::Config configure(DevServer::Config config) {
        config.quiet = true;
        return config;
    }

    void startServer(const DevServer::Config& config) {
        std::string pattern = (std::filesystem::temp_directory_path() / "mapcore-devserver-XXXXXX").string();
        ASSERT_NE(nullptr, mkdtemp(pattern.data()));
        dataFolder = pattern;
        server.reset(new DevServer::Server(config, dataFolder + "/uploads"));
        server->setLogSink([this](const std::string& line) {
            std::lock_guard<std::mutex> lock(logMutex);
            log.push_back(line);
        });
        ASSERT_TRUE(server->start());
        client.reset(new httplib::Client("127.0.0.1", server->port()));
    }

    httplib::Result get(const std::string& target) { return client->Get(target.c_str()); }

    // The server answers its status page: it still serves.
    void expectServing() {
        httplib::Result page = get("/");
        ASSERT_TRUE(page);
        EXPECT_EQ(200, page->status);
    }

    std::vector<std::string> logLines() {
        std::lock_guard<std::mutex> lock(logMutex);
        return log;
    }

    bool logged(const std::string& part) {
        for (const std::string& line : logLines()) {
            if (line.find(part) != std::string::npos) {
                return true;
            }
        }
        return false;
    }

    std::string dataFolder;
    std::unique_ptr<DevServer::Server> server;
    std::unique_ptr<httplib::Client> client;
    std::mutex logMutex;
    std::vector<std::string> log;
};
