#include "session.hpp"

namespace vorcal::cli {

namespace {

// The engine's own media type and mode numbers (the layer only compares them).
constexpr uint32_t kMediaVideo = 2, kMediaAudio = 1, kModeDecode = 1;

int32_t GetProperty(uint32_t uProperty, uint32_t *puValue)
{
    LayerSession *pSession = LayerSession::Active();
    uint32_t uValue = 0;
    if (!pSession || !pSession->Answer(uProperty, uValue))
        return -1;
    *puValue = uValue;
    return 0;
}

int32_t VideoInit(uint32_t, const uint8_t *pConfig, int32_t iConfigLen, const uint8_t *, int32_t, uint32_t,
                  uint32_t *, uint32_t *, uint32_t *, CALParam *)
{
    if (LayerSession *pSession = LayerSession::Active())
        pSession->Record(pSession->InitSlot(), pConfig, iConfigLen);
    return 0;
}

int32_t VideoDecode(const uint8_t *pData, int32_t iLen, CALParam, CALParam, uint32_t *puResult, CALParam)
{
    if (LayerSession *pSession = LayerSession::Active())
        pSession->Record(pSession->LastSlot(), pData, iLen);
    *puResult = 0;
    return 0;
}

int32_t AudioInit(CALParam, const uint8_t *pConfig, int32_t iConfigLen, const uint8_t *, uint32_t, uint32_t *,
                  uint32_t *, uint32_t *, uint32_t *, CALParam *)
{
    if (LayerSession *pSession = LayerSession::Active())
        pSession->Record(pSession->InitSlot(), pConfig, iConfigLen);
    return 0;
}

int32_t AudioDecode(const uint8_t *pData, int32_t iLen, CALParam, CALParam, CALParam, CALParam, CALParam)
{
    if (LayerSession *pSession = LayerSession::Active())
        pSession->Record(pSession->LastSlot(), pData, iLen);
    return 0;
}

int32_t Quiet(CALParam)
{
    return 0;
}

} // namespace

LayerSession *LayerSession::pActive_ = nullptr;

// What an empty frame is passed as: a valid pointer to no bytes the layer would need.
const uint8_t LayerSession::kEmpty[4] = {0, 0, 0, 0};

LayerSession::LayerSession(MediaKind kind, uint32_t uOti, std::vector<std::pair<uint32_t, uint32_t>> answers)
    : kind_(kind), answers_(std::move(answers))
{
    pActive_ = this;
    pHandle_ = vorCAL_GetHandle(0, 1, 1);
    if (!pHandle_)
        return;
    int32_t iRegistered = 0;
    if (kind == MediaKind::Video) {
        const CALVideoDecoderFunctions functions = {GetProperty, cli::VideoInit, Quiet, cli::VideoDecode, nullptr,
                                                    Quiet};
        iRegistered = vorCAL_RegisterCodec(pHandle_, kMediaVideo, kModeDecode, uOti, &functions, sizeof functions);
        if (iRegistered)
            pCodec_ = vorCAL_GetCodec(pHandle_, kMediaVideo, kModeDecode, uOti);
    } else {
        const CALAudioDecoderFunctions functions = {GetProperty, cli::AudioInit, Quiet, cli::AudioDecode, Quiet,
                                                    nullptr};
        iRegistered = vorCAL_RegisterCodec(pHandle_, kMediaAudio, kModeDecode, uOti, &functions, sizeof functions);
        if (iRegistered)
            pCodec_ = vorCAL_GetCodec(pHandle_, kMediaAudio, kModeDecode, uOti);
    }
}

LayerSession::~LayerSession()
{
    if (pCodec_) {
        if (kind_ == MediaKind::Video)
            vorCAL_VideoDecoderDeinit(pCodec_);
        else
            vorCAL_AudioDecoderDeinit(pCodec_);
        vorCAL_ReleaseCodec(pCodec_);
    }
    if (pHandle_)
        vorCAL_ReleaseHandle(pHandle_);
    pActive_ = nullptr;
}

bool LayerSession::Answer(uint32_t uProperty, uint32_t &uValue) const
{
    for (const auto &[uKey, uAnswer] : answers_)
        if (uKey == uProperty) {
            uValue = uAnswer;
            return true;
        }
    return false;
}

void LayerSession::Record(Received &slot, const uint8_t *p, int32_t iLen)
{
    slot.bCalled = true;
    slot.p = p;
    if (p && iLen > 0)
        slot.bytes.assign(p, p + iLen);
    else
        slot.bytes.clear();
}

int32_t LayerSession::VideoInit(const std::vector<uint8_t> &config, uint32_t uNalLengthSize, uint32_t &uWidth,
                                uint32_t &uHeight)
{
    uint32_t uPitch = 0;
    init_ = Received{};
    return vorCAL_VideoDecoderInit(pCodec_, pCodec_->m_uCodecObjectTypeIndication, config.empty() ? kEmpty : config.data(),
                                   static_cast<int32_t>(config.size()), nullptr, 0, uNalLengthSize, &uWidth, &uHeight,
                                   &uPitch, 0);
}

int32_t LayerSession::VideoDecode(const std::vector<uint8_t> &frame, uint32_t &uResultWord)
{
    last_.bCalled = false;
    last_.bytes.clear();
    uResultWord = 0;
    pLastInput_ = frame.empty() ? kEmpty : frame.data();
    return vorCAL_VideoDecoderDecode(pCodec_, pLastInput_, static_cast<int32_t>(frame.size()), 0, 0, &uResultWord);
}

int32_t LayerSession::AudioInit(const std::vector<uint8_t> &config, const std::vector<uint8_t> &firstFrame,
                                AudioParams &params)
{
    init_ = Received{};
    return vorCAL_AudioDecoderInit(pCodec_, 0, config.empty() ? kEmpty : config.data(),
                                   static_cast<int32_t>(config.size()), firstFrame.empty() ? kEmpty : firstFrame.data(),
                                   static_cast<uint32_t>(firstFrame.size()), &params.uSampleRate, &params.uChannels,
                                   &params.uBitsPerSample, &params.uSamplesPerFrame, 0);
}

int32_t LayerSession::AudioDecode(const std::vector<uint8_t> &frame)
{
    last_.bCalled = false;
    last_.bytes.clear();
    pLastInput_ = frame.empty() ? kEmpty : frame.data();
    return vorCAL_AudioDecoderDecode(pCodec_, pLastInput_, static_cast<int32_t>(frame.size()), 0, 0, 0, 0);
}

} // namespace vorcal::cli
