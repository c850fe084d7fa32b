/*
 * The ZVR extensions of the platform layer: start and shutdown hooks, device
 * data, radios, sensors, the graphics context and audio capture sessions.
 *
 * Request pairs: install the event handler with the requester as user pointer,
 * start with the requester as user pointer and keep the handle (0 = refused,
 * no event follows), cancel with the handle, remove the handler. Answers come
 * as events to the thread that started the request. Events that carry a record
 * with a release function (107, 111) must be released after use; cancelling a
 * request discards its answer if it is still queued.
 */
#pragma once

#include <KD/kd.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Event types of the extensions */
#define KD_EVENT_VIEW_ACTIVITY_ZVR 104
#define KD_EVENT_VIEW_KEY_ACTION_ZVR 105
#define KD_EVENT_VIEW_STATE_ZVR 106
#define KD_EVENT_GESTURE_ZVR 100
#define KD_EVENT_LOCATION_ZVR 101
#define KD_EVENT_LOCATION_STATUS_ZVR 102
#define KD_EVENT_TELEPHONY_NETWORK_INFO_ZVR 107
#define KD_EVENT_TELEPHONY_SIGNAL_STRENGTH_ZVR 109
#define KD_EVENT_WIFI_SCAN_ZVR 111
#define KD_EVENT_NETWORK_REACHABILITY_ZVR 112
#define KD_EVENT_FS_UNMOUNTED_ZVR 114
#define KD_EVENT_FS_MOUNTED_ZVR 115
#define KD_EVENT_COMPASS_ZVR 116
#define KD_EVENT_VIEW_PAUSE_ZVR 117
#define KD_EVENT_VIEW_RESUME_ZVR 118
#define KD_EVENT_PROXIMITY_ZVR 119
#define KD_EVENT_ACCELEROMETER_ZVR 120

/* Start and shutdown hooks. At start the hooks run from the highest order key
 * to the lowest, at shutdown from the lowest to the highest, so a hook with a
 * higher key exists before and outlives those with lower keys. Registering the
 * same (onInit, onShutdown, order, userdata) again has no further effect. */
typedef void(KDPalInitFuncZVR)(void *userdata);
typedef void(KDPalShutdownFuncZVR)(void *userdata);
KDint kdAddPalCallbacksZVR(KDPalInitFuncZVR *onInit, KDPalShutdownFuncZVR *onShutdown, KDint order, void *userdata);

/* Threads */
KDboolean kdThreadIsMainZVR(void);
void kdThreadYieldZVR(void);
/* Policy 0 is the normal class; policy 1 with parameter 0 is the background
 * class (runs only when nothing else wants the processor). A thread is only
 * moved into the background class when the process may move it back: else
 * the call fails with KD_EACCES and the thread keeps its class. */
#define KD_THREAD_POLICY_NORMAL_ZVR 0
#define KD_THREAD_POLICY_BACKGROUND_ZVR 1
KDint kdThreadGetSchedParamZVR(KDThread *thread, KDint *policy, KDint *param);
KDint kdThreadSetSchedParamZVR(KDThread *thread, KDint policy, const KDint *param);

/* Time and files */
KDint64 kdMkTimeZVR(const KDTm *tm);
/* Creates every missing directory of the path; 0 on success. */
KDint kdMkdirAllZVR(const KDchar *pathname);
/* kdStat of the path itself: a symbolic link is not followed and reports
 * KD_ISLNK_ZVR (and neither KD_ISREG nor KD_ISDIR). */
#define KD_ISLNK_ZVR(m) (((m)&0x2000) != 0)
KDint kdLstatZVR(const KDchar *pathname, KDStat *buf);

/* Device. kdGetStringZVR ids: 0 application platform, 1 device model,
 * 2 manufacturer, 3 operating-system version, 4 resource package name,
 * 5 application version, 6 build number. */
#define KD_STRING_APP_PLATFORM_ZVR 0
#define KD_STRING_DEVICE_MODEL_ZVR 1
#define KD_STRING_MANUFACTURER_ZVR 2
#define KD_STRING_OS_VERSION_ZVR 3
#define KD_STRING_PACKAGE_NAME_ZVR 4
#define KD_STRING_APP_VERSION_ZVR 5
#define KD_STRING_BUILD_NUMBER_ZVR 6
const KDchar *kdGetStringZVR(KDint id);
KDint kdIsDeviceIdSupportedZVR(void);
/* Copies the device id into buffer; nonzero on success. */
KDint kdGetDeviceIdZVR(KDchar *buffer, KDsize size);
void kdSetDeviceIdZVR(const KDchar *id);
KDint kdDotsPerInchZVR(void);
const KDchar *kdLocaleGetLangZVR(void);
const KDchar *kdLocaleGetRegionZVR(void);

/* Reachability: 0 not reachable, 1 via Wi-Fi, 2 via mobile. While listening,
 * event 112 with data word 0 = the new status goes to the listening thread. */
