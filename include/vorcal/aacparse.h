/*
 * vorcal/aacparse.h - the parse-only AAC decoder: bit reader, state record, stream headers,
 * SBR extension parsing and the detection entry VrAACSBRInfo.
 */
#ifndef VORCAL_AACPARSE_H
#define VORCAL_AACPARSE_H

#include <stdint.h>

#ifndef VORCAL_API
#if defined(__GNUC__)
#define VORCAL_API __attribute__((visibility("default")))
#else
#define VORCAL_API
#endif
#endif

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



#ifdef __cplusplus
}
#endif

#endif /* VORCAL_AACPARSE_H */
