#include <gtest/gtest.h>
#include <pal/Simulation.h>

#include <boost/make_shared.hpp>
#include <cstdint>
#include <vector>

#include "FakeCaptureDevice.h"
#include "sound/Recorder.h"
#include "sound/al/RecorderAL.h"
#include "support/PalTest.h"

using Sound::Recorder;
using Sound::SoundDataBuffer;
using Sound::SoundDataInfo;

namespace {

::testing::Environment* const captureDevice = ::testing::AddGlobalTestEnvironment(new FakeCaptureDevice);

// Four seconds at 16 kHz: more than a test reads, so every sample read is one
// the device holds.
const int kSourceSamples = 64000;
const KDust kSliceMs = 300;

// No two neighbours alike, so a lost, repeated or reordered sample shows.
std::vector<std::int16_t> knownPcm() {
    std::vector<std::int16_t> samples(kSourceSamples);
    for (int i = 0; i < kSourceSamples; ++i) {
        samples[i] = static_cast<std::int16_t>((i * 7919) % 65536 - 32768);
    }
    return samples;
}

class Collector : public Sound::RecorderListener {
public:
    void onSoundData(Recorder* recorder, const boost::shared_ptr<SoundDataBuffer>& buffer) override {
        recorders.push_back(recorder);
        buffers.push_back(buffer);
    }

    std::vector<std::int16_t> samples() const {
        std::vector<std::int16_t> all;
        for (const boost::shared_ptr<SoundDataBuffer>& buffer : buffers) {
            for (size_t i = 0; i + 1 < buffer->data.size(); i += 2) {
                all.push_back(static_cast<std::int16_t>(buffer->data[i] | (buffer->data[i + 1] << 8)));
            }
        }
        return all;
    }

    std::vector<Recorder*> recorders;
    std::vector<boost::shared_ptr<SoundDataBuffer> > buffers;
};

// Stops the recording it hears first and drops the last reference to it.
class Quitter : public Sound::RecorderListener {
public:
    void onSoundData(Recorder* recorder, const boost::shared_ptr<SoundDataBuffer>&) override {
        recorder->stopRecording();
        owned.reset();
        ++calls;
    }

    boost::shared_ptr<Recorder> owned;
    int calls = 0;
};

class RecorderALTest : public PalTest {
protected:
    void SetUp() override {
        PalTest::SetUp();
        FakeCaptureDevice::captureSilence();
        baseTimers = pal::activeTimerCount();
    }

    boost::shared_ptr<Recorder> readyRecorder(int sampleRate = 8000) {
        boost::shared_ptr<Recorder> recorder = Recorder::createRecorder();
        recorder->setSampleRate(sampleRate);
        EXPECT_TRUE(recorder->init());
        recorder->addListener(collector);
        return recorder;
    }

    // Ticks until a second of sound arrived, with a generous bound.
    void recordOneSecond(int sampleRate) {
        for (int tick = 0; tick < 10 && collector->samples().size() < static_cast<size_t>(sampleRate);
             ++tick) {
            advanceMs(kSliceMs);
        }
    }

    int timersAdded() const { return pal::activeTimerCount() - baseTimers; }

