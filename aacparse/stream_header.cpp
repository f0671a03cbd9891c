// Stream headers of the parse-only decoder: header detection, adts_fixed_header and
// adts_variable_header (ISO/IEC 13818-7 6.2), adif_header (8.1.1) and program_config_element
// (8.1.2).
#include <cstring>

#include "aacparse/decoder.hpp"

namespace vorcal::aacparse {

int32_t AdtsHeader(VrAACDecoder_OnlyParsing &dec)
{
    VrBitReader_OnlyParsing &bits = dec.Bits;
    VrByteAlign_OnlyParsing(&bits);
    if (VrShowBits_OnlyParsing(&bits, 12) != aac::kAdtsSyncword) {
        VrFlushBits_OnlyParsing(&bits, 8); // one resynchronisation attempt, a byte further on
        if (VrShowBits_OnlyParsing(&bits, 12) != aac::kAdtsSyncword)
            return -1;
    }
    VrFlushBits_OnlyParsing(&bits, 12);

    VrADTSHeader_OnlyParsing &h = dec.ADTS;
    if (!dec.uFixedHeaderKnown) {
        h.uId = Bits(dec, 1);
        dec.uMPEG4 = 1 - h.uId;
        h.uLayer = Bits(dec, 2);
        h.uProtectionAbsent = Bits(dec, 1);
        h.uProfile = Bits(dec, 2);
        dec.MCInfo.uProfile = h.uProfile;
        h.uSampleRateIdx = Bits(dec, 4);
        dec.MCInfo.uSampleRateIdx = h.uSampleRateIdx;
        h.uPrivateBit = Bits(dec, 1);
        h.uChannelConfig = Bits(dec, 3);
        h.uOriginalCopy = Bits(dec, 1);
        h.uHome = Bits(dec, 1);
    } else {
        // CONTRACT: skips 16 bits, 18 for MPEG-4, although the fixed header after the sync
        // word is 16 bits either way (the flag is never set here).
        VrFlushBits_OnlyParsing(&bits, 16);
        if (h.uId == 0)
            VrFlushBits_OnlyParsing(&bits, 2);
    }
    h.uCopyrightIdBit = Bits(dec, 1);
    h.uCopyrightIdStart = Bits(dec, 1);
    h.uFrameLength = Bits(dec, 13);
    h.uBufferFullness = Bits(dec, 11);
    h.uRawDataBlocks = Bits(dec, 2);
    if (h.uProtectionAbsent == 0)
        Bits(dec, 16); // crc_check
    return 0;
}

int32_t ProgramConfig(VrAACDecoder_OnlyParsing &dec)
{
    VrProgramConfig_OnlyParsing pce{};
    pce.uTag = Bits(dec, 4);
    pce.uProfile = Bits(dec, 2);
    pce.uSampleRateIdx = Bits(dec, 4);
    dec.MCInfo.uSampleRateIdx = pce.uSampleRateIdx;
    pce.uFront = Bits(dec, 4);
    pce.uSide = Bits(dec, 4);
    pce.uBack = Bits(dec, 4);
    pce.uLFE = Bits(dec, 2);
    pce.uAssocData = Bits(dec, 3);
    pce.uCoupling = Bits(dec, 4);
    if ((pce.uMonoMixdown = Bits(dec, 1)) != 0)
        pce.uMonoMixdownElement = Bits(dec, 4);
    if ((pce.uStereoMixdown = Bits(dec, 1)) != 0)
        pce.uStereoMixdownElement = Bits(dec, 4);
    if ((pce.uMatrixMixdown = Bits(dec, 1)) != 0) {
        pce.uMatrixMixdownIdx = Bits(dec, 2);
        pce.uPseudoSurround = Bits(dec, 1);
    }
    for (uint32_t i = 0; i < pce.uFront; ++i) {
        pce.uFrontIsCPE[i] = Bits(dec, 1);
        pce.uFrontTag[i] = Bits(dec, 4);
    }
    for (uint32_t i = 0; i < pce.uSide; ++i) {
        pce.uSideIsCPE[i] = Bits(dec, 1);
        pce.uSideTag[i] = Bits(dec, 4);
    }
    for (uint32_t i = 0; i < pce.uBack; ++i) {
        pce.uBackIsCPE[i] = Bits(dec, 1);
        pce.uBackTag[i] = Bits(dec, 4);
    }
    for (uint32_t i = 0; i < pce.uLFE; ++i)
        pce.uLFETag[i] = Bits(dec, 4);
    for (uint32_t i = 0; i < pce.uAssocData; ++i)
        pce.uAssocDataTag[i] = Bits(dec, 4);
    for (uint32_t i = 0; i < pce.uCoupling; ++i) {
        pce.uCouplingIndSw[i] = Bits(dec, 1);
        pce.uCouplingTag[i] = Bits(dec, 4);
    }
    VrByteAlign_OnlyParsing(&dec.Bits);
    const uint32_t uCommentBytes = Bits(dec, 8);
    for (uint32_t i = 0; i < uCommentBytes; ++i)
        pce.uComment[i] = static_cast<uint8_t>(Bits(dec, 8));
    pce.uComment[uCommentBytes] = 0;

    const int32_t iTag = static_cast<int32_t>(pce.uTag);
    if (dec.iSelectedTag == -1) {
        dec.iSelectedTag = iTag;
    } else if (dec.iSelectedTag != iTag) {
        if (dec.uReportedChannels == 0)
            dec.uReportedChannels = dec.MCInfo.uChannels;
        return iTag; // another program: read past, not entered
    }
    dec.iConfiguredChannels = EnterMCInfo(dec, dec.MCInfo, pce);
    if (dec.iConfiguredChannels < 0)
        return -1;
    dec.uImplicitConfig = 0;
    if (dec.uReportedChannels == 0)
        dec.uReportedChannels = dec.MCInfo.uChannels;
    return iTag;
}

namespace {

int32_t AdifHeader(VrAACDecoder_OnlyParsing &dec)
{
    VrADIFHeader_OnlyParsing &h = dec.ADIF;
    for (int i = 0; i < 4; ++i)
        h.uAdifId[i] = static_cast<uint8_t>(Bits(dec, 8));
    h.uAdifId[4] = 0;
    if ((h.uCopyrightIdPresent = Bits(dec, 1)) != 0) {
        for (int i = 0; i < 9; ++i)
            h.uCopyrightId[i] = static_cast<uint8_t>(Bits(dec, 8));
        h.uCopyrightId[9] = 0;
    }
    h.uOriginalCopy = Bits(dec, 1);
    h.uHome = Bits(dec, 1);
    h.uBitstreamType = Bits(dec, 1);
    h.uBitrate = Bits(dec, 23);
    const uint32_t uElements = Bits(dec, 4) + 1; // num_program_config_elements + 1
    uint32_t uCounted = 0;
    for (uint32_t i = 0; i < uElements; ++i) {
        if (h.uBitstreamType == 0)
            VrFlushBits_OnlyParsing(&dec.Bits, 20); // adif_buffer_fullness
        if (ProgramConfig(dec) == dec.iSelectedTag)
            ++uCounted;
    }
    return uCounted ? 1 : -1;
}

int32_t DecInit(VrAACDecoder_OnlyParsing &dec, const uint8_t *pBuffer, uint32_t &uSampleRate,
                uint32_t &uChannels, uint32_t &uFrameSamples, uint32_t &uSBR,
                uint32_t &uBitsAligned, uint32_t &uHeaderBits)
{
    VrBitReader_OnlyParsing &bits = dec.Bits;
    uSBR = 0;
    uHeaderBits = 0;
    VrInitBits_OnlyParsing(&bits, pBuffer);
    VrBookMark_OnlyParsing(&bits, 1);
    uint8_t uId[4];
    for (uint8_t &b : uId)
        b = static_cast<uint8_t>(Bits(dec, 8));

    if (std::memcmp(uId, "ADIF", 4) == 0) {
        dec.iConfiguredChannels = 2;
        dec.uADIF = 1;
        VrBookMark_OnlyParsing(&bits, 0);
        VrBookMark_OnlyParsing(&bits, 1);
        AdifHeader(dec);
        uHeaderBits = VrGetProcessedBits_OnlyParsing(&bits);
        uSampleRate = aac::RateOfIndex(dec.MCInfo.uSampleRateIdx);
        dec.uReportedChannels = static_cast<uint32_t>(dec.iConfiguredChannels);
    } else if (aac::IsAdtsSync(pBuffer)) {
        dec.uADIF = 0;
        dec.uADTS = 1;
        VrInitBits_OnlyParsing(&bits, pBuffer);
        VrBookMark_OnlyParsing(&bits, 0);
        VrBookMark_OnlyParsing(&bits, 1);
        AdtsHeader(dec);
        uHeaderBits = VrGetProcessedBits_OnlyParsing(&bits);
        uSampleRate = aac::RateOfIndex(dec.MCInfo.uSampleRateIdx);
        dec.uReportedChannels = dec.ADTS.uChannelConfig;
    } else {
        // Headerless: the caller's rate and channel count describe the stream.
        dec.uADIF = 0;
        dec.uADTS = 0;
        VrInitBits_OnlyParsing(&bits, pBuffer);
        dec.MCInfo.uSampleRateIdx = get_samplerate_idxOnlyParsing(uSampleRate);
        dec.uReportedChannels = uChannels;
    }
    uChannels = dec.uReportedChannels;
    uFrameSamples = dec.uReportedChannels << 10;
    InfoInit(dec, RateRow(dec.MCInfo.uSampleRateIdx));
    dec.pWindowInfo[VR_ONLY_LONG_SEQUENCE_OnlyParsing] = &dec.LongInfo;
    dec.pWindowInfo[VR_LONG_START_SEQUENCE_OnlyParsing] = &dec.LongInfo;
    dec.pWindowInfo[VR_EIGHT_SHORT_SEQUENCE_OnlyParsing] = &dec.ShortInfo;
    dec.pWindowInfo[VR_LONG_STOP_SEQUENCE_OnlyParsing] = &dec.LongInfo;
    VrByteAlign_OnlyParsing(&bits);
    uBitsAligned = VrGetProcessedBits_OnlyParsing(&bits);
    return 0;
}

} // namespace
} // namespace vorcal::aacparse

using namespace vorcal::aacparse;

extern "C" int32_t VrAACDecInitOnlyParsing(VrAACDecoder_OnlyParsing *pDec, const uint8_t *pBuffer,
                                           uint32_t *puSampleRate, uint32_t *puChannels,
                                           uint32_t *puFrameSamples, uint32_t *puSBR,
                                           uint32_t *puBitsAligned, uint32_t *puHeaderBits)
{
    return DecInit(*pDec, pBuffer, *puSampleRate, *puChannels, *puFrameSamples, *puSBR,
                   *puBitsAligned, *puHeaderBits);
}

extern "C" int32_t get_adts_headerOnlyParsing(VrAACDecoder_OnlyParsing *pDec)
{
    return AdtsHeader(*pDec);
}

extern "C" int32_t VrGet_ADIF_Header_OnlyParsing(VrAACDecoder_OnlyParsing *pDec)
{
    return AdifHeader(*pDec);
}

extern "C" int32_t VrGet_ProgamConfig_OnlyParsing(VrAACDecoder_OnlyParsing *pDec)
{
    return ProgramConfig(*pDec);
}
