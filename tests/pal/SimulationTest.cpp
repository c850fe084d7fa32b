// The simulated device services of the desktop platform layer, driven through
// the simulation interface and observed through the public kd calls.
#include <KD/kdext.h>
#include <gtest/gtest.h>
#include <pal/Simulation.h>

#include <atomic>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <string>
#include <vector>

namespace {

const KDust kMs = 1000000ull;
const KDust kSecond = 1000 * kMs;

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
bool gDismissSamples = true;

void recordEvent(const KDEvent* event) {
    Received received{event->type, event->userptr, event->timestamp, event->data, {}, {}, {}, {}};
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
            if (gDismissSamples) {
                kdAccelerationDismissDataZVR(static_cast<KDAccelerationZVR*>(event->data.p[0]));
            }
            break;
        default:
            break;
    }
    if (gReleaseRecords &&
        (event->type == KD_EVENT_WIFI_SCAN_ZVR || event->type == KD_EVENT_TELEPHONY_NETWORK_INFO_ZVR)) {
        event->data.recordzvr.release(event);
    }
    gReceived.push_back(received);
}

const KDint32 kObservedTypes[] = {
    KD_EVENT_PAUSE,
    KD_EVENT_RESUME,
    KD_EVENT_VIEW_PAUSE_ZVR,
    KD_EVENT_VIEW_RESUME_ZVR,
    KD_EVENT_FS_UNMOUNTED_ZVR,
    KD_EVENT_FS_MOUNTED_ZVR,
    KD_EVENT_WIFI_SCAN_ZVR,
    KD_EVENT_LOCATION_ZVR,
    KD_EVENT_TELEPHONY_NETWORK_INFO_ZVR,
    KD_EVENT_COMPASS_ZVR,
    KD_EVENT_PROXIMITY_ZVR,
    KD_EVENT_TELEPHONY_SIGNAL_STRENGTH_ZVR,
    KD_EVENT_LOCATION_STATUS_ZVR,
    KD_EVENT_ACCELEROMETER_ZVR,
    KD_EVENT_NETWORK_REACHABILITY_ZVR,
    KD_EVENT_INPUT_POINTER,
};

// Boots the layer on a virtual clock with a fresh file root and records every
// simulated event type on the test thread, whatever its user pointer.
class SimulationTest : public ::testing::Test {
protected:
    void SetUp() override {
        std::string pattern = (std::filesystem::temp_directory_path() / "pal-sim-XXXXXX").string();
        ASSERT_NE(mkdtemp(pattern.data()), nullptr);
        root = pattern;
        pal::setFileRoot(root);
        pal::resetSimulation();
        pal::useVirtualClock();
        pal::setLogSink([this](const char* line) { log.push_back(line); });
        pal::start();
        gReceived.clear();
        gReleaseRecords = true;
        gDismissSamples = true;
        for (KDint32 type : kObservedTypes) {
            kdInstallCallback(recordEvent, type, nullptr);
        }
    }

    void TearDown() override {
        for (KDint32 type : kObservedTypes) {
            kdInstallCallback(nullptr, type, nullptr);
        }
        pal::shutdown();
        pal::resetSimulation();
        pal::setLogSink(pal::LogSink());
        std::filesystem::remove_all(root);
    }

    // Dispatches what is queued and hands over what arrived since the last call.
    std::vector<Received> take() {
        kdPumpEvents();
        std::vector<Received> taken;
        taken.swap(gReceived);
        return taken;
    }

    std::string root;
    std::vector<std::string> log;
    int requester = 0;
    int otherRequester = 0;
};

// --- Request pairs ----------------------------------------------------------

