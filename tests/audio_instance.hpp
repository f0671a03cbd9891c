// An audio decoder instance of the recording codec, registered under one OTI and released
// (instance and handle) at scope end.
#pragma once

#include <cstdint>

#include <vorcal/core.h>
#include <vorcal/wrapper.h>

#include "recording_codec.hpp"

namespace vorcal::test {

class AudioInstance {
public:
    explicit AudioInstance(uint32_t uOTI)
    {
        RecordingCodec::Get().Reset();
        hCAL_ = vorCAL_GetHandle(0, 1, 1);
        const CALAudioDecoderFunctions table = RecordingCodec::AudioDecoder();
        vorCAL_RegisterCodec(hCAL_, kMediaAudio, 0, uOTI, &table, sizeof table);
        hCodec_ = vorCAL_GetCodec(hCAL_, kMediaAudio, 0, uOTI);
    }
    ~AudioInstance()
    {
        vorCAL_ReleaseCodec(hCodec_);
        vorCAL_ReleaseHandle(hCAL_);
    }
    AudioInstance(const AudioInstance &) = delete;
    AudioInstance &operator=(const AudioInstance &) = delete;

    CALCodec *get() const { return hCodec_; }
    CALCodec *operator->() const { return hCodec_; }

private:
    static constexpr uint32_t kMediaAudio = 2;
    CALHandle *hCAL_ = nullptr;
    CALCodec *hCodec_ = nullptr;
};

} // namespace vorcal::test
