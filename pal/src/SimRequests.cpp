// Simulated one-shot radio queries (Wi-Fi scan, cell information, signal
// strength): each request is answered as its script says, after a delay, never,
// or refused with handle 0. Answers 107 and 111 carry records that the receiver
// hands back through the release function in the event.
#include <KD/kdext.h>
#include <pal/Simulation.h>

#include <algorithm>
#include <memory>
#include <mutex>
#include <string>
#include <unordered_map>
#include <vector>

#include "Runtime.h"
#include "SimInternal.h"

namespace {

using pal::Answer;
using pal::detail::ActionId;

enum class Kind { WifiScan, CellInfo, SignalStrength };

KDint32 eventType(Kind kind) {
    switch (kind) {
        case Kind::WifiScan:
            return KD_EVENT_WIFI_SCAN_ZVR;
        case Kind::CellInfo:
            return KD_EVENT_TELEPHONY_NETWORK_INFO_ZVR;
        case Kind::SignalStrength:
            break;
    }
    return KD_EVENT_TELEPHONY_SIGNAL_STRENGTH_ZVR;
}

// What the next request of each kind gets; also the data a started request
// answers with, captured at its start.
struct Script {
    Answer answer = Answer::after(0);
    std::vector<pal::WifiNetwork> networks;
    pal::CellInfo cell;
    bool success = false;
    int strength = 0;
};

struct Request {
    Kind kind;
    KDThread* thread;
    void* userptr;
    Script script;
    ActionId action = 0;
    // The answer event has been posted; it may still sit in the queue.
    bool answered = false;
};

struct WifiRecord {
    KDWifiScanResultZVR result{};
    std::vector<std::string> texts;
    std::vector<KDWifiScanEntryZVR> entries;
};

struct CellRecord {
    KDTelephonyNetworkInfoZVR info{};
};

// A record handed out with an answer: its owner and the request it answers.
struct Outstanding {
    std::shared_ptr<void> owner;
    KDint handle;
};

struct RequestState {
    std::unordered_map<Kind, Script> scripts{
        {Kind::WifiScan, Script()}, {Kind::CellInfo, Script()}, {Kind::SignalStrength, Script()}};
    std::unordered_map<KDint, Request> requests;
    std::unordered_map<const void*, Outstanding> records;
};

// Each answer carries its request's handle in this data word (after the
// record and release words), so that a cancel discards exactly its own answer.
const int kHandleWord = 2;

std::mutex gMutex;
RequestState gState;
// Records handed out before a reset: no longer counted, still freed when their
// receiver releases them, since their events may still be queued.
std::unordered_map<const void*, Outstanding> gForgottenRecords;
// Never restarts, so a stale handle cannot cancel a newer request.
KDint gNextHandle = 1;

void copyText(KDchar* buffer, std::size_t size, const std::string& text) {
    const std::size_t length = std::min(text.size(), size - 1);
    text.copy(buffer, length);
    buffer[length] = '\0';
}

void releaseRecordLocked(const void* record) {
    auto it = gState.records.find(record);
    if (it != gState.records.end()) {
        auto request = gState.requests.find(it->second.handle);
        if (request != gState.requests.end() && request->second.answered) {
            gState.requests.erase(request);
        }
        gState.records.erase(it);
        return;
    }
    if (gForgottenRecords.erase(record) == 0) {
        pal::detail::writeLogLine("pal: release of an unknown or already released record ignored");
    }
}

void releaseRecord(const KDEvent* event) {
    if (event == nullptr) {
        return;
    }
    std::lock_guard<std::mutex> lock(gMutex);
    releaseRecordLocked(event->data.recordzvr.record);
}

void attachWifiRecord(KDEvent* event, KDint handle, const std::vector<pal::WifiNetwork>& networks) {
    auto record = std::make_shared<WifiRecord>();
    record->texts.reserve(networks.size() * 2);
    for (const pal::WifiNetwork& network : networks) {
        record->texts.push_back(network.bssid);
        record->texts.push_back(network.ssid);
    }
    for (std::size_t i = 0; i < networks.size(); ++i) {
        record->entries.push_back(
            {record->texts[2 * i].c_str(), record->texts[2 * i + 1].c_str(), networks[i].signalStrength});
    }
    record->result.entries = record->entries.data();
    record->result.count = static_cast<KDint32>(record->entries.size());
    event->data.recordzvr.record = &record->result;
    event->data.recordzvr.release = releaseRecord;
    gState.records[&record->result] = {record, handle};
}

void attachCellRecord(KDEvent* event, KDint handle, const pal::CellInfo& cell) {
    auto record = std::make_shared<CellRecord>();
    KDTelephonyNetworkInfoZVR& info = record->info;
    info.isKnown = cell.known ? 1 : 0;
    info.cellId = cell.cellId;
    info.locationAreaCode = cell.locationAreaCode;
    copyText(info.operatorCode, sizeof(info.operatorCode), cell.operatorCode);
    copyText(info.countryCode, sizeof(info.countryCode), cell.countryCode);
    event->data.recordzvr.record = &record->info;
    event->data.recordzvr.release = releaseRecord;
    gState.records[&record->info] = {record, handle};
}

KDEvent* createAnswerLocked(KDint handle, const Request& request) {
    KDEvent* event = kdCreateEvent();
    event->type = eventType(request.kind);
    event->timestamp = kdGetTimeUST();
    event->userptr = request.userptr;
    event->data.words[kHandleWord] = handle;
    switch (request.kind) {
        case Kind::WifiScan:
            attachWifiRecord(event, handle, request.script.networks);
            break;
        case Kind::CellInfo:
            attachCellRecord(event, handle, request.script.cell);
            break;
        case Kind::SignalStrength:
            event->data.words[0] = request.script.success ? 1 : 0;
            event->data.words[1] = request.script.strength;
            break;
    }
    return event;
}

void discardAnswer(KDint handle, const Request& request) {
    const KDint32 type = eventType(request.kind);
    std::vector<const void*> records;
    pal::detail::discardEvents(request.thread, [&](const KDEvent& event) {
        if (event.type != type || event.userptr != request.userptr ||
            event.data.words[kHandleWord] != handle) {
            return false;
        }
        if (request.kind != Kind::SignalStrength) {
            records.push_back(event.data.recordzvr.record);
        }
        return true;
    });
    std::lock_guard<std::mutex> lock(gMutex);
    for (const void* record : records) {
        releaseRecordLocked(record);
    }
}

// Posts the answer of a request still waiting for it (on the requesting thread).
void answer(KDint handle) {
    KDEvent* event = nullptr;
    Request request{};
    {
        std::lock_guard<std::mutex> lock(gMutex);
        auto it = gState.requests.find(handle);
        if (it == gState.requests.end() || it->second.answered) {
            return;
        }
        it->second.answered = true;
        it->second.action = 0;
        request = it->second;
        event = createAnswerLocked(handle, request);
    }
    pal::detail::post(request.thread, event);
    // A cancel from another thread may have swept the queue before the answer
    // landed in it; sweep again so that a cancelled request stays silent.
    bool cancelled = false;
    {
        std::lock_guard<std::mutex> lock(gMutex);
        cancelled = gState.requests.count(handle) == 0;
    }
    if (cancelled) {
        discardAnswer(handle, request);
    }
}

KDint startRequest(Kind kind, void* userptr) {
    KDint handle = 0;
    Answer answerScript;
    KDThread* thread = kdThreadSelf();
    if (thread == nullptr) {
        return 0;
    }
    {
        std::lock_guard<std::mutex> lock(gMutex);
        const Script& script = gState.scripts[kind];
        if (script.answer.kind == Answer::Refuse) {
            return 0;
        }
        handle = gNextHandle++;
        gState.requests.emplace(handle, Request{kind, thread, userptr, script});
        answerScript = script.answer;
    }
    if (answerScript.kind == Answer::Never) {
        return handle;
    }
    if (answerScript.delay == 0) {
        answer(handle);
        return handle;
    }
    const ActionId action =
        pal::detail::scheduleAction(thread, answerScript.delay, [handle] { answer(handle); });
    bool cancelled = false;
    {
        std::lock_guard<std::mutex> lock(gMutex);
        auto it = gState.requests.find(handle);
        cancelled = it == gState.requests.end();
        if (!cancelled) {
            it->second.action = action;
        }
    }
    if (cancelled) {
        pal::detail::cancelAction(action);
    }
    return handle;
}

void cancelRequest(Kind kind, KDint handle) {
    Request request{};
    {
        std::lock_guard<std::mutex> lock(gMutex);
        auto it = gState.requests.find(handle);
        if (it == gState.requests.end() || it->second.kind != kind) {
            return;
        }
        request = it->second;
        gState.requests.erase(it);
    }
    if (request.action != 0) {
        pal::detail::cancelAction(request.action);
    }
    if (request.answered) {
        discardAnswer(handle, request);
    }
}

int pendingRequests(Kind kind) {
    std::lock_guard<std::mutex> lock(gMutex);
    return static_cast<int>(std::count_if(
        gState.requests.begin(), gState.requests.end(),
        [kind](const auto& entry) { return entry.second.kind == kind && !entry.second.answered; }));
}

void setScript(Kind kind, const Script& script) {
    std::lock_guard<std::mutex> lock(gMutex);
    gState.scripts[kind] = script;
}

}  // namespace

