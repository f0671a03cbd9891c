/*
 * vorcal/aacparse.h - the parse-only AAC decoder: bit reader, state record, stream headers,
 * raw data block syntax, a reentrant whole-frame parser, SBR extension parsing and the
 * detection entry VrAACSBRInfo.
 */
#ifndef VORCAL_AACPARSE_H
#define VORCAL_AACPARSE_H

#include <stdint.h>

#include <vorcal/export.h>

#ifdef __cplusplus
extern "C" {
#endif

/* ------------------------------------------------------------------------------------------
 * Parse-only bit reader.
 *
 * Reads MSB first and never checks an end of data: a wide read touches the current byte and
 * the three after it, a narrow read two bytes, a single-bit read one. Callers pass buffers with
 * slack behind what they parse.
 * ---------------------------------------------------------------------------------------- */

typedef struct VrBitReader_OnlyParsing {
    const uint8_t *pCurrent;      /* the byte that holds the next unread bit */
    uint32_t uBitPos;             /* 0-7: bits of the current byte already consumed */
    uint32_t uProcessedBits;      /* bits consumed since initialisation (or the restored bookmark) */
    const uint8_t *pSavedCurrent; /* bookmark */
    uint32_t uSavedBitPos;
    uint32_t uSavedProcessedBits;
    uint32_t uBookmarkSet;        /* 1 after a save, 0 after a restore or initialisation */
} VrBitReader_OnlyParsing;

/* Starts reading at pBuffer; the bookmark copy is left as it was. */
VORCAL_API void VrInitBits_OnlyParsing(VrBitReader_OnlyParsing *pBits, const uint8_t *pBuffer);
/* The next n bits (exact for n <= 32 - bit position, so 25 bits always); 0 when out of range. */
VORCAL_API uint32_t VrShowBits_OnlyParsing(VrBitReader_OnlyParsing *pBits, uint32_t n);
/* As VrShowBits_OnlyParsing, then advances by n. */
VORCAL_API uint32_t VrGetBits_OnlyParsing(VrBitReader_OnlyParsing *pBits, uint32_t n);
/* Advances by n bits without reading. */
VORCAL_API void VrFlushBits_OnlyParsing(VrBitReader_OnlyParsing *pBits, uint32_t n);
/* The next n bits from two bytes (exact for n <= 8), then advances by n (exact for any n). */
VORCAL_API uint32_t VrGetBitsFast_OnlyParsing(VrBitReader_OnlyParsing *pBits, uint32_t n);
/* One bit. */
VORCAL_API uint32_t VrGet1Bit_OnlyParsing(VrBitReader_OnlyParsing *pBits);
/* uSet != 0 saves the position (and processed-bit count), 0 restores it. */
VORCAL_API void VrBookMark_OnlyParsing(VrBitReader_OnlyParsing *pBits, uint32_t uSet);
/* Bits consumed. */
VORCAL_API uint32_t VrGetProcessedBits_OnlyParsing(VrBitReader_OnlyParsing *pBits);
/* Skips to the next byte boundary one bit at a time; returns the bits skipped (0-7). */
VORCAL_API int32_t VrByteAlign_OnlyParsing(VrBitReader_OnlyParsing *pBits);

/* ------------------------------------------------------------------------------------------
 * Decoder state, initialisation and stream headers.
 * ---------------------------------------------------------------------------------------- */

/* sampling_frequency_index of a rate in Hz (every unknown rate, 44100 included, gives 4). */
VORCAL_API uint32_t get_samplerate_idxOnlyParsing(uint32_t uSampleRate);

#define VR_AAC_CHANNELS_OnlyParsing 2        /* channel records in the channel map */
#define VR_AAC_COUPLING_TAGS_OnlyParsing 16  /* coupling channel element tags kept */
#define VR_AAC_MAX_BANDS_OnlyParsing 128     /* scale factor bands over one block (8 x 16) */
#define VR_AAC_MAX_SECTIONS_OnlyParsing 129  /* sections per channel (8 windows x 16, plus 1) */
#define VR_AAC_MAX_WINDOWS_OnlyParsing 8     /* windows of an EIGHT_SHORT_SEQUENCE */
#define VR_AAC_MAX_TNS_FILTERS_OnlyParsing 3 /* n_filt of a long window (2 bits) */
#define VR_AAC_MAX_TNS_ORDER_OnlyParsing 31  /* order of a long-window filter (5 bits) */
#define VR_AAC_MAX_PULSES_OnlyParsing 4      /* number_pulse + 1 */
#define VR_AAC_FRAME_LINES_OnlyParsing 1024  /* spectral lines of one block */

/* window_sequence values (ISO/IEC 13818-7 8.3.1), the index of the window-information pointers. */
#define VR_ONLY_LONG_SEQUENCE_OnlyParsing 0
#define VR_LONG_START_SEQUENCE_OnlyParsing 1
#define VR_EIGHT_SHORT_SEQUENCE_OnlyParsing 2
#define VR_LONG_STOP_SEQUENCE_OnlyParsing 3

/* One channel of the channel map. */
typedef struct VrChannelInfo_OnlyParsing {
    uint32_t uPresent;
    uint32_t uTag;               /* element_instance_tag */
    uint32_t uPairFlag;          /* 1: the channel belongs to a channel pair element */
    uint32_t uCommonWindow;      /* common_window of its channel pair element */
    uint32_t uLeftFlag;          /* 1: left channel of a pair */
    int32_t iPartner;            /* the other channel of the pair */
    int32_t iWindowInfoChannel;  /* the channel whose ics_info this channel uses */
} VrChannelInfo_OnlyParsing;

/* The channel map a program config element (or the implicit configuration) builds. */
typedef struct VrMCInfo_OnlyParsing {
    uint32_t uChannels;          /* channels mapped */
    uint32_t uFrontSCE;          /* front single channel elements before the first pair */
    uint32_t uFront;
    uint32_t uSide;
    uint32_t uBack;
    uint32_t uLFE;
    uint32_t uCoupling;          /* coupling channel elements */
    int32_t iCouplingTags[VR_AAC_COUPLING_TAGS_OnlyParsing];
    uint32_t uProfile;           /* current profile */
    uint32_t uSampleRateIdx;     /* current sampling_frequency_index */
    VrChannelInfo_OnlyParsing Channel[VR_AAC_CHANNELS_OnlyParsing];
} VrMCInfo_OnlyParsing;

/* What VrCheck_MC_Info_OnlyParsing saves of one channel. */
typedef struct VrSavedChannel_OnlyParsing {
    uint32_t uPresent;
    uint32_t uPairFlag;
    uint32_t uLeftFlag;
    int32_t iPartner;
} VrSavedChannel_OnlyParsing;

/* Band layout of one window shape (long or short) at the current sampling rate. */
typedef struct VrWindowInfo_OnlyParsing {
    uint32_t uLongFlag;
    uint32_t uWindowsPerBlock;
    uint32_t uBinsPerBlock;
    uint32_t uBandsPerBlock;
    uint32_t uBinsPerWindow;
    uint32_t uBandsPerWindow;
    uint32_t uSectionBits;                /* bits of one sect_len piece */
    const uint16_t *puBandTops;           /* band end offsets of one window */
    const uint16_t *puShortBandWidths;    /* sfbwidth128OnlyParsing, or null (long) */
    uint16_t uBlockBandTops[VR_AAC_MAX_BANDS_OnlyParsing]; /* band ends over the whole block */
    uint32_t uGroups;
    uint16_t uGroupLengths[VR_AAC_MAX_WINDOWS_OnlyParsing];
    uint32_t uGroupOffsets[VR_AAC_MAX_WINDOWS_OnlyParsing];
} VrWindowInfo_OnlyParsing;

/* adif_header fields (ISO/IEC 13818-7 8.1.1). */
typedef struct VrADIFHeader_OnlyParsing {
    uint8_t uAdifId[5];            /* "ADIF" and a terminating 0 */
    uint32_t uCopyrightIdPresent;
    uint8_t uCopyrightId[10];      /* nine bytes and a terminating 0 */
    uint32_t uOriginalCopy;
    uint32_t uHome;
    uint32_t uBitstreamType;
    uint32_t uBitrate;
} VrADIFHeader_OnlyParsing;

/* adts_fixed_header and adts_variable_header fields (ISO/IEC 13818-7 6.2), stream order. */
typedef struct VrADTSHeader_OnlyParsing {
    uint32_t uId;
    uint32_t uLayer;
    uint32_t uProtectionAbsent;
    uint32_t uProfile;
    uint32_t uSampleRateIdx;
    uint32_t uPrivateBit;
    uint32_t uChannelConfig;
    uint32_t uOriginalCopy;
    uint32_t uHome;
    uint32_t uCopyrightIdBit;
    uint32_t uCopyrightIdStart;
    uint32_t uFrameLength;
    uint32_t uBufferFullness;
    uint32_t uRawDataBlocks;      /* number_of_raw_data_blocks_in_frame */
} VrADTSHeader_OnlyParsing;

/* One section of section_data. */
typedef struct VrSection_OnlyParsing {
    uint32_t uCodebook;
    uint32_t uEndBand;
} VrSection_OnlyParsing;

/* Individual channel stream side information of one channel. */
typedef struct VrICS_OnlyParsing {
    uint8_t uBandCodebook[VR_AAC_MAX_BANDS_OnlyParsing]; /* codebook of every band of the block */
    VrSection_OnlyParsing Section[VR_AAC_MAX_SECTIONS_OnlyParsing];
    uint32_t uSections;           /* 0 marks a section error */
    uint32_t uWindowSequence;
    uint8_t uWindowShape;
    uint32_t uMaxSfb;
    uint8_t uGroupEnds[VR_AAC_MAX_WINDOWS_OnlyParsing];
} VrICS_OnlyParsing;

/* One tns_data filter. */
typedef struct VrTNSFilter_OnlyParsing {
    uint32_t uLength;
    uint32_t uOrder;
    uint32_t uDirection;
    uint32_t uCoefCompress;
    int16_t iCoef[VR_AAC_MAX_TNS_ORDER_OnlyParsing];
} VrTNSFilter_OnlyParsing;

typedef struct VrTNSWindow_OnlyParsing {
    uint32_t uFilters;            /* n_filt */
    uint32_t uCoefRes;
    VrTNSFilter_OnlyParsing Filter[VR_AAC_MAX_TNS_FILTERS_OnlyParsing];
} VrTNSWindow_OnlyParsing;

typedef struct VrTNSInfo_OnlyParsing {
    VrTNSWindow_OnlyParsing Window[VR_AAC_MAX_WINDOWS_OnlyParsing];
} VrTNSInfo_OnlyParsing;

/* pulse_data (ISO/IEC 13818-7 8.3.4). */
typedef struct VrPulseInfo_OnlyParsing {
    uint32_t uPulses;             /* number_pulse */
    uint32_t uStartSfb;           /* pulse_start_sfb */
    uint32_t uOffset[VR_AAC_MAX_PULSES_OnlyParsing];
    uint32_t uAmp[VR_AAC_MAX_PULSES_OnlyParsing];
} VrPulseInfo_OnlyParsing;

/* The decoder state record. */
typedef struct VrAACDecoder_OnlyParsing {
    uint32_t uMPEG4;              /* 1 - ADTS ID */
    uint32_t uFixedHeaderKnown;   /* skip the ADTS fixed header (never set here) */
    int32_t iConfiguredChannels;  /* -1 when the channel map refused the stream */
    uint32_t uReportedChannels;   /* the channel value VrAACDecInitOnlyParsing reports */
    VrBitReader_OnlyParsing Bits;
    uint32_t uADIF;
    uint32_t uADTS;
    VrADIFHeader_OnlyParsing ADIF;
    VrADTSHeader_OnlyParsing ADTS;
    VrMCInfo_OnlyParsing MCInfo;
    VrSavedChannel_OnlyParsing SavedChannel[VR_AAC_CHANNELS_OnlyParsing];
    uint32_t uImplicitConfig;     /* 1 until a program config element is entered */
    int32_t iSelectedTag;         /* element_instance_tag of the first program config element */
    uint32_t uImplicitCPE;        /* the implicit configuration met a channel pair element */
    VrWindowInfo_OnlyParsing ShortInfo;
    VrWindowInfo_OnlyParsing LongInfo;
    VrWindowInfo_OnlyParsing *pWindowInfo[4]; /* by window_sequence */

    /* Working area of the raw data block parsers. */
    VrICS_OnlyParsing ICS[VR_AAC_CHANNELS_OnlyParsing];
    int16_t iScaleFactors[VR_AAC_CHANNELS_OnlyParsing][VR_AAC_MAX_BANDS_OnlyParsing];
    int16_t iBandExponents[VR_AAC_CHANNELS_OnlyParsing][VR_AAC_MAX_BANDS_OnlyParsing];
    int16_t iSpectrum[VR_AAC_CHANNELS_OnlyParsing][VR_AAC_FRAME_LINES_OnlyParsing];
    int32_t iNoiseSeeds[VR_AAC_CHANNELS_OnlyParsing][VR_AAC_MAX_BANDS_OnlyParsing];
    uint8_t uMSMask[VR_AAC_MAX_BANDS_OnlyParsing];
    VrTNSInfo_OnlyParsing TNS[VR_AAC_CHANNELS_OnlyParsing];
    VrPulseInfo_OnlyParsing Pulse;
    uint32_t uPulsePresent;       /* pulse_data_present */
    int32_t iRandomSeed;          /* running seed of perceptual noise substitution */
    int16_t iElementExponent;     /* set to -100 by each channel element parser */
    uint32_t uResetOne[2];        /* the reset sets both to 1; no parser here reads them */
    uint8_t uResetZero[2];        /* the reset sets both to 0; no parser here reads them */
} VrAACDecoder_OnlyParsing;

/* One row of samp_rate_infoOnlyParsing. */
typedef struct VrSampRateInfo_OnlyParsing {
    uint32_t uSampleRate;
    uint32_t uLongBands;
    const uint16_t *puLongTops;
    uint32_t uShortBands;
    const uint16_t *puShortTops;
} VrSampRateInfo_OnlyParsing;

/* The state record of VrAACSBRInfo, and the pointer that call sets to it. Exported so that a
 * host can inspect the last detection between calls; every function below works on the record
 * it is given. Not thread-safe: see VrAACSBRInfo. */
VORCAL_API extern VrAACDecoder_OnlyParsing hhDecoder;
VORCAL_API extern VrAACDecoder_OnlyParsing *hDecoder;

/* Rates of sampling_frequency_index 0-11. Indices 12-15 have no rate (callers report 0 Hz). */
VORCAL_API extern const uint32_t VrTBL_SampleRates_OnlyParsing[12];
/* Per sampling_frequency_index: rate, long bands, long band ends, short bands, short band ends.
 * Rows 12-15 are zero. */
VORCAL_API extern const VrSampRateInfo_OnlyParsing samp_rate_infoOnlyParsing[16];
/* swb_offset_long_window / swb_offset_short_window band end offsets (no leading 0). */
VORCAL_API extern const uint16_t VrTBL_sfb_96_1024_OnlyParsing[41];
VORCAL_API extern const uint16_t VrTBL_sfb_96_128_OnlyParsing[12];
VORCAL_API extern const uint16_t VrTBL_sfb_64_1024_OnlyParsing[47];
VORCAL_API extern const uint16_t VrTBL_sfb_64_128_OnlyParsing[12];
VORCAL_API extern const uint16_t VrTBL_sfb_48_1024_OnlyParsing[49];
VORCAL_API extern const uint16_t VrTBL_sfb_48_128_OnlyParsing[14];
VORCAL_API extern const uint16_t VrTBL_sfb_32_1024_OnlyParsing[51];
VORCAL_API extern const uint16_t VrTBL_sfb_24_1024_OnlyParsing[47];
VORCAL_API extern const uint16_t VrTBL_sfb_24_128_OnlyParsing[15];
VORCAL_API extern const uint16_t VrTBL_sfb_16_1024_OnlyParsing[43];
VORCAL_API extern const uint16_t VrTBL_sfb_16_128_OnlyParsing[15];
VORCAL_API extern const uint16_t VrTBL_sfb_8_1024_OnlyParsing[40];
VORCAL_API extern const uint16_t VrTBL_sfb_8_128_OnlyParsing[15];
/* Short band widths, rewritten by every infoinitOnlyParsing. */
VORCAL_API extern uint16_t sfbwidth128OnlyParsing[16];
/* Noise scale of gen_rand_vectorOnlyParsing per band width w = 4, 8, ..., 96:
 * floor(32767 / sqrt(w / 4)), so that the energy sum of w samples (each sample^2 / 4) stays
 * below 2^30 and every sample fits 16 bits. */
VORCAL_API extern const uint16_t norm_tblOnlyParsing[24];

/* A parsed program_config_element, as VrEnter_MC_Info_OnlyParsing receives it. */
typedef struct VrProgramConfig_OnlyParsing {
    uint32_t uTag;
    uint32_t uProfile;
    uint32_t uSampleRateIdx;
    uint32_t uFront;
    uint32_t uSide;
    uint32_t uBack;
    uint32_t uLFE;
    uint32_t uAssocData;
    uint32_t uCoupling;           /* num_valid_cc_elements */
    uint32_t uMonoMixdown;        /* mono_mixdown_present */
    uint32_t uMonoMixdownElement;
    uint32_t uStereoMixdown;
    uint32_t uStereoMixdownElement;
    uint32_t uMatrixMixdown;      /* matrix_mixdown_idx_present */
    uint32_t uMatrixMixdownIdx;
    uint32_t uPseudoSurround;
    uint32_t uFrontIsCPE[16];
    uint32_t uFrontTag[16];
    uint32_t uSideIsCPE[16];
    uint32_t uSideTag[16];
    uint32_t uBackIsCPE[16];
    uint32_t uBackTag[16];
    uint32_t uLFETag[4];
    uint32_t uAssocDataTag[8];
    uint32_t uCouplingIndSw[16];
    uint32_t uCouplingTag[16];
    uint8_t uComment[257];        /* comment_field_data and a terminating 0 */
} VrProgramConfig_OnlyParsing;

/* Detects the stream header at pBuffer (ADIF, ADTS, or none), parses it and prepares the band
 * tables. *puSampleRate and *puChannels are read on the headerless path only. Returns 0.
 * Readable bytes needed: 7 headerless, 10 ADTS (11 with CRC); an adif_header with its program
 * config elements spans at most 4937 bytes, and the reader fetches 3 beyond. */
VORCAL_API int32_t VrAACDecInitOnlyParsing(VrAACDecoder_OnlyParsing *pDec, const uint8_t *pBuffer,
                                           uint32_t *puSampleRate, uint32_t *puChannels,
                                           uint32_t *puFrameSamples, uint32_t *puSBR,
                                           uint32_t *puBitsAligned, uint32_t *puHeaderBits);
/* One ADTS header at the reader's position: 0, or -1 without a sync word (after one retry).
 * The reader checks no end: from the byte it stands on (after aligning) 10 bytes must be
 * readable, 11 when the sync word is found one byte on, one more each with a CRC. */
VORCAL_API int32_t get_adts_headerOnlyParsing(VrAACDecoder_OnlyParsing *pDec);
/* adif_header and its program config elements: 1 when one with the selected tag was read, else -1. */
VORCAL_API int32_t VrGet_ADIF_Header_OnlyParsing(VrAACDecoder_OnlyParsing *pDec);
/* One program_config_element: its element_instance_tag, or -1 when the channel map refused it. */
VORCAL_API int32_t VrGet_ProgamConfig_OnlyParsing(VrAACDecoder_OnlyParsing *pDec);
/* Enters a program config element into the channel map: the channels entered plus the coupling
 * channel elements, or -1 (more than two front channels, side/back/LFE channels, any mixdown). */
VORCAL_API int32_t VrEnter_MC_Info_OnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrMCInfo_OnlyParsing *pMap,
                                               const VrProgramConfig_OnlyParsing *pPCE);