TEST_F(SimulationTest, RefusedRequestsGiveHandleZeroAndNeverAnswer) {
    pal::scriptWifiScan(pal::Answer::refuse(), {{"00:11:22:33:44:55", "net", -50}});
    pal::scriptCellInfo(pal::Answer::refuse(), {});
    pal::scriptSignalStrength(pal::Answer::refuse(), true, 3);

    EXPECT_EQ(kdStartWifiScanZVR(&requester), 0);
    EXPECT_EQ(kdRequestTelephonyNetworkInfoZVR(&requester), 0);
    EXPECT_EQ(kdRequestTelephonySignalStrengthInfoZVR(&requester), 0);
    pal::advanceTime(60 * kSecond);

    EXPECT_TRUE(take().empty());
    EXPECT_EQ(pal::pendingWifiScans(), 0);
    EXPECT_EQ(pal::pendingCellInfoRequests(), 0);
    EXPECT_EQ(pal::pendingSignalStrengthRequests(), 0);
}

TEST_F(SimulationTest, DelayedWifiAnswerArrivesOnlyAfterItsDelayWithCopiedNetworks) {
    std::vector<pal::WifiNetwork> networks = {{"00:1A:2B:3C:4D:5E", "home", -40},
                                              {"66:77:88:99:AA:BB", "", -90}};
    pal::scriptWifiScan(pal::Answer::after(2 * kSecond), networks);

    const KDint handle = kdStartWifiScanZVR(&requester);
    ASSERT_NE(handle, 0);
    networks.clear();  // the answer must not depend on the caller's list
    pal::advanceTime(2 * kSecond - 1);
    EXPECT_TRUE(take().empty());
    EXPECT_EQ(pal::pendingWifiScans(), 1);

    pal::advanceTime(1);
    std::vector<Received> received = take();
    ASSERT_EQ(received.size(), 1u);
    EXPECT_EQ(received[0].type, KD_EVENT_WIFI_SCAN_ZVR);
    EXPECT_EQ(received[0].userptr, &requester);
    ASSERT_EQ(received[0].networks.size(), 2u);
    EXPECT_EQ(received[0].networks[0].bssid, "00:1A:2B:3C:4D:5E");
    EXPECT_EQ(received[0].networks[0].ssid, "home");
    EXPECT_EQ(received[0].networks[0].signalStrength, -40);
    EXPECT_EQ(received[0].networks[1].ssid, "");
    EXPECT_EQ(pal::pendingWifiScans(), 0);
    EXPECT_EQ(pal::unreleasedRecords(), 0);
}

TEST_F(SimulationTest, ScriptStaysInForceForLaterRequestsUntilReset) {
    pal::scriptSignalStrength(pal::Answer::after(kSecond), true, 17);
    const KDint first = kdRequestTelephonySignalStrengthInfoZVR(&requester);
    const KDint second = kdRequestTelephonySignalStrengthInfoZVR(&otherRequester);
    ASSERT_NE(first, 0);
    ASSERT_NE(second, 0);
    EXPECT_NE(first, second);
    EXPECT_EQ(pal::pendingSignalStrengthRequests(), 2);

    pal::advanceTime(kSecond);
    std::vector<Received> received = take();
    ASSERT_EQ(received.size(), 2u);
    for (const Received& answer : received) {
        EXPECT_EQ(answer.type, KD_EVENT_TELEPHONY_SIGNAL_STRENGTH_ZVR);
        EXPECT_EQ(answer.data.words[0], 1);
        EXPECT_EQ(answer.data.words[1], 17);
    }
    EXPECT_EQ(received[0].userptr, &requester);
    EXPECT_EQ(received[1].userptr, &otherRequester);

    pal::resetSimulation();
    ASSERT_NE(kdRequestTelephonySignalStrengthInfoZVR(&requester), 0);
    received = take();
    ASSERT_EQ(received.size(), 1u);
    EXPECT_EQ(received[0].data.words[0], 0);
}

TEST_F(SimulationTest, NeverAnsweredRequestCancelledLeavesNothingBehind) {
    pal::scriptCellInfo(pal::Answer::never(), {true, 1, 2, "26201", "de"});
    const KDint handle = kdRequestTelephonyNetworkInfoZVR(&requester);
    ASSERT_NE(handle, 0);
    pal::advanceTime(3600 * kSecond);
    EXPECT_EQ(pal::pendingCellInfoRequests(), 1);

    kdCancelTelephonyNetworkInfoZVR(handle);
    pal::advanceTime(3600 * kSecond);
    EXPECT_TRUE(take().empty());
    EXPECT_EQ(pal::pendingCellInfoRequests(), 0);
    EXPECT_EQ(pal::unreleasedRecords(), 0);
}

