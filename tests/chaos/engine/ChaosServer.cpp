#include "ChaosServer.h"

namespace {

const char* const kAnswerNames[] = {"ok", "slow", "cut", "wrong", "error", "refused"};
const char* const kServedPaths[] = {"task", "cellid_location/", "wifipool/2.x/"};

const char kPositionBody[] =
    "<?xml version=\"1.0\" encoding=\"utf-8\"?>"
    "<location><coordinates latitude=\"48.1372\" longitude=\"11.5756\" accuracy=\"120\"/></location>";

TestHttpServer::Reply reply(TestHttpServer::Reply::Mode mode, int status, const std::string& body) {
    TestHttpServer::Reply answer;
    answer.mode = mode;
    answer.status = status;
    answer.body = body;
    answer.contentType = "text/xml";
    return answer;
}

}  // namespace

const char* const ChaosServer::kTaskPath = "task";

ChaosServer::ChaosServer() : refusingPort(TestHttpServer::closedPort()) {
    script(Ok, reply(TestHttpServer::Reply::Whole, 200, kPositionBody));
    TestHttpServer::Reply slow = reply(TestHttpServer::Reply::Chunked, 200, std::string(kPositionBody));
    slow.chunkSize = 16;
    slow.delayMs = 5;
    script(Slow, slow);
    script(Cut, reply(TestHttpServer::Reply::DropMidBody, 200, std::string(4096, 'c')));
    script(Wrong, reply(TestHttpServer::Reply::Whole, 200, "<location><coordinates latitude=\"x\"</wrong>"));
    script(ServerError, reply(TestHttpServer::Reply::Whole, 503, "busy"));
}

void ChaosServer::script(Answer answer, const TestHttpServer::Reply& reply) {
    for (const char* path : kServedPaths) {
        server.on(std::string("/") + kAnswerNames[answer] + "/" + path, reply);
    }
}

std::string ChaosServer::host(Answer answer) const {
    const int port = answer == Refused ? refusingPort : server.port();
    return "http://127.0.0.1:" + std::to_string(port) + "/" + kAnswerNames[answer] + "/";
}