/* uCopy != 0 saves the mapped channels' attributes and returns 1; 0 compares: 1 equal, 0 not. */
VORCAL_API int32_t VrCheck_MC_Info_OnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrMCInfo_OnlyParsing *pMap,
                                               uint32_t uCopy);
/* Clears the channel map of the implicit configuration (no-op after a program config element). */
VORCAL_API void reset_mc_infoOnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrMCInfo_OnlyParsing *pMap);
/* Channel index of a channel element (uId 1: channel pair element), or -1. */
VORCAL_API int32_t chn_configOnlyParsing(VrAACDecoder_OnlyParsing *pDec, uint32_t uId, uint32_t uTag,
                                         uint32_t uCommonWindow, VrMCInfo_OnlyParsing *pMap);
/* infoinitOnlyParsing on the row of the current sampling_frequency_index. */
VORCAL_API void huffbookinitOnlyParsing(VrAACDecoder_OnlyParsing *pDec);
/* Fills both window information records and sfbwidth128OnlyParsing from one rate row. */
VORCAL_API void infoinitOnlyParsing(VrAACDecoder_OnlyParsing *pDec, const VrSampRateInfo_OnlyParsing *pRow);
/* Perceptual noise substitution: iLength normalised random samples, their block exponent and
 * the advanced seed. */