    boost::shared_ptr<Collector> collector = boost::make_shared<Collector>();
    int baseTimers = 0;
};

TEST_F(RecorderALTest, NothingIsDeliveredWithoutCapturedSamples) {
    boost::shared_ptr<Recorder> recorder = readyRecorder();
    // Ready but not capturing: the device has no samples to give.
    static_cast<Sound::AL::RecorderAL*>(recorder.get())->onTimerCallback();
    recorder->startRecording();
    advanceMs(kSliceMs - 1);
    EXPECT_TRUE(collector->buffers.empty());
    recorder->stopRecording();
}

class RecorderALRateTest : public RecorderALTest, public ::testing::WithParamInterface<int> {};

TEST_P(RecorderALRateTest, CapturedSoundReachesListenersInOrder) {
    const int rate = GetParam();
    FakeCaptureDevice::capture(knownPcm());
    boost::shared_ptr<Recorder> recorder = readyRecorder(rate);
    recorder->startRecording();
    recordOneSecond(rate);
    recorder->stopRecording();

    ASSERT_FALSE(collector->buffers.empty());
    const int bufferSamples = 300 * 2 * (rate * 2) / 1000;
    for (size_t i = 0; i < collector->buffers.size(); ++i) {
        const SoundDataInfo& info = collector->buffers[i]->info;
        EXPECT_EQ(collector->recorders[i], recorder.get());
        EXPECT_EQ(info.getCodec(), SoundDataInfo::NONE);
        EXPECT_EQ(info.getChannelCount(), 1);
        EXPECT_EQ(info.getSampleRate(), rate);
        EXPECT_EQ(info.getSampleSize(), 2);
        EXPECT_GT(info.getSampleCount(), 0);
        EXPECT_LE(info.getSampleCount(), bufferSamples);
        EXPECT_EQ(collector->buffers[i]->data.size(), static_cast<size_t>(info.getSampleCount()) * 2);
    }
    const std::vector<std::int16_t> heard = collector->samples();
    const std::vector<std::int16_t> source = knownPcm();
    ASSERT_GE(heard.size(), static_cast<size_t>(rate));
    EXPECT_TRUE(std::equal(heard.begin(), heard.end(), source.begin()));
}

INSTANTIATE_TEST_SUITE_P(Rates, RecorderALRateTest, ::testing::Values(8000, 16000));

TEST_F(RecorderALTest, EachRecordingRunsInASessionOfItsOwn) {
    boost::shared_ptr<Recorder> recorder = readyRecorder();
    EXPECT_EQ(pal::openCaptureSessions(), 1);
    EXPECT_FALSE(pal::lastCaptureSessionAlternative());

    recorder->startRecording();
    EXPECT_TRUE(recorder->isRecording());
    EXPECT_EQ(timersAdded(), 1);
    recorder->stopRecording();
    EXPECT_FALSE(recorder->isRecording());
    EXPECT_EQ(pal::openCaptureSessions(), 0);
    EXPECT_EQ(timersAdded(), 0);
    advanceMs(3 * kSliceMs);
    EXPECT_TRUE(collector->buffers.empty());

    recorder->setCaptureMode(1);
    recorder->startRecording();
    EXPECT_EQ(pal::openCaptureSessions(), 1);
    EXPECT_TRUE(pal::lastCaptureSessionAlternative());
    recordOneSecond(8000);
    EXPECT_FALSE(collector->buffers.empty());

    // Destroyed while recording: stopped, session closed, timer gone.
    recorder.reset();
    EXPECT_EQ(pal::openCaptureSessions(), 0);
    EXPECT_EQ(timersAdded(), 0);
}

TEST_F(RecorderALTest, ReadyRecorderReleasesItsSessionWhenDestroyed) {
    readyRecorder().reset();
    EXPECT_EQ(pal::openCaptureSessions(), 0);
}

TEST_F(RecorderALTest, RefusedSessionRecordsNothing) {
    pal::setCaptureSessionsRefused(true);
    boost::shared_ptr<Recorder> refused = Recorder::createRecorder();
    EXPECT_FALSE(refused->init());
    EXPECT_EQ(countLogLines("refused an audio capture session"), 1);

    pal::setCaptureSessionsRefused(false);
    boost::shared_ptr<Recorder> recorder = readyRecorder();
    recorder->startRecording();
    recorder->stopRecording();
    pal::setCaptureSessionsRefused(true);
    recorder->startRecording();
    EXPECT_FALSE(recorder->isRecording());
    advanceMs(3 * kSliceMs);
    EXPECT_TRUE(collector->buffers.empty());
    EXPECT_EQ(timersAdded(), 0);
}

TEST_F(RecorderALTest, UnavailableDeviceFailsInitAndClosesTheSession) {
    FakeCaptureDevice::unplug();
    boost::shared_ptr<Recorder> recorder = Recorder::createRecorder();
    EXPECT_FALSE(recorder->init());
    EXPECT_EQ(pal::openCaptureSessions(), 0);
    EXPECT_EQ(countLogLines("cannot open the capture device"), 1);
}

TEST_F(RecorderALTest, MisuseAssertsAndChangesNothing) {
    boost::shared_ptr<Recorder> unopened = Recorder::createRecorder();
    unopened->startRecording();
    expectAssertion("device");
    EXPECT_FALSE(unopened->isRecording());

    boost::shared_ptr<Recorder> recorder = readyRecorder();
    EXPECT_TRUE(recorder->init());
    expectAssertion("!device");
    recorder->stopRecording();
    expectAssertion("recording");
    recorder->startRecording();
    recorder->startRecording();
    expectAssertion("!recording");
    EXPECT_EQ(timersAdded(), 1);
    EXPECT_EQ(pal::openCaptureSessions(), 1);
    recorder->stopRecording();
}

TEST_F(RecorderALTest, ExpiredAndRemovedListenersHearNothing) {
    boost::shared_ptr<Recorder> recorder = readyRecorder();
    boost::shared_ptr<Collector> expired = boost::make_shared<Collector>();
    boost::shared_ptr<Collector> removed = boost::make_shared<Collector>();
    boost::shared_ptr<Collector> last = boost::make_shared<Collector>();
    recorder->addListener(expired);
    recorder->addListener(removed);
    recorder->addListener(last);
    expired.reset();
    EXPECT_TRUE(recorder->removeListener(removed.get()));
    EXPECT_FALSE(recorder->removeListener(removed.get()));
    EXPECT_EQ(recorder->getListenerCount(), 3u);

    recorder->startRecording();
    recordOneSecond(8000);
    recorder->stopRecording();
    EXPECT_EQ(recorder->getListenerCount(), 2u);
    EXPECT_TRUE(removed->buffers.empty());
    EXPECT_EQ(last->buffers, collector->buffers);
}

TEST_F(RecorderALTest, ListenerMayStopAndReleaseTheRecorder) {
    boost::shared_ptr<Quitter> quitter = boost::make_shared<Quitter>();
    quitter->owned = readyRecorder();
    quitter->owned->addListener(quitter);
    boost::shared_ptr<Collector> after = boost::make_shared<Collector>();
    quitter->owned->addListener(after);
    boost::weak_ptr<Recorder> watched = quitter->owned;
    quitter->owned->startRecording();

    advanceMs(3 * kSliceMs);
    EXPECT_TRUE(watched.expired());
    EXPECT_EQ(quitter->calls, 1);
    // The round ends before the recorder goes: the listener after the
    // quitter still hears that slice, and nothing follows.
    EXPECT_EQ(collector->buffers.size(), 1u);
    EXPECT_EQ(after->buffers, collector->buffers);
    EXPECT_EQ(pal::openCaptureSessions(), 0);
    EXPECT_EQ(timersAdded(), 0);
}

}  // namespace
