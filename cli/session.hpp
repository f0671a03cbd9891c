// One codec instance of the layer with a recording codec behind it: the codec answers the
// properties the command line chose and keeps what the layer hands it, so that the tool can
// show and write exactly what a real codec would receive.
#pragma once

#include <cstdint>
#include <utility>
#include <vector>

#include <vorcal/vorcal.h>

#include "common.hpp"

namespace vorcal::cli {

struct Received {
    bool bCalled = false;        // the codec's Decode (or Init) ran
    const uint8_t *p = nullptr;  // where the bytes were (the caller's buffer or the layer's)
    std::vector<uint8_t> bytes;  // a copy of them
};

struct AudioParams {
    uint32_t uSampleRate = 0, uChannels = 0, uBitsPerSample = 0, uSamplesPerFrame = 0;
};

class LayerSession {
public:
    // Registers the recording codec for the OTI and creates an instance; Ok() tells whether the
    // layer gave one. Only one session exists at a time (the codec's GetProperty has no context).
    LayerSession(MediaKind kind, uint32_t uOti, std::vector<std::pair<uint32_t, uint32_t>> answers);
    ~LayerSession();
    LayerSession(const LayerSession &) = delete;
    LayerSession &operator=(const LayerSession &) = delete;
    bool Ok() const { return pCodec_ != nullptr; }

    int32_t VideoInit(const std::vector<uint8_t> &config, uint32_t uNalLengthSize, uint32_t &uWidth,
                      uint32_t &uHeight);
    int32_t VideoDecode(const std::vector<uint8_t> &frame, uint32_t &uResultWord);
    int32_t AudioInit(const std::vector<uint8_t> &config, const std::vector<uint8_t> &firstFrame,
                      AudioParams &params);
    int32_t AudioDecode(const std::vector<uint8_t> &frame);

    // What the codec received at Init and in the last Decode.
    const Received &Init() const { return init_; }
    const Received &Last() const { return last_; }
    // The pointer the last Decode passed to the layer.
    const uint8_t *LastInput() const { return pLastInput_; }

    static LayerSession *Active() { return pActive_; }
    bool Answer(uint32_t uProperty, uint32_t &uValue) const;
    void Record(Received &slot, const uint8_t *p, int32_t iLen);
    Received &InitSlot() { return init_; }
    Received &LastSlot() { return last_; }

private:
    static const uint8_t kEmpty[4];
    static LayerSession *pActive_;
    const uint8_t *pLastInput_ = nullptr;
    MediaKind kind_;
    std::vector<std::pair<uint32_t, uint32_t>> answers_;
    CALHandle *pHandle_ = nullptr;
    CALCodec *pCodec_ = nullptr;
    Received init_, last_;
};

} // namespace vorcal::cli