VORCAL_API void gen_rand_vectorOnlyParsing(int16_t *piVector, int16_t *piExponent, int32_t iLength,
                                           int32_t *piSeed);

/* ------------------------------------------------------------------------------------------
 * Raw data block syntax.
 *
 * The syntactic elements of a raw_data_block (ISO/IEC 13818-7 8.2, ISO/IEC 14496-3 4.4.2):
 * channel elements with their individual channel streams, fill elements with their extension
 * payloads, data stream elements. They read through the state's bit reader (no end bound: the
 * caller's buffer needs slack), keep what they parse in the state's working area and produce
 * no audio. Extension payloads are skipped whatever their type. Each returns an unsigned
 * 32-bit code; those without a result return 0. There is no loop over a raw data block here:
 * the caller reads id_syn_ele and dispatches (the whole-frame parser below does so).
 * ---------------------------------------------------------------------------------------- */

#define VR_AAC_SPECTRAL_LEVELS_OnlyParsing 11     /* levels per spectral codebook (codes of up to 16 bits) */
#define VR_AAC_SCALEFACTOR_LEVELS_OnlyParsing 14  /* levels of the scale factor codebook (up to 19 bits) */

/* One entry of a spectral codebook level: the quantised values of one codeword, w x y z for
 * codebooks 1-4, y z and two zero bytes for codebooks 5-11 (magnitudes in the unsigned books). */