#define KD_NETWORK_NOT_REACHABLE_ZVR 0
#define KD_NETWORK_REACHABLE_VIA_WIFI_ZVR 1
#define KD_NETWORK_REACHABLE_VIA_MOBILE_ZVR 2
KDint kdGetNetworkReachabilityStatusZVR(void);
KDint kdStartListeningNetworkReachabilityStatusZVR(void *userptr);
void kdStopListeningNetworkReachabilityStatusZVR(KDint handle);

/* Satellite location. Fixes arrive as event 101 (null userptr) with data word 0
 * pointing to a kdMalloc'ed KDLocationFixZVR the receiver kdFrees; a timestamp
 * of -1 marks a simulated fix. Status arrives as event 102, data word 0. */
typedef struct KDLocationFixZVR {
    KDfloat32 latitude;
    KDfloat32 longitude;
    KDfloat32 speed;
    KDfloat32 bearing;
    KDfloat32 accuracy;
    KDfloat32 altitude;
    KDint32 precision;
} KDLocationFixZVR;
KDint kdLocationStartZVR(void);
KDint kdLocationStopZVR(void);

/* Wi-Fi scan: event 111, record KDWifiScanResultZVR with release function. */
typedef struct KDWifiScanEntryZVR {
    const KDchar *bssid;
    const KDchar *ssid;
    KDint32 signalStrength;
} KDWifiScanEntryZVR;
typedef struct KDWifiScanResultZVR {
    const KDWifiScanEntryZVR *entries;
    KDint32 count;
} KDWifiScanResultZVR;
KDint kdStartWifiScanZVR(void *userptr);
void kdCancelWifiScanZVR(KDint handle);

/* Telephony: event 107, record KDTelephonyNetworkInfoZVR with release
 * function; event 109 with data word 0 success flag, word 1 strength. */
typedef struct KDTelephonyNetworkInfoZVR {
    KDint32 isKnown;
    KDint32 cellId;
    KDint32 locationAreaCode;
    KDchar operatorCode[17];
    KDchar countryCode[19];
} KDTelephonyNetworkInfoZVR;
KDint kdRequestTelephonyNetworkInfoZVR(void *userptr);
void kdCancelTelephonyNetworkInfoZVR(KDint handle);
KDint kdRequestTelephonySignalStrengthInfoZVR(void *userptr);
void kdCancelTelephonySignalStrengthInfoRequestZVR(KDint handle);

/* Compass: event 116, data word 0 the azimuth in degrees. */
KDint kdSetCompassZVR(void *userptr);
void kdCancelCompassZVR(KDint handle);

/* Proximity: event 119, data word 0 nonzero when something is near. */
KDint kdStartListeningProximityEventsZVR(void *userptr);
void kdStopListeningProximityEventsZVR(KDint handle);

/* Accelerometer: event 120 while enabled, data word 0 a KDAccelerationZVR
 * record handed back with kdAccelerationDismissDataZVR. */
typedef struct KDAccelerometerZVR KDAccelerometerZVR;
typedef struct KDAccelerationZVR {
    KDfloat32 x;
    KDfloat32 y;
    KDfloat32 z;
} KDAccelerationZVR;
KDAccelerometerZVR *kdAcquireAccelerometerZVR(void *userptr);
void kdDismissAccelerometerZVR(KDAccelerometerZVR *accelerometer);
void kdEnableAccelerometerZVR(KDAccelerometerZVR *accelerometer);
void kdDisableAccelerometerZVR(KDAccelerometerZVR *accelerometer);
void kdSetAccelerometerUpdateIntervalZVR(KDAccelerometerZVR *accelerometer, KDfloat32 interval);
void kdAccelerationDismissDataZVR(KDAccelerationZVR *record);

/* Graphics. The application's view is the view proxy passed to these calls;
 * every proxy draws into the one main context. A redraw request calls the
 * view's handler from the requesting thread's event loop with the context
 * current; several requests before that call are served by one call. */
#ifdef __cplusplus
struct KDViewProxyZVR;
#else
typedef struct KDViewProxyZVR KDViewProxyZVR;
#endif
#define KD_GFX_WIDTH_ZVR 1
#define KD_GFX_HEIGHT_ZVR 2
typedef void(KDRedrawHandlerZVR)(struct KDViewProxyZVR *view);
/* Nonzero on success. */
KDint kdGFXQueryMainContextZVR(struct KDViewProxyZVR *view, KDint what, KDint *value);
void kdGFXSetRedrawHandler(struct KDViewProxyZVR *view, KDRedrawHandlerZVR *handler);
void kdGFXRequestRedraw(struct KDViewProxyZVR *view);

/* Audio capture sessions around OpenAL capture; null = refused. */
typedef struct KDCaptureSessionZVR KDCaptureSessionZVR;
KDCaptureSessionZVR *alCreateCaptureSessionZVR(KDboolean alternative);
void alDestroyCaptureSessionZVR(KDCaptureSessionZVR *session);

#ifdef __cplusplus
}
#endif

#ifdef __cplusplus
/* Defined outside the C block: an empty struct has no size in C, and C++
 * views derive from it. */
struct KDViewProxyZVR {};
#endif
