#include "ChaosServer.h"

namespace {

const char* const kAnswerNames[] = {"ok", "slow", "cut", "wrong", "error", "refused"};

// What each path answers when all goes well.
struct ServedPath {
    const char* path;
    const char* body;
};
const ServedPath kServedPaths[] = {
    {"task", "done"},
    {"cellid_location/",
     "<?xml version=\"1.0\" encoding=\"utf-8\"?>"
     "<location><coordinates latitude=\"48.1372\" longitude=\"11.5756\" accuracy=\"120\"/></location>"},
    {"wifipool/2.x/", "OK"},
    // No hosts: the scenario keeps choosing which answer each host gives.
    {"startup", "<?xml version=\"1.0\" encoding=\"utf-8\"?><startup><uuid>chaos-client</uuid></startup>"},
};

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
    for (const ServedPath& served : kServedPaths) {
        const std::string body = served.body;
        script(Ok, served.path, reply(TestHttpServer::Reply::Whole, 200, body));
        TestHttpServer::Reply slow = reply(TestHttpServer::Reply::Chunked, 200, body);
        slow.chunkSize = 16;
        slow.delayMs = 5;
        script(Slow, served.path, slow);
        script(Cut, served.path, reply(TestHttpServer::Reply::DropMidBody, 200, std::string(4096, 'c')));
        script(Wrong, served.path,
               reply(TestHttpServer::Reply::Whole, 200, "<location><startup x=\"</wrong>"));
        script(ServerError, served.path, reply(TestHttpServer::Reply::Whole, 503, "busy"));
    }
}

void ChaosServer::script(Answer answer, const std::string& path, const TestHttpServer::Reply& reply) {
    server.on(std::string("/") + kAnswerNames[answer] + "/" + path, reply);
}

std::string ChaosServer::host(Answer answer) const {
    const int port = answer == Refused ? refusingPort : server.port();
    return "http://127.0.0.1:" + std::to_string(port) + "/" + kAnswerNames[answer] + "/";
}
