#include "sound/OggVorbisDecoder.h"

#include <KD/kd.h>

#include <algorithm>
#include <cstring>

#include "util/Logger.h"

namespace Sound {

namespace {

// ov_read's request per call; the output grows by what it returns.
constexpr int kReadChunkBytes = 16 * 1024;

// vorbisfile takes its length from the last complete page and ignores a cut
// one, so a file cut inside a page would decode as a shorter, valid stream.
// A file cut between pages (where an interrupted write stops) looks whole
// too, but only a stream's last page carries the end-of-stream flag.
bool isTruncated(const unsigned char* data, size_t size) {
    ogg_sync_state sync;
    ogg_sync_init(&sync);
    char* buffer = ogg_sync_buffer(&sync, static_cast<long>(size));
    bool truncated = buffer == nullptr;
    if (buffer != nullptr) {
        std::memcpy(buffer, data, size);
        ogg_sync_wrote(&sync, static_cast<long>(size));
        ogg_page page;
        bool lastEndsStream = false;
        for (long found = ogg_sync_pageseek(&sync, &page); found != 0;
             found = ogg_sync_pageseek(&sync, &page)) {
            if (found > 0) {
                lastEndsStream = ogg_page_eos(&page) != 0;
            }
        }
        truncated = sync.fill > sync.returned || !lastEndsStream;
    }
    ogg_sync_clear(&sync);
    return truncated;
}

}  // namespace

OggVorbisDecoder::OggVorbisDecoder(SoundDataBuffer& output, const SoundDataBuffer& input)
    : output(output), input(input) {}

OggVorbisDecoder::~OggVorbisDecoder() {
    closeOggVorbisFile();
}

size_t OggVorbisDecoder::readOgg(void* ptr, size_t size, size_t count, void* source) {
    OggVorbisDecoder* decoder = static_cast<OggVorbisDecoder*>(source);
    const size_t left = decoder->sourceSize - decoder->readPosition;
    if (size == 0) {
        return 0;
    }
    const size_t copied = count > left / size ? left : size * count;
    if (copied > 0) {
        std::memcpy(ptr, decoder->sourceData + decoder->readPosition, copied);
    }
    decoder->readPosition += copied;
    return copied;
}

int OggVorbisDecoder::seekOgg(void* source, ogg_int64_t offset, int whence) {
    OggVorbisDecoder* decoder = static_cast<OggVorbisDecoder*>(source);
    const ogg_int64_t size = static_cast<ogg_int64_t>(decoder->sourceSize);
    ogg_int64_t base;
    switch (whence) {
        case SEEK_SET:
            base = 0;
            break;
        case SEEK_CUR:
            base = static_cast<ogg_int64_t>(decoder->readPosition);
            break;
        case SEEK_END:
            base = size;
            break;
        default:
            return -1;
    }
    // Compared before adding, so that no offset can overflow.
    if (offset > size - base || offset < -base) {
        return -1;
    }
    decoder->readPosition = static_cast<size_t>(base + offset);
    return 0;
}

int OggVorbisDecoder::closeOgg(void*) {
    return 0;
}

long OggVorbisDecoder::tellOgg(void* source) {
    return static_cast<long>(static_cast<OggVorbisDecoder*>(source)->readPosition);
}

bool OggVorbisDecoder::decode() {
    if (!openOggVorbisFile()) {
        return false;
    }
    const ogg_int64_t total = ov_pcm_total(&file, -1);
    const vorbis_info* info = ov_info(&file, -1);
    if (isTruncated(sourceData, sourceSize)) {
        Logger::log(Logger::Warning, "Ogg Vorbis: the file is truncated\n");
        return fail();
    }
    if (total < 0 || info == nullptr || info->channels <= 0) {
        Logger::log(Logger::Warning, "Ogg Vorbis: no valid length (%lld)\n", static_cast<long long>(total));
        return fail();
    }
    const long long bytesPerSample = 2LL * info->channels;
    if (total > kMaxDecodedBytes / bytesPerSample) {
        Logger::log(Logger::Warning, "Ogg Vorbis: declared length of %lld samples exceeds the limit\n",
                    static_cast<long long>(total));
        return fail();
    }
    output.data.clear();
    const long long blockSize = total * bytesPerSample;
    if (blockSize == 0 || readAll(blockSize)) {
        closeOggVorbisFile();
        return true;
    }
    return fail();
}

bool OggVorbisDecoder::openOggVorbisFile() {
    closeOggVorbisFile();
    sourceData = input.data.data();
    sourceSize = input.data.size();
    readPosition = 0;
    const ov_callbacks callbacks = {readOgg, seekOgg, closeOgg, tellOgg};
    if (ov_open_callbacks(this, &file, nullptr, -1, callbacks) < 0) {
        return false;
    }
    fileOpen = true;
    return true;
}

bool OggVorbisDecoder::readAll(long long blockSize) {
    std::vector<char> chunk(kReadChunkBytes);
    long long readData = 0;
    while (readData < blockSize) {
        const int wanted = static_cast<int>(std::min<long long>(kReadChunkBytes, blockSize - readData));
        int section = 0;
        const long result = ov_read(&file, chunk.data(), wanted, 0, 2, 1, &section);
        // Holes, bad links and an early end all mean samples are missing.
        if (result <= 0) {
            return false;
        }
        output.data.insert(output.data.end(), chunk.data(), chunk.data() + result);
        readData += result;
    }
    KD_ASSERT(readData == blockSize);
    return true;
}

bool OggVorbisDecoder::fail() {
    closeOggVorbisFile();
    output.data.clear();
    output.data.shrink_to_fit();
    return false;
}

void OggVorbisDecoder::closeOggVorbisFile() {
    if (fileOpen) {
        ov_clear(&file);
        fileOpen = false;
    }
}

}  // namespace Sound