TEST_F(SimulationTest, CancelBeforeTheDelayEndsSuppressesTheAnswer) {
    pal::scriptWifiScan(pal::Answer::after(2 * kSecond), {{"a", "b", 1}});
    const KDint handle = kdStartWifiScanZVR(&requester);
    pal::advanceTime(kSecond);
    kdCancelWifiScanZVR(handle);
    pal::advanceTime(5 * kSecond);
    EXPECT_TRUE(take().empty());
    EXPECT_EQ(pal::unreleasedRecords(), 0);
}

TEST_F(SimulationTest, CancelAfterTheAnswerWasQueuedDiscardsItAndReleasesTheRecord) {
    pal::scriptWifiScan(pal::Answer::after(0), {{"a", "b", 1}});
    pal::scriptCellInfo(pal::Answer::after(0), {true, 1, 2, "x", "y"});
    const KDint scan = kdStartWifiScanZVR(&requester);
    const KDint cell = kdRequestTelephonyNetworkInfoZVR(&otherRequester);
    EXPECT_EQ(pal::unreleasedRecords(), 2);

    kdCancelWifiScanZVR(scan);
    EXPECT_EQ(pal::unreleasedRecords(), 1);
    std::vector<Received> received = take();
    ASSERT_EQ(received.size(), 1u);
    EXPECT_EQ(received[0].userptr, &otherRequester);
    // Cancelling after delivery (as a handler does first thing) touches nothing.
    kdCancelTelephonyNetworkInfoZVR(cell);
    EXPECT_EQ(pal::unreleasedRecords(), 0);
}

TEST_F(SimulationTest, CancelDiscardsOnlyItsOwnAnswerWhenRequestersShareAPointer) {
    pal::scriptSignalStrength(pal::Answer::after(0), true, 5);
    const KDint first = kdRequestTelephonySignalStrengthInfoZVR(&requester);
    kdRequestTelephonySignalStrengthInfoZVR(&requester);
    kdCancelTelephonySignalStrengthInfoRequestZVR(first);
    EXPECT_EQ(take().size(), 1u);
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
    EXPECT_EQ(pal::unreleasedRecords(), 1);
    event.data.recordzvr.release(&event);
    EXPECT_EQ(pal::unreleasedRecords(), 1);
    event.data = received[1].data;
    event.data.recordzvr.release(&event);
    EXPECT_EQ(pal::unreleasedRecords(), 0);
}

TEST_F(SimulationTest, CellRecordTruncatesLongCodesAndMarksUnknownCells) {
    pal::scriptCellInfo(pal::Answer::after(0), {true, 1234, 56, std::string(40, 'o'), std::string(40, 'c')});
    kdRequestTelephonyNetworkInfoZVR(&requester);
    pal::scriptCellInfo(pal::Answer::after(0), {});
    kdRequestTelephonyNetworkInfoZVR(&requester);

    std::vector<Received> received = take();
    ASSERT_EQ(received.size(), 2u);
    const KDTelephonyNetworkInfoZVR& known = received[0].cell;
    EXPECT_NE(known.isKnown, 0);
    EXPECT_EQ(known.cellId, 1234);
    EXPECT_EQ(known.locationAreaCode, 56);
    EXPECT_EQ(std::string(known.operatorCode), std::string(sizeof(known.operatorCode) - 1, 'o'));
    EXPECT_EQ(std::string(known.countryCode), std::string(sizeof(known.countryCode) - 1, 'c'));
    EXPECT_EQ(received[1].cell.isKnown, 0);
    EXPECT_STREQ(received[1].cell.operatorCode, "");
}

TEST_F(SimulationTest, UnknownHandlesAreIgnored) {
    pal::scriptWifiScan(pal::Answer::never(), {});
    const KDint handle = kdStartWifiScanZVR(&requester);
    kdCancelWifiScanZVR(0);
    kdCancelWifiScanZVR(handle + 1000);
    // A handle of another kind of request does not cancel this one.
    kdCancelTelephonyNetworkInfoZVR(handle);
    EXPECT_EQ(pal::pendingWifiScans(), 1);
}

