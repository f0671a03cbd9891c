/*
 * vorcal/wrapper.h - the codec instance, the codec function table of each codec kind, the
 * property numbers and object type indications, and the wrappers through which the engine
 * drives a codec instance.
 *
 * Every wrapper returns -1 for a null instance without calling the codec, and otherwise the
 * codec's own result. A slot that the codec left null also answers -1. One thread at a time
 * may drive an instance.
 */
#ifndef VORCAL_WRAPPER_H
#define VORCAL_WRAPPER_H

#include <stdint.h>
#include <vorcal/core.h>

#ifdef __cplusplus
extern "C" {
#endif

/* The codec instance that vorCAL_GetCodec creates. */
typedef struct CALCodec {
    CALCodecFunc m_Functions[CAL_CODEC_FUNCTION_SLOTS]; /* copy of the registered table */
    CALParam m_uUserData;                 /* the codec's context, last argument of its slots */
    uint32_t m_uAMRFrameType;             /* frame type of the first AMR frame; an H.264 or HEVC
                                           * instance in the stream-aware mode keeps here the frame
                                           * framing taken from its configuration (CAL_AVC_FORMAT_*),
                                           * else 0 */
    uint32_t m_uCodecObjectTypeIndication;
    uint8_t *m_pSilenceFrame;             /* cached silence frame, owned by the instance */
    uint32_t m_uSilenceFrameLen;
    uint8_t *m_pIntermediateFrame;        /* converted H.264 or HEVC data; allocation is size + 100 */
    int32_t m_iIntermediateFrameSize;     /* payload capacity of m_pIntermediateFrame */
    uint32_t m_uH264NALSize;              /* NAL length size used for H.264 and HEVC conversion */
    CALHandle *m_hCAL;                    /* the handle whose dump slots are used */
} CALCodec;

/* Slot signatures. ud is the instance's current m_uUserData; ppUserData is &m_uUserData. */

/* Slot 0 of every kind but text: fills *puValue and returns 0 when it answers. */
typedef int32_t (*CALGetPropertyFunc)(uint32_t uProperty, uint32_t *puValue);
/* Deinit and Reset slots. */
typedef int32_t (*CALUserDataFunc)(CALParam ud);

typedef int32_t (*CALVideoDecoderInitFunc)(uint32_t uOTI, const uint8_t *pConfig, int32_t iConfigLen,
                                           const uint8_t *pConfigEnhance, int32_t iEnhLen,
                                           uint32_t uNALLengthSize, uint32_t *puWidth,
                                           uint32_t *puHeight, uint32_t *puPitch,
                                           CALParam *ppUserData);
typedef int32_t (*CALVideoDecoderDecodeFunc)(const uint8_t *pData, int32_t iLen, CALParam uParam3,
                                             CALParam uParam4, uint32_t *puDecodeResult,
                                             CALParam ud);
typedef int32_t (*CALVideoDecoderGetOutputFunc)(CALParam uParam1, CALParam uParam2, CALParam uParam3,
                                                CALParam uParam4, CALParam ud);

typedef int32_t (*CALAudioDecoderInitFunc)(CALParam uParam1, const uint8_t *pConfig, int32_t iConfigLen,
                                           const uint8_t *pFrame, uint32_t uFrameLen,
                                           uint32_t *puSamplingRate, uint32_t *puNumOfChannels,
                                           uint32_t *puBitsPerSample, uint32_t *puSamplesPerFrame,
                                           CALParam *ppUserData);
typedef int32_t (*CALAudioDecoderDecodeFunc)(const uint8_t *pData, int32_t iLen, CALParam uParam3,
                                             CALParam uParam4, CALParam uParam5, CALParam uParam6,
                                             CALParam ud);

typedef int32_t (*CALImageDecoderGetHeaderFunc)(CALParam uParam1, CALParam uParam2, CALParam uParam3,
                                                CALParam uParam4, CALParam uParam5, CALParam uParam6,
                                                CALParam uParam7, CALParam *ppUserData);
typedef int32_t (*CALImageDecoderDecodeFunc)(CALParam uParam1, CALParam uParam2, CALParam uParam3,
                                             CALParam uParam4, CALParam uParam5, CALParam uParam6,
                                             CALParam uParam7, CALParam uParam8, CALParam uParam9,
                                             CALParam uParam10, CALParam ud);

typedef int32_t (*CALTextDecoderInitFunc)(CALParam uParam1, CALParam uParam2, CALParam uParam3,
                                          CALParam *ppUserData);
typedef int32_t (*CALTextDecoderDecodeFunc)(const uint8_t *pData, int32_t iLen, CALParam uParam3,
                                            CALParam uParam4, CALParam uParam5, CALParam ud);
typedef int32_t (*CALTextDecoderGetOutputFunc)(CALParam uParam1, CALParam ud);

typedef int32_t (*CALVideoEncoderInitFunc)(CALParam uParam1, CALParam uParam2, CALParam uParam3,
                                           CALParam uParam4, CALParam uParam5, CALParam uParam6,
                                           CALParam uParam7, CALParam uParam8, CALParam uParam9,
                                           CALParam *ppUserData);
typedef int32_t (*CALVideoEncoderEncodeFunc)(CALParam uParam1, CALParam uParam2, CALParam uParam3,
                                             CALParam uParam4, CALParam uParam5, CALParam uParam6,
                                             CALParam ud);
typedef int32_t (*CALVideoEncoderSkipFunc)(CALParam uParam1, CALParam uParam2, CALParam ud);

/* Typed six-slot tables; each has the layout of CALCodecFunc[6] and can be passed to
 * vorCAL_RegisterCodec with its sizeof. Unused slots are never called. */
typedef struct CALVideoDecoderFunctions {
    CALGetPropertyFunc GetProperty;         /* slot 0 */
    CALVideoDecoderInitFunc Init;           /* slot 1 */
    CALUserDataFunc Deinit;                 /* slot 2 */
    CALVideoDecoderDecodeFunc Decode;       /* slot 3 */
    CALVideoDecoderGetOutputFunc GetOutput; /* slot 4 */
    CALUserDataFunc Reset;                  /* slot 5 */
} CALVideoDecoderFunctions;

typedef struct CALAudioDecoderFunctions {
    CALGetPropertyFunc GetProperty;   /* slot 0 */
    CALAudioDecoderInitFunc Init;     /* slot 1 */
    CALUserDataFunc Deinit;           /* slot 2 */
    CALAudioDecoderDecodeFunc Decode; /* slot 3 */
    CALUserDataFunc Reset;            /* slot 4 */
    CALCodecFunc pUnused5;
} CALAudioDecoderFunctions;

typedef struct CALImageDecoderFunctions {
    CALGetPropertyFunc GetProperty;         /* slot 0 */
    CALImageDecoderGetHeaderFunc GetHeader; /* slot 1 */
    CALImageDecoderDecodeFunc Decode;       /* slot 2 */
    CALCodecFunc pUnused3;
    CALCodecFunc pUnused4;
    CALCodecFunc pUnused5;
} CALImageDecoderFunctions;

typedef struct CALTextDecoderFunctions {
    CALCodecFunc pUnused0;
    CALTextDecoderInitFunc Init;           /* slot 1 */
    CALUserDataFunc Deinit;                /* slot 2 */
    CALTextDecoderDecodeFunc Decode;       /* slot 3 */
    CALTextDecoderGetOutputFunc GetOutput; /* slot 4 */
    CALCodecFunc pUnused5;
} CALTextDecoderFunctions;

typedef struct CALVideoEncoderFunctions {
    CALGetPropertyFunc GetProperty;   /* slot 0 */
    CALVideoEncoderInitFunc Init;     /* slot 1 */
    CALUserDataFunc Deinit;           /* slot 2 */
    CALVideoEncoderEncodeFunc Encode; /* slot 3 */
    CALVideoEncoderSkipFunc Skip;     /* slot 4 */
    CALCodecFunc pUnused5;
} CALVideoEncoderFunctions;

/* Property numbers the layer asks a codec for, with the answer that makes the layer act.
 * For HEVC (CAL_OTI_HEVC) properties 3, 81, 82, 83 and CAL_PROP_TRUST_CONFIGURATION mean what
 * they mean for H.264, with HEVC's tools: 3 writes the display size (conformance window applied)
 * of vorCALTools_HEVC_ParseSPS from any configuration; 82 converts an hvcC record to its units
 * behind start codes (2) or start-code parameter sets to an hvcC record with 4-byte lengths (1),
 * and converts the enhancement configuration like a frame; 81 converts frames (length-prefixed
 * output has 4-byte lengths); 83 = 0 removes the VPS/SPS/PPS/AUD/prefix SEI run in front of the
 * first slice (vorCALTools_HEVC_GetConfigStream) and everything before it. 84 is not asked. */
#define CAL_PROP_STREAM_PARAMETERS        3u   /* 1: the layer fills size or audio parameters */
#define CAL_PROP_H264_FRAME_FORMAT        81u  /* 1 length-prefixed, 2 Annex B frames wanted */
#define CAL_PROP_H264_CONFIG_FORMAT       82u  /* 1 or 2: framing wanted for the configuration */
#define CAL_PROP_H264_INBAND_PARAM_SETS   83u  /* 0: remove SPS/PPS carried inside frames */
#define CAL_PROP_H264_NO_MAIN_PROFILE     84u  /* 1: refuse Main-profile streams */
#define CAL_PROP_MPEG4_VOP_START          97u  /* 1: frames must start at their VOP start code */
#define CAL_PROP_MPEG4_NO_LEVEL3          101u /* 1: refuse MPEG-4 Visual level 3 */
#define CAL_PROP_MPEG4_NO_UNKNOWN_PROFILE 103u /* 1: refuse unrecognised profile and level */
#define CAL_PROP_AMR_FRAME_TYPE_LOCK      113u /* 1: lock the AMR frame type of the first frame */
#define CAL_PROP_AAC_SILENCE_FRAMES       114u /* 0: the codec takes no AAC silence frames */
#define CAL_PROP_H263_NO_EXTENDED_PTYPE   160u /* 1: refuse H.263 with extended picture type */
/* Asked at H.264 and HEVC Init. 1 turns on the stream-aware mode: the frame framing and NAL
 * length size come from the Init configuration (an AVC or HEVC decoder configuration record:
 * length-prefixed frames with its lengthSizeMinusOne + 1; start-code framing: start-code frames)
 * instead of the format test of each frame, for the parameter-set removal and the framing
 * conversion alike; for H.264 the picture size of property 3 is the display size of
 * vorCALTools_AVC_ParseSPS (also from a record). A configuration shorter than 4 bytes leaves the
 * framing to the format test. */
#define CAL_PROP_TRUST_CONFIGURATION      0x1000u

/* Codec object type indications the library branches on. */
#define CAL_OTI_MPEG4_VISUAL   0x20u
#define CAL_OTI_HEVC           0x23u /* ITU-T H.265, ISO/IEC 14496-1; video decoder Init and Decode */
#define CAL_OTI_AAC            0x40u
#define CAL_OTI_AAC_SBR        0x41u
#define CAL_OTI_MPEG2_AAC      0x67u
#define CAL_OTI_H263           0xC0u
#define CAL_OTI_H264           0xC1u
#define CAL_OTI_H263_FAMILY    0xC2u /* own picture header: 17-bit start code, 5-bit version */
#define CAL_OTI_AMR_NB         0xD0u
#define CAL_OTI_NB_SPEECH      0xD1u /* narrowband speech given AMR-NB stream parameters */
#define CAL_OTI_AMR_WB         0xD4u
#define CAL_OTI_INTRA_ONLY     0xDBu
#define CAL_OTI_DRA            0xE0u
#define CAL_OTI_MPEG4_VISUAL_2 0xF1u
#define CAL_OTI_MPEG12_VIDEO   0xF2u
#define CAL_OTI_WMV1           0x31564D57u /* "WMV1" read little-endian */
#define CAL_OTI_WMV2           0x32564D57u
#define CAL_OTI_MP43           0x3334504Du
#define CAL_OTI_WMV3           0x33564D57u
#define CAL_OTI_WVC1           0x31435657u

/* Video decoder Init result when the layer refuses the stream. */
#define CAL_RESULT_REFUSED 17
/* Video decoder Decode result, with result word 4, when the layer drops the frame. */
#define CAL_RESULT_DROPPED 1
#define CAL_DECODE_RESULT_DROPPED 4u

/* Video decoder: slot 0. */
VORCAL_API int32_t vorCAL_VideoDecoderGetProperty(CALCodec *hCodec, uint32_t uProperty,
                                                  uint32_t *puValue);
/* Video decoder: slot 1 after the H.264, HEVC, MPEG-4 Visual and H.263 adaptations; 17 = refused. */
VORCAL_API int32_t vorCAL_VideoDecoderInit(CALCodec *hCodec, uint32_t uCodecObjectTypeIndication,
                                           const uint8_t *pConfig, int32_t iConfigLen,
                                           const uint8_t *pConfigEnhance, int32_t iEnhLen,
                                           uint32_t uNALLengthSize, uint32_t *puWidth,
                                           uint32_t *puHeight, uint32_t *puPitch,
                                           CALParam uUserData);
/* Video decoder: slot 3 with the adapted frame; 1 with *puDecodeResult = 4 when dropped. */
VORCAL_API int32_t vorCAL_VideoDecoderDecode(CALCodec *hCodec, const uint8_t *pData, int32_t iLen,
                                             CALParam uParam3, CALParam uParam4,
                                             uint32_t *puDecodeResult);
/* Video decoder: slot 4. */
VORCAL_API int32_t vorCAL_VideoDecoderGetOutput(CALCodec *hCodec, CALParam uParam1, CALParam uParam2,
                                                CALParam uParam3, CALParam uParam4);
/* Video decoder: slot 5. */
VORCAL_API int32_t vorCAL_VideoDecoderReset(CALCodec *hCodec);
/* Video decoder: frees the intermediate H.264/HEVC buffer, then slot 2. */
VORCAL_API int32_t vorCAL_VideoDecoderDeinit(CALCodec *hCodec);

/* Audio decoder: slot 0. */
VORCAL_API int32_t vorCAL_AudioDecoderGetProperty(CALCodec *hCodec, uint32_t uProperty,
                                                  uint32_t *puValue);
/* Audio decoder: slot 1 with the AMR frame-type lock and the stream parameters. */
VORCAL_API int32_t vorCAL_AudioDecoderInit(CALCodec *hCodec, CALParam uParam1, const uint8_t *pConfig,
                                           int32_t iConfigLen, const uint8_t *pFrame,
                                           uint32_t uFrameLen, uint32_t *puSamplingRate,
                                           uint32_t *puNumOfChannels, uint32_t *puBitsPerSample,
                                           uint32_t *puSamplesPerFrame, CALParam uUserData);
/* Audio decoder: slot 3, with locked AMR streams' odd frames replaced by the silent frame. */
VORCAL_API int32_t vorCAL_AudioDecoderDecode(CALCodec *hCodec, const uint8_t *pData, int32_t iLen,
                                             CALParam uParam3, CALParam uParam4, CALParam uParam5,
                                             CALParam uParam6);
/* Audio decoder: slot 4. */
VORCAL_API int32_t vorCAL_AudioDecoderReset(CALCodec *hCodec);
/* Audio decoder: slot 2. */
VORCAL_API int32_t vorCAL_AudioDecoderDeinit(CALCodec *hCodec);

/* Image decoder: slot 0. */
VORCAL_API int32_t vorCAL_ImageDecoderGetProperty(CALCodec *hCodec, uint32_t uProperty,
                                                  uint32_t *puValue);
/* Image decoder: m_uUserData = uUserData, then slot 1. */
VORCAL_API int32_t vorCAL_ImageDecoderGetHeader(CALCodec *hCodec, CALParam uParam1, CALParam uParam2,
                                                CALParam uParam3, CALParam uParam4, CALParam uParam5,
                                                CALParam uParam6, CALParam uParam7,
                                                CALParam uUserData);
/* Image decoder: slot 2. */
VORCAL_API int32_t vorCAL_ImageDecoderDecode(CALCodec *hCodec, CALParam uParam1, CALParam uParam2,
                                             CALParam uParam3, CALParam uParam4, CALParam uParam5,
                                             CALParam uParam6, CALParam uParam7, CALParam uParam8,
                                             CALParam uParam9, CALParam uParam10);

/* Text decoder: m_uUserData = uUserData, then slot 1, then a category-7 trace. */
VORCAL_API int32_t vorCAL_TextDecoderInit(CALCodec *hCodec, CALParam uParam1, CALParam uParam2,
                                          CALParam uParam3, CALParam uUserData);
/* Text decoder: a category-7 level-4 trace, then slot 3. */
VORCAL_API int32_t vorCAL_TextDecoderDecode(CALCodec *hCodec, const uint8_t *pData, int32_t iLen,
                                            CALParam uParam3, CALParam uParam4, CALParam uParam5);
/* Text decoder: slot 4 (a null instance is also traced). */
VORCAL_API int32_t vorCAL_TextDecoderGetOutput(CALCodec *hCodec, CALParam uParam1);
/* Text decoder: slot 2. */
VORCAL_API int32_t vorCAL_TextDecoderDeinit(CALCodec *hCodec);

/* Video encoder: slot 0. */
VORCAL_API int32_t vorCAL_VideoEncoderGetProperty(CALCodec *hCodec, uint32_t uProperty,
                                                  uint32_t *puValue);
/* Video encoder: m_uUserData = uUserData, then slot 1. */
VORCAL_API int32_t vorCAL_VideoEncoderInit(CALCodec *hCodec, CALParam uParam1, CALParam uParam2,
                                           CALParam uParam3, CALParam uParam4, CALParam uParam5,
                                           CALParam uParam6, CALParam uParam7, CALParam uParam8,
                                           CALParam uParam9, CALParam uUserData);
/* Video encoder: slot 3. */
VORCAL_API int32_t vorCAL_VideoEncoderEncode(CALCodec *hCodec, CALParam uParam1, CALParam uParam2,
                                             CALParam uParam3, CALParam uParam4, CALParam uParam5,
                                             CALParam uParam6);
/* Video encoder: slot 4. */
VORCAL_API int32_t vorCAL_VideoEncoderSkip(CALCodec *hCodec, CALParam uParam1, CALParam uParam2);
/* Video encoder: slot 2. */
VORCAL_API int32_t vorCAL_VideoEncoderDeinit(CALCodec *hCodec);

#ifdef __cplusplus
}
#endif

#endif /* VORCAL_WRAPPER_H */
