// The HTTP engine against a real server: a cpp-httplib server on loopback
// serves a page and takes a multipart form; the scene fetches the page and
// posts the form through HttpConnection, printing what arrives and on which
// thread.
#include <KD/kdext.h>

#include <boost/make_shared.hpp>
#include <memory>
#include <string>
#include <thread>

#include "DemoScene.h"
#include "network/HttpConnection.h"
#include "network/HttpEngine.h"
#include "network/HttpRequest.h"

#include <httplib.h>

namespace {

using Network::DataChunk;
using Network::HttpConnection;
using Network::HttpRequest;
using Network::HttpResponse;

const char kPage[] = "<html><body><h1>Tiles for Berlin</h1><p>3 updates waiting</p></body></html>";

// Main thread; the server answers on its own threads.
class HttpScene : public DemoScene {
public:
    HttpScene() : engine(new Network::HttpEngine()), port(0) {}

    // The engine goes first: closing its kept-alive connection lets the
    // server's thread end now instead of after its keep-alive wait.
    ~HttpScene() override {
        engine.reset();
        if (serverThread.joinable()) {
            server.stop();
            serverThread.join();
        }
    }

    void run(Done done) override {
        finished = done;
        startServer();
        if (port <= 0) {
            demo::say("could not bind a loopback port; skipping");
            finished();
            return;
        }
        demo::say("cpp-httplib server listening on 127.0.0.1:%d", port);
        fetchPage();
    }

private:
    void startServer() {
        // Headers and body leave in separate writes; without this, Nagle's
        // algorithm holds the body back until the client's delayed ACK.
        server.set_tcp_nodelay(true);
        server.Get("/", [](const httplib::Request&, httplib::Response& response) {
            response.set_content(kPage, "text/html");
        });
        server.Post("/form", [](const httplib::Request& request, httplib::Response& response) {
            std::string answer = "server parsed " + std::to_string(request.files.size()) + " fields:";
            for (const auto& field : request.files) {
                answer += " " + field.first + "=" + std::to_string(field.second.content.size()) + " bytes";
                if (!field.second.filename.empty()) {
                    answer += " (file " + field.second.filename + ")";
                }
            }
            response.set_content(answer, "text/plain");
        });
        port = server.bind_to_any_port("127.0.0.1");
        if (port > 0) {
            serverThread = std::thread([this] { server.listen_after_bind(); });
        }
    }

    std::string url(const char* path) const { return "http://127.0.0.1:" + std::to_string(port) + path; }

    boost::shared_ptr<HttpConnection> connect(const boost::shared_ptr<HttpRequest>& request) {
        boost::shared_ptr<HttpConnection> made =
            boost::make_shared<HttpConnection>(request, boost::weak_ptr<Network::NetworkSpeedCollector>(), 1);
        made->setOnResponseReceivedCallback(
            HttpConnection::OnResponseReceivedCallback::make<HttpScene, &HttpScene::onResponse>(this));
        made->setOnBodyDataReceivedCallback(
            HttpConnection::OnBodyDataReceivedCallback::make<HttpScene, &HttpScene::onBody>(this), true);
        made->setOnFinishedCallback(
            HttpConnection::OnFinishedCallback::make<HttpScene, &HttpScene::onFinished>(this));
        return made;
    }

    void fetchPage() {
        demo::say("GET %s", url("/").c_str());
        connection = connect(HttpRequest::create(url("/").c_str(), "GET", 30000, false));
        connection->start();
    }

    void postForm() {
        boost::shared_ptr<HttpRequest::MultipartBuilder> form =
            HttpRequest::MultipartBuilder::create("5F3A9C0E1B7D24680AC");
        form->addField("city", "Berlin", false, false, "");
        std::string trace(2048, '\0');
        for (std::size_t i = 0; i < trace.size(); ++i) {
            trace[i] = static_cast<char>(i * 31);
        }
        form->addField("trace", trace, true, true, "");
        boost::shared_ptr<HttpRequest> request =
            HttpRequest::create(url("/form").c_str(), "POST", 30000, false);
        request->setBody(form->getBoundary(), form->getEncodedContent());
        demo::say("POST %s: multipart form, boundary %s, %zu bytes", url("/form").c_str(),
                  form->getBoundary().c_str(), form->getEncodedContent().size());
        connection = connect(request);
        connection->start();
    }

    void onResponse(boost::shared_ptr<HttpConnection>, boost::shared_ptr<HttpResponse> response) {
        demo::say("  response %d %s, Content-Type \"%s\", length %lld (on main thread: %s)",
                  response->getStatusCode(), response->getReasonPhrase().c_str(),
                  response->getContentType().c_str(), response->getContentLength(),
                  kdThreadIsMainZVR() ? "yes" : "no");
    }

    void onBody(boost::shared_ptr<HttpConnection>, boost::shared_ptr<DataChunk> chunk) {
        demo::say("  body (%zu bytes): %s", chunk->size(), std::string(chunk->begin(), chunk->end()).c_str());
    }

    void onFinished(boost::shared_ptr<HttpConnection> from, int code) {
        demo::say("  finished with %d after sending %lld bytes", code, from->getRequestSize());
        connection.reset();
        if (code == 0 && from->getRequestPath() == "/") {
            postForm();
            return;
        }
        finished();
    }

    std::unique_ptr<Network::HttpEngine> engine;
    httplib::Server server;
    int port;
    std::thread serverThread;
    boost::shared_ptr<HttpConnection> connection;
    Done finished;
};

DemoSceneRegistration<HttpScene> registration("HTTP engine", 50);

}  // namespace
