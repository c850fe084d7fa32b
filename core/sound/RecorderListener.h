#pragma once

#include <boost/shared_ptr.hpp>

#include "sound/SoundDataBuffer.h"

namespace Sound {

class Recorder;

// Receives every captured slice of the recorders it is registered with, on
// the thread that started the recording. Registered by weak reference, so a
// listener that goes away needs no unregistering.
class RecorderListener {
public:
    virtual ~RecorderListener() = default;
    virtual void onSoundData(Recorder* recorder, const boost::shared_ptr<SoundDataBuffer>& buffer) = 0;
};

}  // namespace Sound
