#pragma once

#include <boost/enable_shared_from_this.hpp>
#include <boost/shared_ptr.hpp>
#include <boost/weak_ptr.hpp>
#include <cstddef>

#include "sound/RecorderListener.h"
#include "sound/SoundDataBuffer.h"
#include "util/WeakListenerList.h"

namespace Sound {

// Captures 16-bit mono PCM and hands it to the listeners in slices of about
// intervalMs, in order of registration. Set the sample rate, the interval and
// the capture mode before init(); they take effect there and at the next
// startRecording() respectively.
//
// Threads: create, start and stop a recorder on one thread, which has its
// timer and gets the listener calls.
class Recorder : public boost::enable_shared_from_this<Recorder> {
public:
    // A recorder over OpenAL capture; call init() before recording.
    static boost::shared_ptr<Recorder> createRecorder();

    virtual ~Recorder();

    // Opens the capture device: false when it or the platform's capture
    // session is unavailable, and then nothing can be recorded.
    virtual bool init() = 0;
    virtual void startRecording();
    virtual void stopRecording();

    void addListener(const boost::weak_ptr<RecorderListener>& listener);
    // Unlinks the first registration of listener; false when there is none.
    bool removeListener(const RecorderListener* listener);
    // Registrations held, including expired ones not pruned yet.
    size_t getListenerCount() const { return listeners.size(); }

    bool isRecording() const { return recording; }
    int getSampleRate() const { return sampleRate; }
    void setSampleRate(int hertz) { sampleRate = hertz; }
    int getIntervalMs() const { return intervalMs; }
    void setIntervalMs(int milliseconds) { intervalMs = milliseconds; }
    // 1 selects the platform's alternative capture session.
    int getCaptureMode() const { return captureMode; }
    void setCaptureMode(int mode) { captureMode = mode; }

protected:
    Recorder() = default;

    // Prunes expired listeners, then hands buffer to the others.
    void notifyListeners(const boost::shared_ptr<SoundDataBuffer>& buffer);

    Util::WeakListenerList<RecorderListener> listeners;
    bool recording = false;
    int sampleRate = 8000;
    int intervalMs = 300;
    int captureMode = 0;

private:
    Recorder(const Recorder&) = delete;
    Recorder& operator=(const Recorder&) = delete;
};

}  // namespace Sound
