/*
 * The core subset of the OpenKODE API that mapcore uses, with OpenKODE's names
 * and shapes. The desktop implementation lives in pal/src.
 *
 * Threading contract, valid for every call below unless its comment says more:
 * - Events, callbacks and timers belong to the thread that installed, posted to
 *   or set them; only that thread dispatches them (kdPumpEvents, kdWaitEvent).
 * - Every other call may be made from any thread.
 */
#pragma once

#include <stdarg.h>
#include <stddef.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Basic types */
typedef char KDchar;
typedef signed char KDint8;
typedef unsigned char KDuint8;
typedef int16_t KDint16;
typedef uint16_t KDuint16;
typedef int32_t KDint32;
typedef uint32_t KDuint32;
typedef int64_t KDint64;
typedef uint64_t KDuint64;
typedef int KDint;
typedef unsigned int KDuint;
typedef float KDfloat32;
typedef int KDboolean;
typedef size_t KDsize;
typedef ptrdiff_t KDssize;
typedef uintptr_t KDuintptr;
typedef KDint64 KDoff;
typedef KDuint32 KDmode;
typedef KDint64 KDtime;
typedef KDuint64 KDust;

#define KD_TRUE 1
#define KD_FALSE 0
#define KD_NULL 0

/* Errors (kdGetError) */
#define KD_EACCES 1
#define KD_EBADF 3
#define KD_EEXIST 9
#define KD_EINVAL 17
#define KD_EIO 18
#define KD_ENOENT 22
#define KD_ENOMEM 25
#define KD_ENOSPC 26
#define KD_ETIMEDOUT 33
KDint kdGetError(void);
void kdSetError(KDint error);

/* Assertions: library code asserts through KD_ASSERT, which passes the
 * expression text. The handler may return (tests install one that records);
 * the code then continues as if the assertion had held. The default handler
 * logs the failure, then aborts in a debug build and returns in a release
 * build (NDEBUG). */
void kdHandleAssertion(const KDchar *condition, const KDchar *filename, KDint linenumber);
#define KD_ASSERT(c) ((c) ? (void)0 : kdHandleAssertion(#c, __FILE__, __LINE__))

/* Logging: one call writes one line to the log sink (stderr by default). */
void kdLogMessage(const KDchar *string);
void kdLogFormatMessage(const KDchar *format, ...) __attribute__((format(printf, 1, 2)));
void kdLogFormatMessageVargs(const KDchar *format, va_list ap);

/* Memory */
void *kdMalloc(KDsize size);
void kdFree(void *ptr);
void *kdRealloc(void *ptr, KDsize size);
void *kdMemcpy(void *buf, const void *src, KDsize len);
void *kdMemmove(void *buf, const void *src, KDsize len);
void *kdMemset(void *buf, KDint byte, KDsize len);
KDint kdMemcmp(const void *src1, const void *src2, KDsize len);

/* Strings. The _s functions never write past buflen bytes and always
 * terminate the output when buflen > 0. */
KDsize kdStrlen(const KDchar *str);
KDsize kdStrnlen(const KDchar *str, KDsize maxlen);
KDint kdStrcmp(const KDchar *str1, const KDchar *str2);
KDint kdStrncmp(const KDchar *str1, const KDchar *str2, KDsize maxlen);
KDchar *kdStrchr(const KDchar *str, KDint ch);
KDint kdStrcpy_s(KDchar *buf, KDsize buflen, const KDchar *src);
KDint kdStrncat_s(KDchar *buf, KDsize buflen, const KDchar *src, KDsize srcmaxlen);
/* Returns the length the full text would have, like snprintf; -1 on a format error. */
KDint kdSprintf_s(KDchar *buf, KDsize buflen, const KDchar *format, ...) __attribute__((format(printf, 3, 4)));
KDint kdVsprintf_s(KDchar *buf, KDsize buflen, const KDchar *format, va_list ap);
KDfloat32 kdStrtof(const KDchar *s, KDchar **endptr);
KDint kdStrtol(const KDchar *s, KDchar **endptr, KDint base);
KDuint kdStrtoul(const KDchar *s, KDchar **endptr, KDint base);