typedef struct VrSpectralEntry_OnlyParsing {
    int8_t iValue[4];
} VrSpectralEntry_OnlyParsing;

/* The spectral codebooks 1-11 of ISO/IEC 13818-7 in levels, one row per codebook number (rows
 * 0 and 12 are empty): level 0 is a direct table of the next 6 bits holding every code of up
 * to 6 bits, level k (1-10) the codes of exactly 6 + k bits in code order (null without codes). */
VORCAL_API extern const VrSpectralEntry_OnlyParsing *const bookOnlyParsing[13][11];
/* Index of each level's last entry (0 for a level without codes). */
VORCAL_API extern const uint8_t CBsizeOnlyParsing[13][11];
/* Largest code value of each level, as a (6 + k)-bit number (level 0: its last 6-bit slot); a
 * level without codes holds ((previous + 1) << 1) - 1, which no code of its length reaches. */
VORCAL_API extern const uint16_t MaxValOnlyParsing[13][11];
/* The scale factor codebook in the same arrangement, 14 levels; each entry is the scale factor
 * index 0-120 (60: difference 0). */
VORCAL_API extern const uint8_t bookscl0OnlyParsing[60];
VORCAL_API extern const uint8_t bookscl1OnlyParsing[3];
VORCAL_API extern const uint8_t bookscl2OnlyParsing[5];
VORCAL_API extern const uint8_t bookscl3OnlyParsing[4];
VORCAL_API extern const uint8_t bookscl4OnlyParsing[6];
VORCAL_API extern const uint8_t bookscl5OnlyParsing[6];
VORCAL_API extern const uint8_t bookscl6OnlyParsing[6];
VORCAL_API extern const uint8_t bookscl7OnlyParsing[5];
VORCAL_API extern const uint8_t bookscl8OnlyParsing[8];
VORCAL_API extern const uint8_t bookscl9OnlyParsing[4];
VORCAL_API extern const uint8_t bookscl10OnlyParsing[7];
VORCAL_API extern const uint8_t bookscl11OnlyParsing[3];
VORCAL_API extern const uint8_t bookscl12OnlyParsing[7];
VORCAL_API extern const uint8_t bookscl13OnlyParsing[46];
VORCAL_API extern const uint8_t *const booksclOnlyParsing[14];
VORCAL_API extern const uint32_t CBsize_sclOnlyParsing[14];
VORCAL_API extern const uint32_t MaxVal_sclOnlyParsing[14];
/* Sign bit (0x2, 0x4, 0x8) and sign extension (0xFFFC, 0xFFF8, 0xFFF0) of a TNS coefficient of
 * 2, 3 or 4 bits. */