extern "C" {

KDint kdStartWifiScanZVR(void* userptr) {
    return startRequest(Kind::WifiScan, userptr);
}

void kdCancelWifiScanZVR(KDint handle) {
    cancelRequest(Kind::WifiScan, handle);
}

KDint kdRequestTelephonyNetworkInfoZVR(void* userptr) {
    return startRequest(Kind::CellInfo, userptr);
}

void kdCancelTelephonyNetworkInfoZVR(KDint handle) {
    cancelRequest(Kind::CellInfo, handle);
}

KDint kdRequestTelephonySignalStrengthInfoZVR(void* userptr) {
    return startRequest(Kind::SignalStrength, userptr);
}

void kdCancelTelephonySignalStrengthInfoRequestZVR(KDint handle) {
    cancelRequest(Kind::SignalStrength, handle);
}

}  // extern "C"

namespace pal {

void scriptWifiScan(Answer answer, std::vector<WifiNetwork> networks) {
    Script script;
    script.answer = answer;
    script.networks = std::move(networks);
    setScript(Kind::WifiScan, script);
}

void scriptCellInfo(Answer answer, CellInfo info) {
    Script script;
    script.answer = answer;
    script.cell = std::move(info);
    setScript(Kind::CellInfo, script);
}

void scriptSignalStrength(Answer answer, bool success, int strength) {
    Script script;
    script.answer = answer;
    script.success = success;
    script.strength = strength;
    setScript(Kind::SignalStrength, script);
}

int pendingWifiScans() {
    return pendingRequests(Kind::WifiScan);
}
int pendingCellInfoRequests() {
    return pendingRequests(Kind::CellInfo);
}
int pendingSignalStrengthRequests() {
    return pendingRequests(Kind::SignalStrength);
}

int unreleasedRecords() {
    std::lock_guard<std::mutex> lock(gMutex);
    return static_cast<int>(gState.records.size());
}

namespace detail {

void resetRequests() {
    std::vector<ActionId> actions;
    {
        std::lock_guard<std::mutex> lock(gMutex);
        for (const auto& entry : gState.requests) {
            if (entry.second.action != 0) {
                actions.push_back(entry.second.action);
            }
        }
        gForgottenRecords.insert(gState.records.begin(), gState.records.end());
        gState = RequestState();
    }
    for (ActionId action : actions) {
        cancelAction(action);
    }
}

}  // namespace detail
}  // namespace pal
