// The simulated device services of the desktop platform layer, driven through
// the simulation interface and observed through the public kd calls.
#include <atomic>
#include <cstring>
#include <string>
#include <vector>

#include "support/PalTest.h"

namespace {

const KDust kSecond = 1000000000ull;

// What a callback saw of one event; records are copied out before release.
struct Received {
    KDint32 type;
    void* userptr;
    KDust timestamp;
    KDEventData data;
    std::vector<pal::WifiNetwork> networks;
    KDTelephonyNetworkInfoZVR cell{};
    KDLocationFixZVR fix{};
    KDAccelerationZVR acceleration{};
};

std::vector<Received> gReceived;
bool gReleaseRecords = true;

void copyPayload(const KDEvent* event, Received& received) {
    switch (event->type) {
        case KD_EVENT_WIFI_SCAN_ZVR: {
            const auto* result = static_cast<const KDWifiScanResultZVR*>(event->data.recordzvr.record);
            for (KDint32 i = 0; i < result->count; ++i) {
                const KDWifiScanEntryZVR& entry = result->entries[i];
                received.networks.push_back({entry.bssid, entry.ssid, entry.signalStrength});
            }
            break;
        }
        case KD_EVENT_TELEPHONY_NETWORK_INFO_ZVR:
            received.cell = *static_cast<const KDTelephonyNetworkInfoZVR*>(event->data.recordzvr.record);
            break;
        case KD_EVENT_LOCATION_ZVR:
            received.fix = *static_cast<const KDLocationFixZVR*>(event->data.p[0]);
            kdFree(event->data.p[0]);
            break;
        case KD_EVENT_ACCELEROMETER_ZVR:
            received.acceleration = *static_cast<const KDAccelerationZVR*>(event->data.p[0]);
            break;
        default:
            break;
    }
}

void recordEvent(const KDEvent* event) {
    Received received{event->type, event->userptr, event->timestamp, event->data, {}, {}, {}, {}};
    copyPayload(event, received);
    if (gReleaseRecords &&
        (event->type == KD_EVENT_WIFI_SCAN_ZVR || event->type == KD_EVENT_TELEPHONY_NETWORK_INFO_ZVR)) {
        event->data.recordzvr.release(event);
    }
    gReceived.push_back(received);
}

// Records every platform event type (45 pause .. 120 accelerometer) on the test
// thread, whatever its user pointer.
class SimulationTest : public PalTest {
protected:
    void SetUp() override {
        PalTest::SetUp();
        gReceived.clear();
        gReleaseRecords = true;
        installForEveryType(recordEvent);
    }

    void TearDown() override {
        installForEveryType(nullptr);
        PalTest::TearDown();
    }

    static void installForEveryType(KDCallbackFunc* callback) {
        for (KDint32 type = KD_EVENT_PAUSE; type <= KD_EVENT_ACCELEROMETER_ZVR; ++type) {
            kdInstallCallback(callback, type, nullptr);
        }
    }

    // Dispatches what is queued and hands over what arrived since the last call.
    std::vector<Received> take() {
        kdPumpEvents();
        std::vector<Received> taken;
        taken.swap(gReceived);
        return taken;
    }