VORCAL_API extern const uint8_t sgn_maskOnlyParsing[3];
VORCAL_API extern const uint16_t neg_maskOnlyParsing[3];
/* Prediction bands (pred_max_bands) per sampling_frequency_index 0-11. */
VORCAL_API extern const uint32_t VrTBL_pred_max_bands_OnlyParsing[12];

/* single_channel_element(): 0; 3 no channel for its tag; 4 the channel stream failed. */
VORCAL_API uint32_t single_channel_elementOnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrMCInfo_OnlyParsing *pMap);
/* channel_pair_element(): 0; 5 no channel for its tag; 6 ics_info failed; 7 or 8 the first or
 * the second channel stream failed. */
VORCAL_API uint32_t channel_pair_elementOnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrMCInfo_OnlyParsing *pMap);
/* lfe_channel_element(): 1 on success (unlike the others); 0xFFFFFFFF (-1) no channel or the
 * channel stream failed. */
VORCAL_API uint32_t lfe_channel_elementOnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrMCInfo_OnlyParsing *pMap);
/* individual_channel_stream() of channel uChannel: 1, or 0 (no band information, section error,
 * bad scale factor, pulse data in a short window, gain control data). */
VORCAL_API uint32_t geticsOnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrICS_OnlyParsing *pICS, uint32_t uCommonWindow,
                                      uint32_t uChannel, uint32_t uFirstChannel, uint32_t uWindowInfoChannel);