/* Mathematics (single precision) */
#define KD_PI_F 3.14159265358979323846f
#define KD_PI_2_F 1.57079632679489661923f
#define KD_DEG_TO_RAD_F 0.0174532924f
#define KD_RAD_TO_DEG_F 57.2957795f
#define KD_HUGE_VALF __builtin_huge_valf()
KDfloat32 kdAcosf(KDfloat32 x);
KDfloat32 kdAsinf(KDfloat32 x);
KDfloat32 kdAtanf(KDfloat32 x);
KDfloat32 kdAtan2f(KDfloat32 y, KDfloat32 x);
KDfloat32 kdCosf(KDfloat32 x);
KDfloat32 kdSinf(KDfloat32 x);
KDfloat32 kdTanf(KDfloat32 x);
KDfloat32 kdExpf(KDfloat32 x);
KDfloat32 kdLogf(KDfloat32 x);
KDfloat32 kdFabsf(KDfloat32 x);
KDfloat32 kdPowf(KDfloat32 x, KDfloat32 y);
KDfloat32 kdSqrtf(KDfloat32 x);
KDfloat32 kdCeilf(KDfloat32 x);
KDfloat32 kdFloorf(KDfloat32 x);
KDfloat32 kdRoundf(KDfloat32 x);
KDfloat32 kdInvsqrtf(KDfloat32 x);
KDfloat32 kdFmodf(KDfloat32 x, KDfloat32 y);

/* Time. kdGetTimeUST is monotonic nanoseconds; kdTime is wall-clock seconds.
 * Both come from one clock, real or virtual (see pal/Simulation.h). */
typedef struct KDTm {
    KDint32 tm_sec;
    KDint32 tm_min;
    KDint32 tm_hour;
    KDint32 tm_mday;
    KDint32 tm_mon;
    KDint32 tm_year;
    KDint32 tm_wday;
    KDint32 tm_yday;
} KDTm;
KDust kdGetTimeUST(void);
KDtime kdTime(KDtime *timep);
KDTm *kdGmtime_r(const KDtime *timep, KDTm *result);
KDTm *kdLocaltime_r(const KDtime *timep, KDTm *result);

/* Threads. Mutexes are always recursive. */
typedef struct KDThread KDThread;
typedef struct KDThreadAttr KDThreadAttr;
typedef struct KDThreadMutex KDThreadMutex;
typedef struct KDThreadCond KDThreadCond;
KDThread *kdThreadCreate(const KDThreadAttr *attr, void *(*start_routine)(void *), void *arg);
KDint kdThreadJoin(KDThread *thread, void **retval);
KDint kdThreadDetach(KDThread *thread);
KDThread *kdThreadSelf(void);
KDThreadMutex *kdThreadMutexCreate(const void *mutexattr);
KDint kdThreadMutexFree(KDThreadMutex *mutex);
KDint kdThreadMutexLock(KDThreadMutex *mutex);
KDint kdThreadMutexUnlock(KDThreadMutex *mutex);
KDThreadCond *kdThreadCondCreate(const void *attr);
KDint kdThreadCondFree(KDThreadCond *cond);
KDint kdThreadCondSignal(KDThreadCond *cond);
KDint kdThreadCondBroadcast(KDThreadCond *cond);
KDint kdThreadCondWait(KDThreadCond *cond, KDThreadMutex *mutex);

/* Events */
#define KD_EVENT_TIMER 42
#define KD_EVENT_QUIT 43
#define KD_EVENT_PAUSE 45
#define KD_EVENT_RESUME 46
#define KD_EVENT_ORIENTATION 48
#define KD_EVENT_INPUT 56
#define KD_EVENT_INPUT_POINTER 57
#define KD_EVENT_USER 0x40000000

#define KD_INPUT_POINTER_X 0x4001
#define KD_INPUT_POINTER_Y 0x4002
#define KD_INPUT_POINTER_SELECT 0x4003

typedef struct KDEventInput {
    KDint32 index;
    KDint32 countflag;
    union {
        KDint32 i;
        KDint64 l;
        KDfloat32 f;
    } value;
} KDEventInput;

typedef struct KDEventInputPointer {
    KDint32 index;
    KDint32 select;
    KDint32 x;
    KDint32 y;
} KDEventInputPointer;

struct KDEvent;
/* An event whose record must be handed back carries the record in data word 0
 * and this function in data word 1; the receiver calls it with the event. */
typedef void(KDEventReleaseFuncZVR)(const struct KDEvent *event);
typedef struct KDEventRecordZVR {
    void *record;
    KDEventReleaseFuncZVR *release;
} KDEventRecordZVR;

/* "Data words" are pointer-sized slots; "data offsets" are byte offsets into
 * the same storage. */
#define KD_EVENT_DATA_WORDS 4
typedef union KDEventData {
    KDEventInput input;
    KDEventInputPointer inputpointer;
    KDEventRecordZVR recordzvr;
    void *p[KD_EVENT_DATA_WORDS];
    intptr_t words[KD_EVENT_DATA_WORDS];
    KDuint8 bytes[KD_EVENT_DATA_WORDS * sizeof(void *)];
} KDEventData;

typedef struct KDEvent {
    KDust timestamp;
    KDint32 type;
    void *userptr;
    KDEventData data;
} KDEvent;

typedef void(KDCallbackFunc)(const KDEvent *event);