    int requester = 0;
    int otherRequester = 0;
};

// --- Request pairs ----------------------------------------------------------

// The three one-shot radio queries share one shape: scripted answer, start
// with a requester, cancel by handle.
struct RequestKind {
    const char* name;
    KDint32 eventType;
    bool carriesRecord;
    void (*script)(pal::Answer answer);
    KDint (*start)(void* requester);
    void (*cancel)(KDint handle);
    int (*pending)();
};

const RequestKind kRequestKinds[] = {
    {"WifiScan", KD_EVENT_WIFI_SCAN_ZVR, true,
     [](pal::Answer answer) {
         pal::scriptWifiScan(answer, {{"00:11:22:33:44:55", "net", -50}});
     },
     kdStartWifiScanZVR, kdCancelWifiScanZVR, pal::pendingWifiScans},
    {"CellInfo", KD_EVENT_TELEPHONY_NETWORK_INFO_ZVR, true,
     [](pal::Answer answer) {
         pal::scriptCellInfo(answer, {true, 1, 2, "26201", "de"});
     },
     kdRequestTelephonyNetworkInfoZVR, kdCancelTelephonyNetworkInfoZVR, pal::pendingCellInfoRequests},
    {"SignalStrength", KD_EVENT_TELEPHONY_SIGNAL_STRENGTH_ZVR, false,
     [](pal::Answer answer) { pal::scriptSignalStrength(answer, true, 17); },
     kdRequestTelephonySignalStrengthInfoZVR, kdCancelTelephonySignalStrengthInfoRequestZVR,
     pal::pendingSignalStrengthRequests},
};

class RequestPairTest : public SimulationTest, public ::testing::WithParamInterface<RequestKind> {};

INSTANTIATE_TEST_SUITE_P(AllKinds, RequestPairTest, ::testing::ValuesIn(kRequestKinds),
                         [](const ::testing::TestParamInfo<RequestKind>& info) { return info.param.name; });

TEST_P(RequestPairTest, RefusedRequestGivesHandleZeroAndNeverAnswers) {
    GetParam().script(pal::Answer::refuse());
    EXPECT_EQ(GetParam().start(&requester), 0);
    pal::advanceTime(60 * kSecond);
    EXPECT_TRUE(take().empty());
    EXPECT_EQ(GetParam().pending(), 0);
}

TEST_P(RequestPairTest, DelayedAnswersReachEachRequesterOnlyAfterTheDelay) {
    GetParam().script(pal::Answer::after(2 * kSecond));
    const KDint first = GetParam().start(&requester);
    const KDint second = GetParam().start(&otherRequester);
    ASSERT_NE(first, 0);
    ASSERT_NE(second, 0);
    EXPECT_NE(first, second);
    pal::advanceTime(2 * kSecond - 1);
    EXPECT_TRUE(take().empty());
    EXPECT_EQ(GetParam().pending(), 2);

    pal::advanceTime(1);
    std::vector<Received> received = take();
    ASSERT_EQ(received.size(), 2u);
    EXPECT_EQ(received[0].type, GetParam().eventType);
    EXPECT_EQ(received[0].userptr, &requester);
    EXPECT_EQ(received[1].userptr, &otherRequester);
    EXPECT_EQ(GetParam().pending(), 0);
    EXPECT_EQ(pal::unreleasedRecords(), 0);
}

TEST_P(RequestPairTest, NeverAnsweredRequestStaysPendingUntilCancelled) {
    GetParam().script(pal::Answer::never());
    const KDint handle = GetParam().start(&requester);
    ASSERT_NE(handle, 0);
    pal::advanceTime(3600 * kSecond);
    EXPECT_EQ(GetParam().pending(), 1);

    GetParam().cancel(handle);
    pal::advanceTime(3600 * kSecond);
    EXPECT_TRUE(take().empty());
    EXPECT_EQ(GetParam().pending(), 0);
}

TEST_P(RequestPairTest, CancelSuppressesOnlyItsOwnAnswerWhetherDueOrAlreadyQueued) {
    GetParam().script(pal::Answer::after(2 * kSecond));
    const KDint due = GetParam().start(&requester);
    pal::advanceTime(kSecond);
    GetParam().cancel(due);
    pal::advanceTime(5 * kSecond);
    EXPECT_TRUE(take().empty());

    // Two answers queued for requesters sharing one pointer.
    GetParam().script(pal::Answer::after(0));
    const KDint queued = GetParam().start(&requester);
    const KDint kept = GetParam().start(&requester);
    GetParam().cancel(queued);
    EXPECT_EQ(pal::unreleasedRecords(), GetParam().carriesRecord ? 1 : 0);
    std::vector<Received> received = take();
    ASSERT_EQ(received.size(), 1u);
    EXPECT_EQ(received[0].type, GetParam().eventType);
    // Cancelling after delivery (as a handler does first thing) touches nothing.
    GetParam().cancel(kept);
    EXPECT_EQ(pal::unreleasedRecords(), 0);
    EXPECT_EQ(GetParam().pending(), 0);
}

TEST_P(RequestPairTest, UnknownHandlesAndHandlesOfOtherKindsAreIgnored) {
    GetParam().script(pal::Answer::never());
    const KDint handle = GetParam().start(&requester);
    GetParam().cancel(0);
    GetParam().cancel(handle + 1000);
    for (const RequestKind& other : kRequestKinds) {
        if (other.eventType != GetParam().eventType) {
            other.cancel(handle);
        }
    }
    EXPECT_EQ(GetParam().pending(), 1);
}

TEST_P(RequestPairTest, ResetRestoresTheImmediateAnswer) {
    GetParam().script(pal::Answer::never());
    pal::resetSimulation();
    ASSERT_NE(GetParam().start(&requester), 0);
    EXPECT_EQ(take().size(), 1u);
}

TEST_F(SimulationTest, AnswersCarryTheScriptedDataCopiedAtScriptTime) {
    std::vector<pal::WifiNetwork> networks = {{"00:1A:2B:3C:4D:5E", "home", -40},
                                              {"66:77:88:99:AA:BB", "", -90}};
    pal::scriptWifiScan(pal::Answer::after(0), networks);
    networks.clear();
    pal::scriptCellInfo(pal::Answer::after(0), {true, 1234, 56, std::string(40, 'o'), std::string(40, 'c')});
    pal::scriptSignalStrength(pal::Answer::after(0), true, 17);
    kdStartWifiScanZVR(&requester);
    kdRequestTelephonyNetworkInfoZVR(&requester);
    kdRequestTelephonySignalStrengthInfoZVR(&requester);
    pal::scriptCellInfo(pal::Answer::after(0), {});
    kdRequestTelephonyNetworkInfoZVR(&requester);

    std::vector<Received> received = take();
    ASSERT_EQ(received.size(), 4u);
    ASSERT_EQ(received[0].networks.size(), 2u);
    EXPECT_EQ(received[0].networks[0].bssid, "00:1A:2B:3C:4D:5E");
    EXPECT_EQ(received[0].networks[0].ssid, "home");
    EXPECT_EQ(received[0].networks[0].signalStrength, -40);
    EXPECT_EQ(received[0].networks[1].ssid, "");
    // Long codes are cut to the record's fields.
    const KDTelephonyNetworkInfoZVR& known = received[1].cell;
    EXPECT_NE(known.isKnown, 0);
    EXPECT_EQ(known.cellId, 1234);
    EXPECT_EQ(known.locationAreaCode, 56);
    EXPECT_EQ(std::string(known.operatorCode), std::string(sizeof(known.operatorCode) - 1, 'o'));
    EXPECT_EQ(std::string(known.countryCode), std::string(sizeof(known.countryCode) - 1, 'c'));
    EXPECT_EQ(received[2].data.words[0], 1);
    EXPECT_EQ(received[2].data.words[1], 17);
    EXPECT_EQ(received[3].cell.isKnown, 0);
    EXPECT_STREQ(received[3].cell.operatorCode, "");
}

TEST_F(SimulationTest, RecordsStayCountedUntilReleasedAndDoubleReleaseIsHarmless) {
    gReleaseRecords = false;
    pal::scriptCellInfo(pal::Answer::after(0), {true, 1, 2, "op", "cc"});
    kdRequestTelephonyNetworkInfoZVR(&requester);
    kdRequestTelephonyNetworkInfoZVR(&requester);
    std::vector<Received> received = take();
    ASSERT_EQ(received.size(), 2u);
    EXPECT_EQ(pal::unreleasedRecords(), 2);

    KDEvent event{};
    event.type = KD_EVENT_TELEPHONY_NETWORK_INFO_ZVR;
    event.data = received[0].data;
    event.data.recordzvr.release(&event);
    event.data.recordzvr.release(&event);
    EXPECT_EQ(pal::unreleasedRecords(), 1);
    event.data = received[1].data;
    event.data.recordzvr.release(&event);
    EXPECT_EQ(pal::unreleasedRecords(), 0);
}

// --- Reachability -------------------------------------------------------------

TEST_F(SimulationTest, ReachabilityChangesReachActiveListenersOnly) {
    EXPECT_EQ(kdGetNetworkReachabilityStatusZVR(), KD_NETWORK_REACHABLE_VIA_WIFI_ZVR);
    const KDint listening = kdStartListeningNetworkReachabilityStatusZVR(&requester);
    const KDint stopped = kdStartListeningNetworkReachabilityStatusZVR(&otherRequester);
    ASSERT_NE(listening, 0);
    ASSERT_NE(stopped, 0);
    EXPECT_EQ(pal::reachabilityListeners(), 2);
    kdStopListeningNetworkReachabilityStatusZVR(stopped);

    pal::setReachability(KD_NETWORK_REACHABLE_VIA_WIFI_ZVR);  // unchanged: silent
    pal::setReachability(KD_NETWORK_NOT_REACHABLE_ZVR);
    std::vector<Received> received = take();
    ASSERT_EQ(received.size(), 1u);
    EXPECT_EQ(received[0].type, KD_EVENT_NETWORK_REACHABILITY_ZVR);
    EXPECT_EQ(received[0].userptr, &requester);
    EXPECT_EQ(received[0].data.words[0], KD_NETWORK_NOT_REACHABLE_ZVR);
    EXPECT_EQ(kdGetNetworkReachabilityStatusZVR(), KD_NETWORK_NOT_REACHABLE_ZVR);

    // A change still queued when its listener stops is dropped.
    pal::setReachability(KD_NETWORK_REACHABLE_VIA_MOBILE_ZVR);
    kdStopListeningNetworkReachabilityStatusZVR(listening);
    EXPECT_TRUE(take().empty());
    EXPECT_EQ(pal::reachabilityListeners(), 0);
}

struct ThreadListener {
    std::atomic<bool> listening{false};
    std::atomic<KDint> status{-1};
};

void* listenOnOwnThread(void* argument) {
    auto* listener = static_cast<ThreadListener*>(argument);
    kdInstallCallback(
        [](const KDEvent* event) {
            static_cast<ThreadListener*>(event->userptr)->status = static_cast<KDint>(event->data.words[0]);
        },
        KD_EVENT_NETWORK_REACHABILITY_ZVR, listener);
    const KDint handle = kdStartListeningNetworkReachabilityStatusZVR(listener);
    listener->listening = true;
    while (listener->status < 0) {
        kdWaitEvent(static_cast<KDust>(-1));
    }
    kdStopListeningNetworkReachabilityStatusZVR(handle);
    return nullptr;
}

TEST_F(SimulationTest, ReachabilityEventGoesToTheThreadThatStartedListening) {
    ThreadListener listener;
    KDThread* thread = kdThreadCreate(nullptr, listenOnOwnThread, &listener);
    ASSERT_NE(thread, nullptr);
    while (!listener.listening) {
        kdThreadYieldZVR();
    }
    pal::setReachability(KD_NETWORK_REACHABLE_VIA_MOBILE_ZVR);
    kdThreadJoin(thread, nullptr);
    EXPECT_EQ(listener.status, KD_NETWORK_REACHABLE_VIA_MOBILE_ZVR);
    EXPECT_TRUE(take().empty());
}

// --- Satellite location, compass, proximity, accelerometer --------------------------

TEST_F(SimulationTest, LocationEventsFlowOnlyWhileStarted) {
    const KDLocationFixZVR fix{52.5f, 13.4f, 3.0f, 90.0f, 12.0f, 34.0f, 2};
    pal::injectLocationFix(fix);
    pal::injectLocationStatus(2);
    EXPECT_TRUE(take().empty());

    kdLocationStartZVR();
    EXPECT_TRUE(pal::isLocationStarted());
    pal::injectLocationStatus(2);
    pal::injectLocationFix(fix);
    pal::injectLocationFix(fix, true);
    std::vector<Received> received = take();
    ASSERT_EQ(received.size(), 3u);
    EXPECT_EQ(received[0].type, KD_EVENT_LOCATION_STATUS_ZVR);
    EXPECT_EQ(received[0].data.words[0], 2);
    EXPECT_EQ(received[1].type, KD_EVENT_LOCATION_ZVR);
    EXPECT_EQ(received[1].userptr, nullptr);
    EXPECT_EQ(received[1].timestamp, kdGetTimeUST());
    EXPECT_FLOAT_EQ(received[1].fix.latitude, 52.5f);
    EXPECT_FLOAT_EQ(received[1].fix.altitude, 34.0f);
    EXPECT_EQ(received[1].fix.precision, 2);
    // A simulated fix has no platform timestamp.
    EXPECT_EQ(received[2].timestamp, static_cast<KDust>(-1));

    pal::injectLocationFix(fix);
    kdLocationStopZVR();
    EXPECT_FALSE(pal::isLocationStarted());
    pal::injectLocationFix(fix);
    EXPECT_TRUE(take().empty());
}

TEST_F(SimulationTest, CompassAndProximityReachEachActiveListener) {
    const KDint compass = kdSetCompassZVR(&requester);
    const KDint proximity = kdStartListeningProximityEventsZVR(&otherRequester);
    ASSERT_NE(compass, 0);
    ASSERT_NE(proximity, 0);

    pal::injectCompass(271);
    pal::injectProximity(true);
    pal::injectProximity(false);
    std::vector<Received> received = take();
    ASSERT_EQ(received.size(), 3u);
    EXPECT_EQ(received[0].type, KD_EVENT_COMPASS_ZVR);
    EXPECT_EQ(received[0].userptr, &requester);
    EXPECT_EQ(received[0].data.words[0], 271);
    EXPECT_EQ(received[1].type, KD_EVENT_PROXIMITY_ZVR);
    EXPECT_EQ(received[1].userptr, &otherRequester);
    EXPECT_NE(received[1].data.words[0], 0);
    EXPECT_EQ(received[2].data.words[0], 0);

    kdCancelCompassZVR(compass);
    kdStopListeningProximityEventsZVR(proximity);
    pal::injectCompass(10);
    pal::injectProximity(true);
    EXPECT_TRUE(take().empty());
    EXPECT_EQ(pal::compassListeners(), 0);
    EXPECT_EQ(pal::proximityListeners(), 0);
}

TEST_F(SimulationTest, AccelerometerDeliversSamplesOnlyWhileEnabledAndCountsUndismissedOnes) {
    KDAccelerometerZVR* accelerometer = kdAcquireAccelerometerZVR(&requester);
    ASSERT_NE(accelerometer, nullptr);
    pal::injectAcceleration(1.0f, 2.0f, 3.0f);
    EXPECT_TRUE(take().empty());

    kdEnableAccelerometerZVR(accelerometer);
    kdSetAccelerometerUpdateIntervalZVR(accelerometer, 0.05f);
    EXPECT_FLOAT_EQ(pal::accelerometerInterval(), 0.05f);
    pal::injectAcceleration(0.5f, -9.8f, 0.25f);
    std::vector<Received> received = take();
    ASSERT_EQ(received.size(), 1u);
    EXPECT_EQ(received[0].userptr, &requester);
    EXPECT_FLOAT_EQ(received[0].acceleration.x, 0.5f);
    EXPECT_FLOAT_EQ(received[0].acceleration.y, -9.8f);
    EXPECT_FLOAT_EQ(received[0].acceleration.z, 0.25f);
    EXPECT_EQ(pal::undismissedAccelerations(), 1);
    auto* sample = static_cast<KDAccelerationZVR*>(received[0].data.p[0]);
    kdAccelerationDismissDataZVR(sample);
    kdAccelerationDismissDataZVR(sample);
    EXPECT_EQ(pal::undismissedAccelerations(), 0);

    kdDisableAccelerometerZVR(accelerometer);
    pal::injectAcceleration(1.0f, 1.0f, 1.0f);
    EXPECT_TRUE(take().empty());
    kdEnableAccelerometerZVR(accelerometer);
    pal::injectAcceleration(4.0f, 5.0f, 6.0f);
    EXPECT_EQ(pal::undismissedAccelerations(), 1);
    // Dismissing the sensor drops its queued sample and makes its handle stale.
    kdDismissAccelerometerZVR(accelerometer);
    EXPECT_FALSE(pal::isAccelerometerAcquired());
    EXPECT_EQ(pal::undismissedAccelerations(), 0);
    EXPECT_TRUE(take().empty());
    kdEnableAccelerometerZVR(accelerometer);
    EXPECT_FALSE(pal::isAccelerometerEnabled());
}

// --- Device data ---------------------------------------------------------------

TEST_F(SimulationTest, DeviceValuesChangeWithoutInvalidatingEarlierPointersAndResetRestoresThem) {
    EXPECT_STREQ(kdGetStringZVR(KD_STRING_APP_PLATFORM_ZVR), "android");
    EXPECT_STREQ(kdGetStringZVR(KD_STRING_PACKAGE_NAME_ZVR), "mapcore");
    EXPECT_STREQ(kdGetStringZVR(-1), "");
    const KDchar* model = kdGetStringZVR(KD_STRING_DEVICE_MODEL_ZVR);
    const KDchar* language = kdLocaleGetLangZVR();
    EXPECT_EQ(kdDotsPerInchZVR(), 160);
    EXPECT_STREQ(kdLocaleGetRegionZVR(), "US");

    pal::setDeviceString(KD_STRING_DEVICE_MODEL_ZVR, "Pixel");
    pal::setDeviceString(42, "ignored");
    pal::setLocale("de", "AT");
    pal::setDotsPerInch(320);
    EXPECT_STREQ(model, "Simulated Device");
    EXPECT_STREQ(language, "en");
    EXPECT_STREQ(kdGetStringZVR(KD_STRING_DEVICE_MODEL_ZVR), "Pixel");
    EXPECT_STREQ(kdGetStringZVR(42), "");
    EXPECT_STREQ(kdLocaleGetLangZVR(), "de");
    EXPECT_STREQ(kdLocaleGetRegionZVR(), "AT");
    EXPECT_EQ(kdDotsPerInchZVR(), 320);

    pal::resetSimulation();
    EXPECT_STREQ(kdGetStringZVR(KD_STRING_DEVICE_MODEL_ZVR), "Simulated Device");
    EXPECT_STREQ(kdLocaleGetRegionZVR(), "US");
    EXPECT_EQ(kdDotsPerInchZVR(), 160);
}

TEST_F(SimulationTest, DeviceIdIsCopiedSafelyAndRemembersWhatTheLibrarySet) {
    char buffer[8];
    EXPECT_NE(kdIsDeviceIdSupportedZVR(), 0);
    std::memset(buffer, 'x', sizeof(buffer));
    EXPECT_EQ(kdGetDeviceIdZVR(buffer, sizeof(buffer)), 0);
    EXPECT_STREQ(buffer, "");

    pal::setDeviceId("0123456789abcdef");
    std::memset(buffer, 'x', sizeof(buffer));
    EXPECT_NE(kdGetDeviceIdZVR(buffer, sizeof(buffer)), 0);
    EXPECT_STREQ(buffer, "0123456");
    EXPECT_EQ(kdGetDeviceIdZVR(nullptr, 8), 0);
    EXPECT_EQ(kdGetDeviceIdZVR(buffer, 0), 0);

    kdSetDeviceIdZVR("server-id");
    EXPECT_EQ(pal::deviceIdSetByLibrary(), "server-id");
    char large[64];
    EXPECT_NE(kdGetDeviceIdZVR(large, sizeof(large)), 0);
    EXPECT_STREQ(large, "server-id");

    pal::setDeviceId("abc", false);
    EXPECT_EQ(kdIsDeviceIdSupportedZVR(), 0);
    EXPECT_EQ(kdGetDeviceIdZVR(large, sizeof(large)), 0);
}

// --- Capture sessions ---------------------------------------------------------------

TEST_F(SimulationTest, CaptureSessionsOpenCloseAndCanBeRefused) {
    KDCaptureSessionZVR* normal = alCreateCaptureSessionZVR(KD_FALSE);
    KDCaptureSessionZVR* alternative = alCreateCaptureSessionZVR(KD_TRUE);
    ASSERT_NE(normal, nullptr);
    ASSERT_NE(alternative, nullptr);
    EXPECT_TRUE(pal::lastCaptureSessionAlternative());
    EXPECT_EQ(pal::openCaptureSessions(), 2);
    alDestroyCaptureSessionZVR(normal);
    alDestroyCaptureSessionZVR(normal);
    alDestroyCaptureSessionZVR(nullptr);
    EXPECT_EQ(pal::openCaptureSessions(), 1);

    pal::setCaptureSessionsRefused(true);
    EXPECT_EQ(alCreateCaptureSessionZVR(KD_FALSE), nullptr);
    alDestroyCaptureSessionZVR(alternative);
    EXPECT_EQ(pal::openCaptureSessions(), 0);
}

// --- Threads ------------------------------------------------------------------------

void* returnArgument(void* argument) {
    return argument;
}

TEST_F(SimulationTest, RefusedThreadCreationFailsWithOutOfMemoryUntilLifted) {
    int marker = 0;
    pal::setThreadCreationRefused(true);
    EXPECT_EQ(kdThreadCreate(nullptr, returnArgument, &marker), nullptr);
    EXPECT_EQ(kdGetError(), KD_ENOMEM);

    pal::setThreadCreationRefused(false);
    KDThread* thread = kdThreadCreate(nullptr, returnArgument, &marker);
    ASSERT_NE(thread, nullptr);
    void* result = nullptr;
    EXPECT_EQ(kdThreadJoin(thread, &result), 0);
    EXPECT_EQ(result, &marker);
}

}  // namespace
