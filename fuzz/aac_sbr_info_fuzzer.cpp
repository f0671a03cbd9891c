// The parse-only decoder's entries on arbitrary bytes. The first byte picks the entry:
//  0: VrAACSBRInfo on the rest, copied into a buffer of at least the 11 bytes a header parse
//     reads;
//  1: VrAACDecInitOnlyParsing on the rest (ADIF, ADTS or headerless) behind the slack an ADIF
//     header can need, then channel elements through chn_configOnlyParsing and a noise band;
//  2: vorCALTools_GetAACType through a codec instance (rate, channels, OTI and an allocation
//     failure taken from the input), checking results and that nothing leaks.
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <vector>

#include <vorcal/aacparse.h>
#include <vorcal/audio_tools.h>
#include <vorcal/wrapper.h>

#include "fuzz_sal.hpp"

namespace {

// adif_header with 16 program_config_elements of the largest size, and the 4-byte lookahead.
constexpr size_t kAdifSlack = 4950;
constexpr size_t kHeaderBytes = 11;

void Trap(bool ok)
{
    if (!ok)
        __builtin_trap();
}

void Detect(vorcal::fuzz::Input &in)
{
    std::vector<uint8_t> buf(in.Rest(), in.Rest() + in.RestSize());
    if (buf.size() < kHeaderBytes)
        buf.resize(kHeaderBytes, 0);
    uint32_t out[5] = {1, 2, 3, 4, 5};
    const uint32_t r = VrAACSBRInfo(buf.data(), static_cast<uint32_t>(buf.size()), &out[0], &out[1], &out[2],
                                    &out[3], &out[4]);
    if (r == 9) {
        Trap(out[0] == 1 && out[4] == 5);
        return;
    }
    Trap(r == 0 && out[2] == 0 && out[1] < 8 && (out[4] == 56 || out[4] == 72) && out[3] == out[4]);
}

void Init(vorcal::fuzz::Input &in)
{
    const uint32_t uRate = in.U32();
    const uint32_t uChannels = in.Byte();
    const size_t n = in.RestSize() < 64 ? 0 : 64; // trailing bytes drive the channel elements
    std::vector<uint8_t> buf(in.Rest(), in.Rest() + (in.RestSize() - n));
    const uint8_t *pTail = in.Rest() + buf.size();
    buf.resize(buf.size() + kAdifSlack, 0);
    VrAACSBRInfo(nullptr, 0, nullptr, nullptr, nullptr, nullptr, nullptr); // reset hhDecoder
    uint32_t rate = uRate, channels = uChannels, samples = 0, sbr = 1, aligned = 0, header = 0;
    Trap(VrAACDecInitOnlyParsing(hDecoder, buf.data(), &rate, &channels, &samples, &sbr, &aligned, &header) == 0);
    Trap(sbr == 0 && aligned >= header && aligned - header < 8 && samples == channels << 10);
    Trap(hDecoder->Bits.pCurrent <= buf.data() + buf.size() - 4);
    for (size_t i = 0; i < n; ++i) {
        const uint8_t b = pTail[i];
        const int32_t ch = chn_configOnlyParsing(hDecoder, b & 3, (b >> 2) & 15, b >> 7, &hDecoder->MCInfo);
        Trap(ch >= -1 && ch < VR_AAC_CHANNELS_OnlyParsing);
    }
    int16_t vector[128];
    int16_t exponent = 0;
    int32_t seed = static_cast<int32_t>(uRate);
    gen_rand_vectorOnlyParsing(vector, &exponent, uChannels % 129, &seed);
    Trap(exponent == -100 || (exponent >= -30 && exponent <= -15));
}

void Type(vorcal::fuzz::Input &in)
{
    const uint8_t pick = in.Byte();
    const int32_t rate = static_cast<int32_t>(in.U32());
    const uint32_t channels = in.Byte() % 9;
    const uint32_t otis[4] = {0x40, 0x41, 0xD0, in.U32()};
    CALCodec codec{};
    codec.m_uCodecObjectTypeIndication = otis[pick & 3];
    const uint32_t before = codec.m_uCodecObjectTypeIndication;
    vorcal::fuzz::FailAllocation((pick >> 2) & 1);
    const size_t live = vorcal::fuzz::LiveBlocks();
    // An exact-size copy, so that the sanitizers see any read beyond the caller's frame.
    std::vector<uint8_t> frame(in.Rest(), in.Rest() + in.RestSize());
    const uint32_t r = vorCALTools_GetAACType(&codec, rate, channels, frame.empty() ? nullptr : frame.data(),
                                              static_cast<uint32_t>(frame.size()));
    vorcal::fuzz::FailAllocation(0);
    Trap(vorcal::fuzz::LiveBlocks() == live);
    if ((before != 0x40 && before != 0x41) || frame.empty())
        Trap(r == before && codec.m_uCodecObjectTypeIndication == before);
    else if (r == 0xFFFFFFFF)
        Trap(codec.m_uCodecObjectTypeIndication == before);
    else
        Trap(r == 0x40 && codec.m_uCodecObjectTypeIndication == 0x40);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    switch (in.Byte() % 3) {
    case 0: Detect(in); break;
    case 1: Init(in); break;
    default: Type(in); break;
    }
    return 0;
}
