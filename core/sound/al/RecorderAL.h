#pragma once

#include <AL/alc.h>
#include <KD/kdext.h>

#include "sound/Recorder.h"
#include "util/Timer.h"

namespace Sound {
namespace AL {

// A recorder over OpenAL capture inside one of the platform's capture
// sessions. The device opened by init() stays open until destruction; each
// recording runs in a session of its own. Every intervalMs the samples
// captured so far go to the listeners as one buffer of 16-bit mono PCM in the
// host's byte order (little-endian on every platform we build for).
//
// Threads: the thread that created it, like its timer.
class RecorderAL : public Recorder {
public:
    RecorderAL();
    // Stops a running recording and closes the device.
    ~RecorderAL() override;

    bool init() override;
    void startRecording() override;
    void stopRecording() override;

    // One slice: what was captured since the last one, if anything.
    void onTimerCallback();

private:
    bool openCaptureSession();
    void closeCaptureSession();
    int capturedSamples();

    Util::Timer timer;
    KDCaptureSessionZVR* captureSession = nullptr;
    ALCdevice* device = nullptr;
    // What init() opened the device with.
    int deviceSampleRate = 0;
    int deviceIntervalMs = 0;
    int bufferSamples = 0;
};

}  // namespace AL
}  // namespace Sound