/* ics_info(): 1, or 0 when the window sequence has no band information. */
VORCAL_API uint32_t get_ics_infoOnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrICS_OnlyParsing *pICS, uint32_t uChannel,
                                            uint32_t uWindowInfoChannel, uint32_t uCommonWindow);
/* section_data(); a section error (sections beyond max_sfb or the band count, or more than 129
 * sections) leaves the section count 0. Returns 0. */
VORCAL_API uint32_t section_dataOnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrICS_OnlyParsing *pICS, uint32_t uChannel,
                                            uint32_t uWindowInfoChannel);
/* scale_factor_data(): 1, or 0 for a reserved codebook (12) or a scale factor outside 0-255. */
VORCAL_API uint32_t scale_factor_dataOnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrICS_OnlyParsing *pICS,
                                                 uint32_t uChannel, uint32_t uGlobalGain);
/* spectral_data(), then the pulses of pulse_data when present. Returns 1. */
VORCAL_API uint32_t spectral_dataOnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrICS_OnlyParsing *pICS, uint32_t uChannel,
                                             uint32_t uFirstChannel);
/* ms_mask_present and the M/S mask; returns ms_mask_present. */
VORCAL_API uint32_t getmaskOnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrICS_OnlyParsing *pICS, uint32_t uChannel);
/* pulse_data(); returns the last value read (the last pulse_amp). */
VORCAL_API uint32_t get_pulse_ncOnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrPulseInfo_OnlyParsing *pPulse);
/* Adds the pulses to the stored spectral values of a channel. Returns 0. */
VORCAL_API uint32_t pulse_ncOnlyParsing(VrAACDecoder_OnlyParsing *pDec, uint32_t uChannel, const VrPulseInfo_OnlyParsing *pPulse);
/* tns_data(). Returns 1. */
VORCAL_API uint32_t get_tnsOnlyParsing(VrAACDecoder_OnlyParsing *pDec, VrICS_OnlyParsing *pICS, VrTNSInfo_OnlyParsing *pTNS);
/* No TNS filter in any window. Returns 0. */
VORCAL_API uint32_t clr_tnsOnlyParsing(VrICS_OnlyParsing *pICS, VrTNSInfo_OnlyParsing *pTNS);
/* For a value of +-16, reads an escape sequence and returns 2^(N+4) plus the N + 4 bits after
 * N leading ones, with the sign of iValue (as a signed value in the unsigned code); other
 * values come back unchanged. Any number of leading ones is read. */
VORCAL_API uint32_t getescapeOnlyParsing(VrAACDecoder_OnlyParsing *pDec, int32_t iValue);
/* fill_element(): the fill data of each payload goes to pBuffer (at most 268 bytes); returns
 * the last payload result. */
VORCAL_API uint32_t getfillOnlyParsing(VrAACDecoder_OnlyParsing *pDec, uint8_t *pBuffer);
/* One extension_payload() of uCount bytes: fill data (type 1) to pBuffer (uCount - 1 bytes, at
 * most 268), any other type skipped. Returns uCount. */
VORCAL_API uint32_t extension_payloadOnlyParsing(VrAACDecoder_OnlyParsing *pDec, uint32_t uCount, uint8_t *pBuffer);
/* data_stream_element(): tag and byte count out, the bytes to pBuffer (at most 510); returns
 * the last byte read (the last data byte, else the last count byte). */
VORCAL_API uint32_t getdataOnlyParsing(VrAACDecoder_OnlyParsing *pDec, uint32_t *puTag, uint32_t *puCount, uint8_t *pBuffer);
/* VrTBL_pred_max_bands_OnlyParsing at the current sampling_frequency_index (0 for 12-15). */
VORCAL_API uint32_t pred_max_bandsOnlyParsing(VrAACDecoder_OnlyParsing *pDec);

/* ------------------------------------------------------------------------------------------
 * Whole-frame parser.
 *
 * Walks every raw data block of a frame to its ID_END on a parser's own state (never
 * hhDecoder), so parsers on different threads never meet. Each parser is allocated once
 * through the system layer and a parse allocates nothing. The frame is read through a padded
 * copy: no byte outside the caller's frame is touched. SBR payloads in fill elements go to the
 * SBR parser with the parser's own SBR state (headers persist across frames); what it finds
 * counts while a valid SBR header is in force. The fill element's count decides where the walk
 * resumes.
 * ---------------------------------------------------------------------------------------- */

typedef struct CALAACParser CALAACParser; /* opaque: one decoder state record and a padded frame buffer */

