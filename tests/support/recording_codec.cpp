#include "recording_codec.hpp"

namespace vorcal::test {

namespace {

RecordingCodec &C() { return RecordingCodec::Get(); }

std::vector<uint8_t> Bytes(const uint8_t *p, int64_t n)
{
    if (!p || n <= 0)
        return {};
    return std::vector<uint8_t>(p, p + n);
}

int32_t Record(int iSlot, std::vector<CALParam> args, std::vector<uint8_t> data = {},
               CALParam *ppUserData = nullptr, std::vector<uint8_t> data2 = {})
{
    CodecCall call;
    call.iSlot = iSlot;
    call.args = std::move(args);
    call.data = std::move(data);
    call.data2 = std::move(data2);
    if (ppUserData) {
        call.userDataAtCall = *ppUserData;
        if (C().writeUserData)
            *ppUserData = C().userDataToWrite;
    }
    C().calls.push_back(std::move(call));
    return C().results[iSlot];
}

int32_t GetProperty(uint32_t uProperty, uint32_t *puValue)
{
    C().propertyQueries.push_back(uProperty);
    Record(0, {uProperty, P(puValue)});
    auto it = C().properties.find(uProperty);
    if (it == C().properties.end())
        return -1;
    *puValue = it->second.second;
    return it->second.first;
}

int32_t UserDataSlot2(CALParam ud) { return Record(2, {ud}); }
int32_t UserDataSlot4(CALParam ud) { return Record(4, {ud}); }
int32_t UserDataSlot5(CALParam ud) { return Record(5, {ud}); }

int32_t VideoInit(uint32_t uOTI, const uint8_t *pConfig, int32_t iConfigLen, const uint8_t *pConfigEnhance,
                  int32_t iEnhLen, uint32_t uNALLengthSize, uint32_t *puWidth, uint32_t *puHeight,
                  uint32_t *puPitch, CALParam *ppUserData)
{
    if (C().writeOutputs) {
        *puWidth = C().outputs[0];
        *puHeight = C().outputs[1];
        *puPitch = C().outputs[2];
    }
    return Record(1,
                  {uOTI, P(pConfig), static_cast<CALParam>(iConfigLen), P(pConfigEnhance),
                   static_cast<CALParam>(iEnhLen), uNALLengthSize, P(puWidth), P(puHeight), P(puPitch),
                   P(ppUserData)},
                  Bytes(pConfig, iConfigLen), ppUserData, Bytes(pConfigEnhance, iEnhLen));
}

int32_t VideoDecode(const uint8_t *pData, int32_t iLen, CALParam uParam3, CALParam uParam4,
                    uint32_t *puDecodeResult, CALParam ud)
{
    return Record(3, {P(pData), static_cast<CALParam>(iLen), uParam3, uParam4, P(puDecodeResult), ud},
                  Bytes(pData, iLen));
}

int32_t VideoGetOutput(CALParam u1, CALParam u2, CALParam u3, CALParam u4, CALParam ud)
{
    return Record(4, {u1, u2, u3, u4, ud});
}

int32_t AudioInit(CALParam uParam1, const uint8_t *pConfig, int32_t iConfigLen, const uint8_t *pFrame,
                  uint32_t uFrameLen, uint32_t *puSamplingRate, uint32_t *puNumOfChannels,
                  uint32_t *puBitsPerSample, uint32_t *puSamplesPerFrame, CALParam *ppUserData)
{
    if (C().writeOutputs) {
        *puSamplingRate = C().outputs[0];
        *puNumOfChannels = C().outputs[1];
        *puBitsPerSample = C().outputs[2];
        *puSamplesPerFrame = C().outputs[3];
    }
    return Record(1,
                  {uParam1, P(pConfig), static_cast<CALParam>(iConfigLen), P(pFrame), uFrameLen,
                   P(puSamplingRate), P(puNumOfChannels), P(puBitsPerSample), P(puSamplesPerFrame),
                   P(ppUserData)},
                  Bytes(pConfig, iConfigLen), ppUserData, Bytes(pFrame, uFrameLen));
}

int32_t AudioDecode(const uint8_t *pData, int32_t iLen, CALParam u3, CALParam u4, CALParam u5, CALParam u6,
                    CALParam ud)
{
    return Record(3, {P(pData), static_cast<CALParam>(iLen), u3, u4, u5, u6, ud}, Bytes(pData, iLen));
}

int32_t ImageGetHeader(CALParam u1, CALParam u2, CALParam u3, CALParam u4, CALParam u5, CALParam u6,
                       CALParam u7, CALParam *ppUserData)
{
    return Record(1, {u1, u2, u3, u4, u5, u6, u7, P(ppUserData)}, {}, ppUserData);
}

int32_t ImageDecode(CALParam u1, CALParam u2, CALParam u3, CALParam u4, CALParam u5, CALParam u6, CALParam u7,
                    CALParam u8, CALParam u9, CALParam u10, CALParam ud)
{
    return Record(2, {u1, u2, u3, u4, u5, u6, u7, u8, u9, u10, ud});
}

int32_t TextInit(CALParam u1, CALParam u2, CALParam u3, CALParam *ppUserData)
{
    return Record(1, {u1, u2, u3, P(ppUserData)}, {}, ppUserData);
}

int32_t TextDecode(const uint8_t *pData, int32_t iLen, CALParam u3, CALParam u4, CALParam u5, CALParam ud)
{
    return Record(3, {P(pData), static_cast<CALParam>(iLen), u3, u4, u5, ud}, Bytes(pData, iLen));
}

int32_t TextGetOutput(CALParam u1, CALParam ud) { return Record(4, {u1, ud}); }

int32_t EncoderInit(CALParam u1, CALParam u2, CALParam u3, CALParam u4, CALParam u5, CALParam u6, CALParam u7,
                    CALParam u8, CALParam u9, CALParam *ppUserData)
{
    return Record(1, {u1, u2, u3, u4, u5, u6, u7, u8, u9, P(ppUserData)}, {}, ppUserData);
}

int32_t EncoderEncode(CALParam u1, CALParam u2, CALParam u3, CALParam u4, CALParam u5, CALParam u6, CALParam ud)
{
    return Record(3, {u1, u2, u3, u4, u5, u6, ud});
}

int32_t EncoderSkip(CALParam u1, CALParam u2, CALParam ud) { return Record(4, {u1, u2, ud}); }

} // namespace

RecordingCodec &RecordingCodec::Get()
{
    static RecordingCodec instance;
    return instance;
}

void RecordingCodec::Reset()
{
    *this = RecordingCodec();
}

size_t RecordingCodec::Count(int iSlot) const
{
    size_t n = 0;
    for (const CodecCall &call : calls)
        n += call.iSlot == iSlot;
    return n;
}

const CodecCall *RecordingCodec::Last(int iSlot) const
{
    for (auto it = calls.rbegin(); it != calls.rend(); ++it) {
        if (it->iSlot == iSlot)
            return &*it;
    }
    return nullptr;
}

CALVideoDecoderFunctions RecordingCodec::VideoDecoder()
{
    return {GetProperty, VideoInit, UserDataSlot2, VideoDecode, VideoGetOutput, UserDataSlot5};
}

CALAudioDecoderFunctions RecordingCodec::AudioDecoder()
{
    return {GetProperty, AudioInit, UserDataSlot2, AudioDecode, UserDataSlot4, nullptr};
}

CALImageDecoderFunctions RecordingCodec::ImageDecoder()
{
    return {GetProperty, ImageGetHeader, ImageDecode, nullptr, nullptr, nullptr};
}

CALTextDecoderFunctions RecordingCodec::TextDecoder()
{
    return {nullptr, TextInit, UserDataSlot2, TextDecode, TextGetOutput, nullptr};
}

CALVideoEncoderFunctions RecordingCodec::VideoEncoder()
{
    return {GetProperty, EncoderInit, UserDataSlot2, EncoderEncode, EncoderSkip, nullptr};
}

} // namespace vorcal::test
