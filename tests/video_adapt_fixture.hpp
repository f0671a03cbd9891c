// Shared by the video decoder adaptation tests: a few H.264 units (framed with the builders of
// avc_streams.hpp) and a fixture that drives a recording video decoder through a CAL handle.
#pragma once

#include <gtest/gtest.h>

#include <cstdint>
#include <initializer_list>
#include <vector>

#include <vorcal/core.h>
#include <vorcal/wrapper.h>

#include "avc_streams.hpp"
#include "bit_writer.hpp"
#include "recording_codec.hpp"
#include "recording_sal.hpp"

namespace vorcal::test {

// The fields of a sequence parameter set that the size and profile parse reads (ITU-T H.264
// 7.3.2.1.1 with pic_order_cnt_type 2, no cropping, no VUI).
inline Bytes MakeSPS(uint8_t uProfile, uint32_t uWidth, uint32_t uHeight)
{
    BitWriter w;
    w.Put(0x67, 8).Put(uProfile, 8).Put(0, 8).Put(30, 8); // header, profile, constraints, level
    w.PutUE(0).PutUE(0).PutUE(2).PutUE(1);                  // id, log2_max_frame_num-4, poc type, refs
    w.PutBit(0).PutUE(uWidth / 16 - 1).PutUE(uHeight / 16 - 1);
    w.PutBit(1).PutBit(1).PutBit(0).PutBit(0).Trailing();   // frame_mbs_only, direct_8x8, crop, vui
    return BitWriter::Escape(w.Bytes());
}

inline const Bytes kIDR = {0x65, 0x88, 0x84, 0x00, 0x10, 0x2F};
inline const Bytes kSlice = {0x41, 0x9A, 0x12, 0x34};
inline const Bytes kAUD = {0x09, 0xF0};

// AVC decoder configuration record (ISO/IEC 14496-15) with one SPS and one PPS.
inline Bytes AvcC(const Bytes &sps, const Bytes &pps, unsigned uNALSize = 4)
{
    Bytes out = {1, sps[1], sps[2], sps[3], static_cast<uint8_t>(0xFC | (uNALSize - 1)), 0xE1};
    out.push_back(static_cast<uint8_t>(sps.size() >> 8));
    out.push_back(static_cast<uint8_t>(sps.size()));
    out.insert(out.end(), sps.begin(), sps.end());
    out.push_back(1);
    out.push_back(static_cast<uint8_t>(pps.size() >> 8));
    out.push_back(static_cast<uint8_t>(pps.size()));
    out.insert(out.end(), pps.begin(), pps.end());
    return out;
}

// A property answer that GetProperty gives with a non-zero result, so that it does not count.
inline constexpr uint32_t kUnanswered = 0xFFFFFFFF;

// A recording video decoder registered under one OTI and opened as an instance. Every test ends
// with the handle released and no block of the system layer left.
class VideoDecoderTest : public ::testing::Test {
protected:
    static constexpr uint32_t kMediaType = 2;
    static constexpr uint32_t kMode = 1;

    RecordingSal &sal = RecordingSal::Get();
    RecordingCodec &codec = RecordingCodec::Get();
    CALHandle *hCAL = nullptr;
    CALCodec *hCodec = nullptr;
    uint32_t width = 0, height = 0, pitch = 0;
    size_t baseAllocs = 0; // allocations and frees of handle, registry and instance
    size_t baseFrees = 0;
    size_t baseLive = 0;

    void SetUp() override
    {
        sal.Reset();
        codec.Reset();
        hCAL = vorCAL_GetHandle(0, 1, 1);
        ASSERT_NE(hCAL, nullptr);
    }

    void TearDown() override
    {
        if (hCodec) {
            vorCAL_VideoDecoderDeinit(hCodec);
            vorCAL_ReleaseCodec(hCodec);
        }
        vorCAL_ReleaseHandle(hCAL);
        EXPECT_TRUE(sal.liveBlocks.empty()) << sal.liveBlocks.size() << " blocks leaked";
        EXPECT_EQ(sal.badFrees, 0u);
    }

    void Open(uint32_t uOTI)
    {
        const CALVideoDecoderFunctions functions = RecordingCodec::VideoDecoder();
        ASSERT_EQ(vorCAL_RegisterCodec(hCAL, kMediaType, kMode, uOTI, &functions, sizeof functions), 1);
        hCodec = vorCAL_GetCodec(hCAL, kMediaType, kMode, uOTI);
        ASSERT_NE(hCodec, nullptr);
        baseAllocs = sal.allocSizes.size();
        baseFrees = sal.freeCount;
        baseLive = sal.liveBlocks.size();
    }

    // GetProperty answers uValue with result 0, or does not answer (kUnanswered).
    void Answer(uint32_t uProperty, uint32_t uValue)
    {
        if (uValue == kUnanswered)
            codec.Answer(uProperty, 1, -1);
        else
            codec.Answer(uProperty, uValue);
    }

    // An Init whose only effect is the NAL length size that Decode uses.
    void InitNALSize(uint32_t uNALSize)
    {
        codec.Answer(CAL_PROP_H264_CONFIG_FORMAT, 0);
        ASSERT_EQ(Init(CAL_OTI_H264, {}, {}, uNALSize), 0);
    }

    int32_t Init(uint32_t uOTI, const Bytes &config, const Bytes &enhance = {}, uint32_t uNALSize = 4,
                 CALParam uUserData = 0x1234)
    {
        return vorCAL_VideoDecoderInit(hCodec, uOTI, config.empty() ? nullptr : config.data(),
                                       static_cast<int32_t>(config.size()),
                                       enhance.empty() ? nullptr : enhance.data(),
                                       static_cast<int32_t>(enhance.size()), uNALSize, &width, &height, &pitch,
                                       uUserData);
    }

    int32_t Decode(const Bytes &frame, uint32_t *puResult, CALParam uParam3 = 7)
    {
        return vorCAL_VideoDecoderDecode(hCodec, frame.data(), static_cast<int32_t>(frame.size()), uParam3, 8,
                                         puResult);
    }

    // Bytes the codec's last Decode received.
    const Bytes &Received() const
    {
        static const Bytes kNone;
        const CodecCall *pCall = codec.Last(3);
        return pCall ? pCall->data : kNone;
    }
};

} // namespace vorcal::test