typedef struct CALAACFrameInfo {
    uint32_t uSampleRate;      /* core sampling rate in Hz */
    uint32_t uChannels;        /* core channels (channel_configuration, or the AudioSpecificConfig's) */
    uint32_t uOutSampleRate;   /* uSampleRate * 2 when SBR was found, else uSampleRate */
    uint32_t uOutChannels;     /* 2 when parametric stereo was found, else uChannels */
    uint32_t uSBR;             /* 1: an SBR extension payload (type 13 or 14) with a valid SBR header in force */
    uint32_t uPS;              /* 1: SBR extended data carried parametric stereo (extension id 2) */
    uint32_t uFrameBytes;      /* bytes of the frame: aac_frame_length for ADTS, else the length passed */
    uint32_t uBits;            /* bits read from the first byte of the frame through the last ID_END */
    uint32_t auElements[8];    /* how many elements of each id_syn_ele (0 SCE ... 7 END) the frame held */
} CALAACFrameInfo;

/* Results of vorCALTools_AAC_ParseFrame. */
#define CAL_AAC_PARSE_OK 0          /* parsed to ID_END, ending exactly at the end of the frame */
#define CAL_AAC_PARSE_BAD_INPUT 1   /* bad arguments, no ADTS sync word, or an AudioSpecificConfig it cannot use */
#define CAL_AAC_PARSE_SHORT 2       /* the frame is shorter than its header says */
#define CAL_AAC_PARSE_REFUSED 3     /* an element was refused (see below) */
#define CAL_AAC_PARSE_OVERRUN 4     /* the syntax runs past the end of the frame */
#define CAL_AAC_PARSE_LEFTOVER 5    /* ID_END came before the end of the frame */

/* pASC null: frames are ADTS. Otherwise frames are raw access units described by this
 * AudioSpecificConfig (object type 1 or 2 with 1024-sample frames, also behind object type 5
 * or 29 or the 0x2B7 / 0x548 sync extensions, which signal SBR and parametric stereo before
 * any frame; an AudioSpecificConfig it cannot read makes every parse return
 * CAL_AAC_PARSE_BAD_INPUT). Null when the memory table fails. */
VORCAL_API CALAACParser *vorCALTools_AAC_CreateParser(const uint8_t *pASC, int32_t iASCLen);
/* Parses one frame (ADTS: aac_frame_length bytes from pFrame, which may hold more; otherwise
 * one access unit of iLen bytes, at most 8191) and fills *pInfo as far as the parse got.
 * Result CAL_AAC_PARSE_*; refused (3) are an unknown tag, a channel layout the channel map
 * refuses, a section error, pulse data in a short window, gain control data, and a coupling
 * channel element (which has no parser). */
VORCAL_API int32_t vorCALTools_AAC_ParseFrame(CALAACParser *hParser, const uint8_t *pFrame, int32_t iLen,
                                              CALAACFrameInfo *pInfo);
/* Frees a parser (null is ignored). */
VORCAL_API void vorCALTools_AAC_DestroyParser(CALAACParser *hParser);

/* ------------------------------------------------------------------------------------------
 * SBR extension parsing.
 *
 * sbr_extension_data, sbr_header and the SBR data of a single channel element (ISO/IEC
 * 14496-3 4.4.2.8, 4.5.2.8) with the frequency band tables of 4.6.18.3.2 in fixed point. The
 * state record belongs to the caller; sbrDecodeInitOnlyParsing starts it.
 * ---------------------------------------------------------------------------------------- */

#define VR_SBR_MAX_ENVELOPES 5
#define VR_SBR_MAX_NOISE_FLOORS 2
#define VR_SBR_MAX_NOISE_BANDS 5
#define VR_SBR_MAX_BANDS 64

typedef struct VrSBRState_OnlyParsing {
    uint32_t uSampleRate;    /* of the AAC core, in Hz */
    uint32_t uHeaderCount;   /* sbr_header()s read */
    uint8_t uSbrSeen;        /* 1 once a call has read bs_header_flag */
    int8_t iReset[2];        /* -1 after initialisation; nothing reads them */
    /* sbr_header() in stream order */
    uint8_t uAmpRes;
    uint8_t uStartFreq;
    uint8_t uStopFreq;
    uint8_t uXoverBand;
    uint8_t uFreqScale;
    uint8_t uAlterScale;
    uint8_t uNoiseBands;
    uint8_t uLimiterBands;
    uint8_t uLimiterGains;
    uint8_t uInterpolFreq;
    uint8_t uSmoothingMode;
    /* 1: borders count pairs of QMF time slots and the start offsets follow the rate;
     * 0: single time slots and start offsets from row 6 of qmf_channel_offsetOnlyParsing */
    uint8_t uTimeRate;
    uint8_t uAddHarmonicFlag;
    uint8_t uExtensionId;    /* bs_extension_id of the last extended data */
    /* sbr_grid() */
    uint8_t uFrameClass;     /* 0 FIXFIX, 1 FIXVAR, 2 VARFIX, 3 VARVAR */
    uint8_t uNumEnv;
    uint8_t uNumNoise;
    uint8_t uBorders[VR_SBR_MAX_ENVELOPES + 1];        /* envelope borders, QMF time slots */
    uint8_t uNoiseBorders[VR_SBR_MAX_NOISE_FLOORS + 1]; /* noise floor borders */
    uint8_t uPointer;
    uint8_t uFreqRes[VR_SBR_MAX_ENVELOPES];
    /* sbr_dtdf(), sbr_invf(), harmonics */
    uint8_t uDfEnv[VR_SBR_MAX_ENVELOPES];
    uint8_t uDfNoise[VR_SBR_MAX_NOISE_FLOORS];
    uint8_t uInvfMode[VR_SBR_MAX_NOISE_BANDS];
    uint8_t uAddHarmonic[VR_SBR_MAX_BANDS];
    /* frequency band tables (QMF band indices) and their band counts */
    uint8_t uMaster[VR_SBR_MAX_BANDS + 1];
    uint8_t uNumMaster;
    uint8_t uHigh[VR_SBR_MAX_BANDS + 1];
    uint8_t uNumHigh;
    uint8_t uLow[VR_SBR_MAX_BANDS / 2 + 1];
    uint8_t uNumLow;
    uint8_t uNoiseTable[VR_SBR_MAX_NOISE_BANDS + 1];
    uint8_t uNumNoiseBands;
    /* decoded envelope scale factors and noise floor levels */
    int16_t iEnvelope[VR_SBR_MAX_ENVELOPES][VR_SBR_MAX_BANDS];
    int16_t iNoise[VR_SBR_MAX_NOISE_FLOORS][VR_SBR_MAX_NOISE_BANDS];
    /* the last envelope and noise floor of the previous frame, the base of time deltas */
    int16_t iPrevEnvelope[VR_SBR_MAX_BANDS];
    int16_t iPrevNoise[VR_SBR_MAX_NOISE_BANDS];
    uint8_t uPrevFreqRes;
} VrSBRState_OnlyParsing;