// --- Reachability -------------------------------------------------------------

TEST_F(SimulationTest, ReachabilityChangesReachListeningThreadsOnly) {
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
}

TEST_F(SimulationTest, StoppingAListenerDiscardsItsQueuedChange) {
    const KDint handle = kdStartListeningNetworkReachabilityStatusZVR(&requester);
    pal::setReachability(KD_NETWORK_REACHABLE_VIA_MOBILE_ZVR);
    kdStopListeningNetworkReachabilityStatusZVR(handle);
    EXPECT_TRUE(take().empty());
    EXPECT_EQ(pal::reachabilityListeners(), 0);
}

struct ThreadListener {
    std::atomic<bool> listening{false};
    std::atomic<KDint> status{-1};
};

void recordReachability(const KDEvent* event) {
    static_cast<ThreadListener*>(event->userptr)->status = static_cast<KDint>(event->data.words[0]);
}

void* listenOnOwnThread(void* argument) {
    auto* listener = static_cast<ThreadListener*>(argument);
    kdInstallCallback(recordReachability, KD_EVENT_NETWORK_REACHABILITY_ZVR, listener);
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

// --- Satellite location ----------------------------------------------------------

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
    EXPECT_EQ(received[2].timestamp, static_cast<KDust>(-1));

    pal::injectLocationFix(fix);
    kdLocationStopZVR();
    EXPECT_FALSE(pal::isLocationStarted());
    pal::injectLocationFix(fix);
    EXPECT_TRUE(take().empty());
}

// --- Compass, proximity, accelerometer -------------------------------------------

