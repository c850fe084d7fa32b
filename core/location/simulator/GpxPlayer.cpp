#include "location/simulator/GpxPlayer.h"

#include <KD/kdext.h>

namespace Simulator {

namespace {

const KDint64 kDefaultIntervalMs = 1000;
const KDint64 kFixLostAfterMs = 3000;

void postStatus(KDint status) {
    KDEvent* event = kdCreateEvent();
    event->type = KD_EVENT_LOCATION_STATUS_ZVR;
    event->timestamp = kdGetTimeUST();
    event->data.words[0] = status;
    kdPostEvent(event);
}

void postFix(const GpxPoint& point) {
    auto* fix = static_cast<KDLocationFixZVR*>(kdMalloc(sizeof(KDLocationFixZVR)));
    if (fix == nullptr) {
        return;
    }
    fix->latitude = point.latitude;
    fix->longitude = point.longitude;
    fix->speed = point.speed;
    fix->bearing = point.course;
    fix->accuracy = point.accuracy;
    fix->altitude = point.altitude;
    fix->precision = point.precision;
    KDEvent* event = kdCreateEvent();
    event->type = KD_EVENT_LOCATION_ZVR;
    // The mark of a simulated fix.
    event->timestamp = static_cast<KDust>(-1);
    event->data.p[0] = fix;
    kdPostEvent(event);
}

}  // namespace

GpxPlayer::GpxPlayer(const std::vector<GpxPoint>& points, float rate)
    : points(points),
      rate(rate > 0.0f ? rate : 1.0f),
      timer(callback<void (*)()>::make<GpxPlayer, &GpxPlayer::onTimer>(this)),
      next(0),
      started(false),
      fixLost(false) {}

void GpxPlayer::start(Finished finished) {
    stop();
    onFinished = finished;
    next = 0;
    fixLost = false;
    if (points.empty()) {
        onFinished();
        return;
    }
    started = true;
    playPoint();
}

void GpxPlayer::stop() {
    timer.cancel();
    started = false;
}

KDint64 GpxPlayer::gapAfter(size_t index) const {
    if (points[index].timeMs < 0 || points[index + 1].timeMs < 0) {
        return kDefaultIntervalMs;
    }
    // Points that were not read from a file may go back in time; they follow at once.
    const KDint64 gap = points[index + 1].timeMs - points[index].timeMs;
    return gap > 0 ? gap : 0;
}

void GpxPlayer::onTimer() {
    if (next > 0 && !fixLost && gapAfter(next - 1) > kFixLostAfterMs) {
        fixLost = true;
        postStatus(1);
        scheduleAfter(gapAfter(next - 1) - kFixLostAfterMs);
        return;
    }
    playPoint();
}

void GpxPlayer::playPoint() {
    if (fixLost) {
        fixLost = false;
        postStatus(2);
    }
    postFix(points[next++]);
    if (next == points.size()) {
        started = false;
        onFinished();
        return;
    }
    const KDint64 gap = gapAfter(next - 1);
    scheduleAfter(gap > kFixLostAfterMs ? kFixLostAfterMs : gap);
}

void GpxPlayer::scheduleAfter(KDint64 trackMs) {
    const double clockNs = static_cast<double>(trackMs) * 1.0e6 / rate;
    timer.start(Util::Timer::OneShot, static_cast<long long>(clockNs));
}

}  // namespace Simulator