/* Sets the sbr_header defaults (bs_amp_res 1, bs_start_freq 5, bs_freq_scale 2,
 * bs_alter_scale 1, bs_noise_bands 2, bs_limiter_bands 2, bs_limiter_gains 2,
 * bs_interpol_freq 1, bs_smoothing_mode 1), time rate 1, header count 0, and the core rate.
 * Fields it does not name keep their contents. The first argument is not used. */
VORCAL_API void sbrDecodeInitOnlyParsing(void *pUnused, VrSBRState_OnlyParsing *pSbr, uint32_t uSampleRate);
/* Parses one sbr_extension_data() whose 4-bit extension_type is still unread. uElementId is
 * the id_syn_ele of the element the SBR data belongs to. Result: 2 when single channel element
 * SBR data carried extended data with bs_extension_id 2 (parametric stereo); 1 without it, for
 * band tables beyond their limits (k2 - k0 above 32 from 48 kHz, 45 above 32 kHz, 48 otherwise;
 * or tables that leave the 64 QMF bands or exceed 5 noise bands) and for a channel pair element
 * (id 1), whose SBR data is not parsed; 0 for any other element id. */
VORCAL_API int32_t sbr_extension_dataOnlyParsing(VrBitReader_OnlyParsing *pBits, VrSBRState_OnlyParsing *pSbr,
                                                 uint32_t uElementId);

/* Decoding trees of node pairs {bit 0, bit 1}: an entry >= 0 is the next node, a negative entry
 * ends the code with the delta entry + 64. */
VORCAL_API extern const int32_t t_huffman_env_1_5dB_OnlyParsing[120][2];
VORCAL_API extern const int32_t f_huffman_env_1_5dB_OnlyParsing[120][2];
VORCAL_API extern const int32_t t_huffman_env_bal_1_5dB_OnlyParsing[48][2];
VORCAL_API extern const int32_t f_huffman_env_bal_1_5dB_OnlyParsing[48][2];
VORCAL_API extern const int32_t t_huffman_env_3_0dB_OnlyParsing[62][2];
VORCAL_API extern const int32_t f_huffman_env_3_0dB_OnlyParsing[62][2];
VORCAL_API extern const int32_t t_huffman_env_bal_3_0dB_OnlyParsing[24][2];
VORCAL_API extern const int32_t f_huffman_env_bal_3_0dB_OnlyParsing[24][2];
VORCAL_API extern const int32_t t_huffman_noise_3_0dB_OnlyParsing[62][2];
VORCAL_API extern const int32_t t_huffman_noise_bal_3_0dB_OnlyParsing[24][2];
/* Start-frequency offsets added to startMin, by bs_start_freq: rows for 16, 22.05, 24, 32,
 * 44.1-64 and above 64 kHz, and row 6 for single-rate time grids. */
VORCAL_API extern const int8_t qmf_channel_offsetOnlyParsing[7][16];
/* Stop bands for bs_stop_freq 0-13 by sampling_frequency_index 0-11, from stopMin up. */
VORCAL_API extern const uint8_t stopDk_t_tableOnlyParsing[12][14];

/* ------------------------------------------------------------------------------------------
 * Detection entry.
 * ---------------------------------------------------------------------------------------- */

/* Resets hhDecoder (hDecoder = &hhDecoder) and parses the ADTS header at buf. Returns 9 with
 * no output written for a null buffer or no 0xFFF sync; otherwise 0 with the rate in Hz (0 for
 * sampling_frequency_index 12-15), channel_configuration, SBR (always 0: the raw data block
 * is not read), and the bits of the header (56, 72 with CRC). len is not used: buf must hold
 * 10 readable bytes (11 with CRC). Works on one static state: callers on several threads must
 * serialise it (and vorCALTools_GetAACType, which calls it). */
VORCAL_API uint32_t VrAACSBRInfo(const uint8_t *buf, uint32_t len, uint32_t *pSampleRate, uint32_t *pChannels,
                                 uint32_t *pSBR, uint32_t *pBitsAligned, uint32_t *pHeaderBits);


#ifdef __cplusplus
}
#endif

#endif /* VORCAL_AACPARSE_H */
