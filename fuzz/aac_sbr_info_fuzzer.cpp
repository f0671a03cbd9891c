// The parse-only decoder's entries on arbitrary bytes. The first byte picks the entry:
//  0: VrAACSBRInfo on the rest, copied into a buffer of at least the 11 bytes a header parse
//     reads;
//  1: VrAACDecInitOnlyParsing on the rest (ADIF, ADTS or headerless) behind the slack an ADIF
//     header can need, then channel elements through chn_configOnlyParsing and a noise band;
//  2: vorCALTools_GetAACType through a codec instance (rate, channels, OTI and an allocation
//     failure taken from the input), checking results and that nothing leaks.
#include <cstddef>
#include <cstdint>
#include <vector>

#include <vorcal/aacparse.h>
#include <vorcal/audio_tools.h>
#include <vorcal/wrapper.h>

#include "fuzz_sal.hpp"

namespace {

void TrapUnless(bool ok) { if (!ok) __builtin_trap(); }

void Detect(vorcal::fuzz::Input &in)
{
    std::vector<uint8_t> buf(in.Rest(), in.Rest() + in.RestSize());
    buf.resize(buf.size() < 11 ? 11 : buf.size(), 0);
    uint32_t o[5] = {1, 2, 3, 4, 5};
    const uint32_t r = VrAACSBRInfo(buf.data(), uint32_t(buf.size()), &o[0], &o[1], &o[2], &o[3], &o[4]);
    TrapUnless(r == 9 ? o[0] == 1 && o[4] == 5 : r == 0 && o[2] == 0 && o[1] < 8 && (o[4] == 56 || o[4] == 72) && o[3] == o[4]);
}

void Init(vorcal::fuzz::Input &in)
{
    const uint32_t uRate = in.U32(), uChannels = in.Byte();
    const size_t n = in.RestSize() < 64 ? 0 : 64; // trailing bytes drive the channel elements
    std::vector<uint8_t> buf(in.Rest(), in.Rest() + (in.RestSize() - n));
    const uint8_t *pTail = in.Rest() + buf.size();
    // adif_header with 16 program_config_elements of the largest size, and the 4-byte lookahead.
    buf.resize(buf.size() + 4950, 0);
    VrAACSBRInfo(nullptr, 0, nullptr, nullptr, nullptr, nullptr, nullptr); // reset hhDecoder
    uint32_t rate = uRate, channels = uChannels, samples = 0, sbr = 1, aligned = 0, header = 0;
    TrapUnless(VrAACDecInitOnlyParsing(hDecoder, buf.data(), &rate, &channels, &samples, &sbr, &aligned, &header) == 0);
    TrapUnless(sbr == 0 && aligned >= header && aligned - header < 8 && samples == channels << 10);
    TrapUnless(hDecoder->Bits.pCurrent <= buf.data() + buf.size() - 4);
    for (size_t i = 0; i < n; ++i) {
        const int32_t ch = chn_configOnlyParsing(hDecoder, pTail[i] & 3, (pTail[i] >> 2) & 15, pTail[i] >> 7, &hDecoder->MCInfo);
        TrapUnless(ch >= -1 && ch < VR_AAC_CHANNELS_OnlyParsing);
    }
    int16_t vector[128], exponent = 0;
    int32_t seed = int32_t(uRate);
    gen_rand_vectorOnlyParsing(vector, &exponent, int32_t(uChannels % 129), &seed);
    TrapUnless(exponent == -100 || (exponent >= -30 && exponent <= -15));
}

void Type(vorcal::fuzz::Input &in)
{
    const uint8_t pick = in.Byte();
    const auto rate = int32_t(in.U32());
    const uint32_t channels = in.Byte() % 9, otis[4] = {0x40, 0x41, 0xD0, in.U32()}, before = otis[pick & 3];
    CALCodec codec{};
    codec.m_uCodecObjectTypeIndication = before;
    vorcal::fuzz::FailAllocation((pick >> 2) & 1);
    const size_t live = vorcal::fuzz::LiveBlocks();
    // An exact-size copy, so that the sanitizers see any read beyond the caller's frame.
    const std::vector<uint8_t> frame(in.Rest(), in.Rest() + in.RestSize());
    const uint32_t r = vorCALTools_GetAACType(&codec, rate, channels, frame.empty() ? nullptr : frame.data(), uint32_t(frame.size()));
    vorcal::fuzz::FailAllocation(0);
    TrapUnless(vorcal::fuzz::LiveBlocks() == live);
    // Only an AAC instance with a frame is detected: to 0x40, or refused and left as it was.
    const uint32_t after = codec.m_uCodecObjectTypeIndication;
    TrapUnless((before != 0x40 && before != 0x41) || frame.empty() ? r == before && after == before
                                                                   : (r == 0x40 || r == 0xFFFFFFFF) && after == (r == 0x40 ? 0x40 : before));
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    vorcal::fuzz::Input in(pData, uSize);
    const uint8_t entry = in.Byte() % 3;
    entry == 0 ? Detect(in) : entry == 1 ? Init(in) : Type(in);
    return 0;
}
