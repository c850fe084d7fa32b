#include "ChaosTask.h"

#include "network/NetworkErrorCodes.h"

namespace {

// Real time; generous, so that a loaded machine never turns an answer into a timeout.
const int kRequestTimeoutMs = 20000;

}  // namespace

int ChaosTask::live = 0;

ChaosTask::ChaosTask(const Settings& settings, OwnerHook ownerHook, InvariantReport& report)
    : settings(settings),
      ownerHook(ownerHook),
      report(report),
      ready(settings.ready),
      cancelled(false),
      finals(0) {
    ++live;
}

ChaosTask::~ChaosTask() {
    --live;
}

boost::shared_ptr<Network::HttpRequest> ChaosTask::issueRequest() const {
    return Network::HttpRequest::create(settings.url->c_str(), "GET", kRequestTimeoutMs, false);
}

void ChaosTask::onResponseRecieved(boost::shared_ptr<Network::HttpResponse>) {
    if (admit("response")) {
        reenterIf(CancelOnResponse);
    }
}

void ChaosTask::onBytesReceived(const std::vector<unsigned char>& bytes) {
    if (!admit("bytes")) {
        return;
    }
    body.insert(body.end(), bytes.begin(), bytes.end());
    reenterIf(CancelOnBytes);
}

void ChaosTask::onFinished(int code) {
    if (!admit("finish")) {
        return;
    }
    // The manager keeps an offline finish's task and runs it again later.
    if (code == Network::OFFLINE_ERROR_CODE) {
        return;
    }
    ++finals;
    if (finalHook) {
        finalHook();
    }
    body.clear();
    body.shrink_to_fit();
    reenterIf(ReleaseOnFinish);
    reenterIf(SubmitOnFinish);
}

void ChaosTask::onRetried() {
    if (admit("retry")) {
        reenterIf(CancelOnRetry);
    }
}

bool ChaosTask::admit(const char* callback) {
    if (cancelled) {
        report.breach(std::string("a cancelled task heard ") + callback);
        return false;
    }
    if (finals > 0) {
        report.breach(std::string("a finished task heard ") + callback);
        return false;
    }
    return true;
}

void ChaosTask::reenterIf(Reentry due) {
    if (settings.reentry == due && ownerHook) {
        // The hook may drop the owner's reference: keep this task alive until
        // the callback has returned, as the manager does.
        boost::shared_ptr<ChaosTask> self = shared_from_this();
        ownerHook(*this, due);
    }
}
