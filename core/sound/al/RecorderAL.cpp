#include "sound/al/RecorderAL.h"

#include <AL/al.h>
#include <KD/kd.h>

#include <algorithm>
#include <boost/make_shared.hpp>
#include <climits>

#include "util/Logger.h"

namespace Sound {
namespace AL {

RecorderAL::RecorderAL()
    : timer(callback<void (*)()>::make<RecorderAL, &RecorderAL::onTimerCallback>(this)) {}

RecorderAL::~RecorderAL() {
    if (device != nullptr) {
        if (recording) {
            stopRecording();
        }
        alcCaptureCloseDevice(device);
        device = nullptr;
    }
    // A recorder made ready and never started still holds its first session.
    closeCaptureSession();
}

bool RecorderAL::init() {
    KD_ASSERT(!device);
    if (device != nullptr) {
        return true;
    }
    // Twice one slice's byte count, in samples: room for four slices, so a
    // late tick loses nothing.
    const long long samples = intervalMs * 2LL * (sampleRate * 2LL) / 1000;
    if (intervalMs <= 0 || samples <= 0 || samples > INT_MAX) {
        Logger::log(Logger::Error, "Recorder: no capture buffer for %d Hz in slices of %d ms", sampleRate,
                    intervalMs);
        return false;
    }
    if (!openCaptureSession()) {
        return false;
    }
    device = alcCaptureOpenDevice(nullptr, sampleRate, AL_FORMAT_MONO16, static_cast<ALCsizei>(samples));
    if (device == nullptr) {
        Logger::log(Logger::Error, "Recorder: cannot open the capture device for %d Hz mono", sampleRate);
        closeCaptureSession();
        return false;
    }
    deviceSampleRate = sampleRate;
    deviceIntervalMs = intervalMs;
    bufferSamples = static_cast<int>(samples);
    return true;
}

void RecorderAL::startRecording() {
    KD_ASSERT(!recording);
    KD_ASSERT(device);
    // The session of init() ends with the first recording, so a later one
    // opens its own.
    if (recording || device == nullptr || !openCaptureSession()) {
        return;
    }
    Recorder::startRecording();
    timer.start(Util::Timer::PeriodicAverage, deviceIntervalMs * 1000000LL);
    alcCaptureStart(device);
}

void RecorderAL::stopRecording() {
    KD_ASSERT(recording);
    if (!recording) {
        return;
    }
    alcCaptureStop(device);
    closeCaptureSession();
    timer.cancel();
    Recorder::stopRecording();
}

void RecorderAL::onTimerCallback() {
    const int count = capturedSamples();
    if (count == 0) {
        return;
    }
    boost::shared_ptr<SoundDataBuffer> buffer = boost::make_shared<SoundDataBuffer>();
    buffer->info = SoundDataInfo(SoundDataInfo::NONE, 1, deviceSampleRate, 2, count);
    buffer->data.resize(static_cast<size_t>(count) * 2);
    alcCaptureSamples(device, buffer->data.data(), count);
    if (alcGetError(device) != ALC_NO_ERROR) {
        Logger::log(Logger::Warning, "Recorder: reading %d captured samples failed", count);
        return;
    }
    notifyListeners(buffer);
}

bool RecorderAL::openCaptureSession() {
    if (captureSession != nullptr) {
        return true;
    }
    captureSession = alCreateCaptureSessionZVR(captureMode == 1 ? KD_TRUE : KD_FALSE);
    if (captureSession == nullptr) {
        Logger::log(Logger::Error, "Recorder: the platform refused an audio capture session");
        return false;
    }
    return true;
}

void RecorderAL::closeCaptureSession() {
    if (captureSession != nullptr) {
        alDestroyCaptureSessionZVR(captureSession);
        captureSession = nullptr;
    }
}

int RecorderAL::capturedSamples() {
    if (device == nullptr) {
        return 0;
    }
    alcGetError(device);
    ALCint count = 0;
    alcGetIntegerv(device, ALC_CAPTURE_SAMPLES, 1, &count);
    if (alcGetError(device) != ALC_NO_ERROR || count <= 0) {
        return 0;
    }
    // The count is the device's word: a faulty or emulated one claims
    // millions of samples. More than the buffer holds cannot be real, and
    // would cost an allocation of that size.
    return std::min(static_cast<int>(count), bufferSamples);
}

}  // namespace AL
}  // namespace Sound