/* Returns a zeroed event owned by the caller until posted (or kdFreeEvent). */
KDEvent *kdCreateEvent(void);
void kdFreeEvent(KDEvent *event);
/* Posting takes ownership of the event. */
KDint kdPostEvent(KDEvent *event);
KDint kdPostThreadEvent(KDEvent *event, KDThread *thread);
/* Binds func to (eventtype, eventuserptr) on the calling thread; replaces an
 * earlier binding; a null func removes it and discards the events with that
 * exact (type, non-null userptr) still queued on this thread. Dispatch picks
 * the binding for (type, userptr), else the one for (type, null). */
KDint kdInstallCallback(KDCallbackFunc *func, KDint eventtype, void *eventuserptr);
/* Dispatches the events queued for the calling thread (and due timers). */
void kdPumpEvents(void);
/* Waits up to timeout ns (-1: forever) for an event, dispatching those that
 * have a callback. Returns the first event without one (valid until the next
 * call), or null on timeout. */
const KDEvent *kdWaitEvent(KDust timeout);
void kdDefaultEvent(const KDEvent *event);

/* Timers: owned by the calling thread, fire as event 42 with userptr. */
#define KD_TIMER_ONESHOT 61
#define KD_TIMER_PERIODIC_AVERAGE 62
#define KD_TIMER_PERIODIC_MINIMUM 63
typedef struct KDTimer KDTimer;
KDTimer *kdSetTimer(KDint64 interval, KDint periodic, void *eventuserptr);
/* Frees the timer and discards its events still queued. Valid on a one-shot
 * timer that has already fired. */
KDint kdCancelTimer(KDTimer *timer);

/* Exit: ends the main loop with the given status once the current callback
 * returns; callers return straight after it. */
void kdExit(KDint status);

/* Files and directories. Paths are absolute in the platform's tree ("/res",
 * "/data", "/tmp" ...), which lives under one host folder; a path with a ".."
 * component is refused with KD_EACCES. */
typedef struct KDFile KDFile;
typedef enum { KD_SEEK_SET = 0, KD_SEEK_CUR = 1, KD_SEEK_END = 2 } KDfileSeekOrigin;
#define KD_EOF (-1)
KDFile *kdFopen(const KDchar *pathname, const KDchar *mode);
KDint kdFclose(KDFile *file);
KDint kdFflush(KDFile *file);
KDsize kdFread(void *buffer, KDsize size, KDsize count, KDFile *file);
KDsize kdFwrite(const void *buffer, KDsize size, KDsize count, KDFile *file);
KDint kdGetc(KDFile *file);
KDint kdPutc(KDint c, KDFile *file);
KDint kdFseek(KDFile *file, KDoff offset, KDfileSeekOrigin origin);
KDoff kdFtell(KDFile *file);
KDint kdFEOF(KDFile *file);
KDint kdFerror(KDFile *file);
void kdClearerr(KDFile *file);
KDint kdMkdir(const KDchar *pathname);
KDint kdRmdir(const KDchar *pathname);
KDint kdRename(const KDchar *src, const KDchar *dest);
KDint kdRemove(const KDchar *pathname);
KDint kdTruncate(const KDchar *pathname, KDoff length);

#define KD_ISREG(m) (((m)&0x8000) != 0)
#define KD_ISDIR(m) (((m)&0x4000) != 0)
/* glibc's <sys/stat.h> (which gtest and others include) defines st_mtime as
 * a macro for st_mtim.tv_sec. The field keeps its name whatever the include
 * order: the macro is kept out of the declaration, and where it is in force,
 * st_mtim.tv_sec names the same storage. */
typedef struct KDStatTimeZVR {
    KDtime tv_sec;
} KDStatTimeZVR;
#pragma push_macro("st_mtime")
#undef st_mtime
typedef struct KDStat {
    KDmode st_mode;
    KDoff st_size;
    union {
        KDtime st_mtime;
        KDStatTimeZVR st_mtim;
    };
} KDStat;
#pragma pop_macro("st_mtime")
KDint kdStat(const KDchar *pathname, KDStat *buf);
KDint kdFstat(KDFile *file, KDStat *buf);

#define KD_R_OK 4
#define KD_W_OK 2
#define KD_X_OK 1
KDint kdAccess(const KDchar *pathname, KDint amode);

typedef struct KDDir KDDir;
typedef struct KDDirent {
    const KDchar *d_name;
} KDDirent;
KDDir *kdOpenDir(const KDchar *pathname);
/* The entry stays valid until the next kdReadDir or kdCloseDir. "." and ".."
 * are not reported. */
KDDirent *kdReadDir(KDDir *dir);
KDint kdCloseDir(KDDir *dir);

#ifdef __cplusplus
}
#endif