TEST_F(SimulationTest, CompassAndProximityReachEachActiveListener) {
    const KDint compass = kdSetCompassZVR(&requester);
    const KDint proximity = kdStartListeningProximityEventsZVR(&otherRequester);
    ASSERT_NE(compass, 0);
    ASSERT_NE(proximity, 0);
    EXPECT_EQ(pal::compassListeners(), 1);
    EXPECT_EQ(pal::proximityListeners(), 1);

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

TEST_F(SimulationTest, AccelerometerDeliversSamplesOnlyWhileEnabled) {
    KDAccelerometerZVR* accelerometer = kdAcquireAccelerometerZVR(&requester);
    ASSERT_NE(accelerometer, nullptr);
    EXPECT_TRUE(pal::isAccelerometerAcquired());
    pal::injectAcceleration(1.0f, 2.0f, 3.0f);
    EXPECT_TRUE(take().empty());

    kdEnableAccelerometerZVR(accelerometer);
    kdSetAccelerometerUpdateIntervalZVR(accelerometer, 0.05f);
    EXPECT_TRUE(pal::isAccelerometerEnabled());
    EXPECT_FLOAT_EQ(pal::accelerometerInterval(), 0.05f);
    pal::injectAcceleration(0.5f, -9.8f, 0.25f);
    std::vector<Received> received = take();
    ASSERT_EQ(received.size(), 1u);
    EXPECT_EQ(received[0].userptr, &requester);
    EXPECT_FLOAT_EQ(received[0].acceleration.x, 0.5f);
    EXPECT_FLOAT_EQ(received[0].acceleration.y, -9.8f);
    EXPECT_FLOAT_EQ(received[0].acceleration.z, 0.25f);
    EXPECT_EQ(pal::undismissedAccelerations(), 0);

    kdDisableAccelerometerZVR(accelerometer);
    pal::injectAcceleration(1.0f, 1.0f, 1.0f);
    EXPECT_TRUE(take().empty());
    kdDismissAccelerometerZVR(accelerometer);
    EXPECT_FALSE(pal::isAccelerometerAcquired());
}

TEST_F(SimulationTest, UndismissedSamplesAreCountedAndDismissingTheSensorDropsQueuedOnes) {
    gDismissSamples = false;
    KDAccelerometerZVR* accelerometer = kdAcquireAccelerometerZVR(&requester);
    kdEnableAccelerometerZVR(accelerometer);
    pal::injectAcceleration(1.0f, 2.0f, 3.0f);
    std::vector<Received> received = take();
    ASSERT_EQ(received.size(), 1u);
    EXPECT_EQ(pal::undismissedAccelerations(), 1);
    auto* sample = static_cast<KDAccelerationZVR*>(received[0].data.p[0]);
    kdAccelerationDismissDataZVR(sample);
    kdAccelerationDismissDataZVR(sample);
    EXPECT_EQ(pal::undismissedAccelerations(), 0);

    pal::injectAcceleration(4.0f, 5.0f, 6.0f);
    EXPECT_EQ(pal::undismissedAccelerations(), 1);
    kdDismissAccelerometerZVR(accelerometer);
    EXPECT_EQ(pal::undismissedAccelerations(), 0);
    EXPECT_TRUE(take().empty());
    kdEnableAccelerometerZVR(accelerometer);  // stale handle: ignored
    EXPECT_FALSE(pal::isAccelerometerEnabled());
}

// --- Device data ---------------------------------------------------------------

TEST_F(SimulationTest, DeviceStringsHaveDefaultsAndUnknownIdsGiveEmptyText) {
    EXPECT_STREQ(kdGetStringZVR(KD_STRING_APP_PLATFORM_ZVR), "android");
    EXPECT_STREQ(kdGetStringZVR(KD_STRING_PACKAGE_NAME_ZVR), "mapcore");
    EXPECT_STREQ(kdGetStringZVR(KD_STRING_APP_VERSION_ZVR), "1.0");
    EXPECT_STREQ(kdGetStringZVR(-1), "");
    EXPECT_STREQ(kdGetStringZVR(7), "");
    EXPECT_EQ(kdDotsPerInchZVR(), 160);
    EXPECT_STREQ(kdLocaleGetLangZVR(), "en");
    EXPECT_STREQ(kdLocaleGetRegionZVR(), "US");
}

TEST_F(SimulationTest, ChangedDeviceValuesLeaveEarlierPointersValidAndResetRestoresThem) {
    const KDchar* before = kdGetStringZVR(KD_STRING_DEVICE_MODEL_ZVR);
    const KDchar* language = kdLocaleGetLangZVR();
    pal::setDeviceString(KD_STRING_DEVICE_MODEL_ZVR, "Pixel");
    pal::setDeviceString(42, "ignored");
    pal::setLocale("de", "AT");
    pal::setDotsPerInch(320);
    EXPECT_STREQ(before, "Simulated Device");
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

// --- Application events and capture sessions ---------------------------------------

TEST_F(SimulationTest, ApplicationEventsReachTheMainThreadWithoutUserPointer) {
    pal::postAppPaused();
    pal::postAppResumed();
    pal::postViewPaused();
    pal::postViewResumed();
    pal::postStorageUnmounted();
    pal::postStorageMounted();
    KDEvent input{};
    input.type = KD_EVENT_INPUT_POINTER;
    input.userptr = &requester;
    input.data.inputpointer.x = 12;
    pal::postToMain(input);

    std::vector<Received> received = take();
    const KDint32 expected[] = {KD_EVENT_PAUSE,           KD_EVENT_RESUME,           KD_EVENT_VIEW_PAUSE_ZVR,
                                KD_EVENT_VIEW_RESUME_ZVR, KD_EVENT_FS_UNMOUNTED_ZVR, KD_EVENT_FS_MOUNTED_ZVR,
                                KD_EVENT_INPUT_POINTER};
    ASSERT_EQ(received.size(), std::size(expected));
    for (std::size_t i = 0; i < received.size(); ++i) {
        EXPECT_EQ(received[i].type, expected[i]);
    }
    EXPECT_EQ(received[0].userptr, nullptr);
    EXPECT_EQ(received[6].userptr, &requester);
    EXPECT_EQ(received[6].data.inputpointer.x, 12);
}

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

}  // namespace
