#include "sound/Recorder.h"

#include <KD/kd.h>

#include "sound/al/RecorderAL.h"

namespace Sound {

boost::shared_ptr<Recorder> Recorder::createRecorder() {
    return boost::shared_ptr<Recorder>(new AL::RecorderAL());
}

Recorder::~Recorder() {
    KD_ASSERT(!recording);
}

void Recorder::startRecording() {
    KD_ASSERT(!recording);
    recording = true;
}

void Recorder::stopRecording() {
    KD_ASSERT(recording);
    recording = false;
}

void Recorder::addListener(const boost::weak_ptr<RecorderListener>& listener) {
    listeners.add(listener);
}

bool Recorder::removeListener(const RecorderListener* listener) {
    return listeners.remove(listener);
}

void Recorder::notifyListeners(const boost::shared_ptr<SoundDataBuffer>& buffer) {
    // A listener may drop the last reference to this recorder, e.g. when it
    // has heard enough; the recorder then goes only after the whole round.
    boost::shared_ptr<Recorder> keepAlive = weak_from_this().lock();
    listeners.notifyAll([this, &buffer](RecorderListener& listener) { listener.onSoundData(this, buffer); });
}

}  // namespace Sound
