/*
 * vorcal/video_tools.h - video bitstream tools: the header bit reader, big-endian fields,
 * H.264 framing, conversion, configuration runs and sequence parameter sets, frame
 * classification, MPEG-4 Visual, H.263 and VC-1 configuration.
 *
 * Every tool is reentrant. No tool reads a byte outside the source it is given or writes a
 * byte beyond the destination size it is given; where a fixed header field lies past the end
 * of the data, the tools read zero bits in its place.
 */
#ifndef VORCAL_VIDEO_TOOLS_H
#define VORCAL_VIDEO_TOOLS_H

#include <stdint.h>
#include <vorcal/core.h>

#ifdef __cplusplus
extern "C" {
#endif

/* AVC format codes (vorCALTools_AVC_CheckFormat, values of properties 81 and 82). */
#define CAL_AVC_FORMAT_UNDETERMINED 0 /* fewer than 4 bytes */
#define CAL_AVC_FORMAT_NAL          1 /* length-prefixed NAL units or a parameter-set container */
#define CAL_AVC_FORMAT_ANNEXB       2 /* start-code framing, ITU-T H.264 Annex B */

/* Header bit reader state: six 32-bit words on the 32-bit target, kept by the calling tool. */
typedef struct CALToolsBS {
    uint32_t uCache;       /* the last four bytes loaded; bit 31 is the earliest */
    uint32_t uBitPos;      /* 0-7: bits at the top of the cache already consumed */
    uint32_t uReserved;    /* 0 */
    const uint8_t *pBuffer;
    uint32_t uNextByte;    /* index of the next byte to load */
    uint32_t uLength;      /* bytes in the buffer */
} CALToolsBS;

/* Loads one byte into the cache, dropping an emulation-prevention 0x03 after 00 00 (never at
 * index 0-3). Returns 1 when the buffer end was reached by this load. Past the end it loads 0. */
VORCAL_API int32_t _LoadBS(CALToolsBS *pBS);
/* The cache shifted left by the bit position (peek). */
VORCAL_API uint32_t _ReadBitsMSB(CALToolsBS *pBS);
/* Leading zero bits of x, 32 for 0. */
VORCAL_API uint32_t _CountLeadingZeros32(uint32_t x);
/* Reads the next n bits right-aligned (exact while n + bit position <= 32; 0 for n = 0). */
VORCAL_API uint32_t _ReadNShiftBits(CALToolsBS *pBS, uint32_t n);
/* Reads one ue(v) code; 0xFFFFFFFF without consuming when 32 zero bits are in view. */
VORCAL_API uint32_t _GetUE_V(CALToolsBS *pBS);
/* Skips n bits; 1 when a load reached the end. */
VORCAL_API int32_t _ShiftBits(CALToolsBS *pBS, uint32_t n);
/* Skips to the next byte boundary; 0 when already aligned. */
VORCAL_API int32_t _AlignBits(CALToolsBS *pBS);
/* Loads n bytes, bit position unchanged; 1 when a load reached the end, 0 for n <= 0. */
VORCAL_API int32_t _ShiftBytes(CALToolsBS *pBS, int32_t n);

/* Big-endian fields; they take no length and read 2, 3 and 4 bytes at p. */
VORCAL_API uint32_t vorCALTools_ReadBigEndianValue16(const uint8_t *p);
VORCAL_API uint32_t vorCALTools_ReadBigEndianValue24(const uint8_t *p);
VORCAL_API uint32_t vorCALTools_ReadBigEndianValue32(const uint8_t *p);
/* Exchanges the two bytes of v, so that a native 16-bit store on a little-endian target lays
 * the value down big-endian. */
VORCAL_API uint16_t vorCALTools_WriteBigEndianValue16(uint16_t v);

/* H.264 framing. */

/* CAL_AVC_FORMAT_* of the data. */
VORCAL_API int32_t vorCALTools_AVC_CheckFormat(const uint8_t *pData, int32_t iLen);
/* Offset of the first 3- or 4-byte start code (the 4-byte form tested first), or -1. */
VORCAL_API int32_t vorCALTools_AVC_FindStartCode(const uint8_t *pData, int32_t iLen);
/* Offset of the next length-prefixed unit after the one at iPos, or -1. */
VORCAL_API int32_t _NEXT_NAL_(const uint8_t *pBuf, int32_t iLen, int32_t iPos, int32_t iNALLengthSize);
/* Bytes up to the start code of the first slice of the second picture, or the whole length. */
VORCAL_API int32_t vorCALTools_AVC_GetOneFrame(const uint8_t *pData, int32_t iLen);

/* H.264 conversion and configuration runs. */

/* Converts a frame to the other framing (4-byte start codes or 4-byte lengths); bytes written
 * or -1. Never writes beyond iDstSize (-1 when the result would not fit). */
VORCAL_API int32_t vorCALTools_AVC_ConvertFormat(uint8_t *pDst, int32_t iDstSize, const uint8_t *pSrc,
                                                 int32_t iSrcLen, int32_t iNALLengthSize);
/* As vorCALTools_AVC_ConvertFormat, keeping only coded slices towards length-prefixed output. */
VORCAL_API int32_t vorCALTools_AVC_ConvertFormat_NoSPSPPS(uint8_t *pDst, int32_t iDstSize,
                                                          const uint8_t *pSrc, int32_t iSrcLen,
                                                          int32_t iNALLengthSize);
/* Converts parameter sets between a container (configuration record or parameter-set list)
 * and start codes; bytes written, 0 on failure. */
VORCAL_API int32_t vorCALTools_AVC_ConvertFormatPSs(uint8_t *pDst, int32_t iDstSize,
                                                    const uint8_t *pSrc, int32_t iSrcLen);
/* The SEI/SPS/PPS run in front of the first slice of a length-prefixed frame, or null. */
VORCAL_API const uint8_t *vorCALTools_AVC_NAL_GetConfigStream(const uint8_t *pData, int32_t iLen,
                                                              int32_t iNALLengthSize,
                                                              int32_t *piConfigLen);
/* The SEI/SPS/PPS run in front of the first slice of a start-code framed frame, or null. */
VORCAL_API const uint8_t *vorCALTools_AVC_ANNEXB_GetConfigStream(const uint8_t *pData, int32_t iLen,
                                                                 int32_t *piConfigLen);

/* H.264 sequence parameter set. */
typedef struct CALSPSInfo {
    uint32_t uProfile;     /* profile_idc */
    uint32_t uLevel;       /* level_idc */
    uint32_t uWidth;       /* (pic_width_in_mbs_minus1 + 1) * 16 */
    uint32_t uHeight;      /* (pic_height_in_map_units_minus1 + 1) * 16 */
    uint32_t uRefFrames;   /* max_num_ref_frames */
    uint32_t uCropping;    /* frame_cropping_flag */
    uint32_t uCropLeft;
    uint32_t uCropRight;
    uint32_t uCropTop;
    uint32_t uCropBottom;
    uint32_t uAspectClass; /* written only when the SPS carries VUI */
} CALSPSInfo;

/* Finds and parses the first SPS of start-code framed data: 0 parsed, 1 too short,
 * 2 forbidden_zero_bit set, 3 no SPS or pic_order_cnt_type above 2. */
VORCAL_API uint32_t vorCALTools_AVC_GetSPSInfo(const uint8_t *pData, int32_t iLen, CALSPSInfo *pInfo);

/* The whole sequence parameter set (ITU-T H.264 7.3.2.1.1 and the VUI of Annex E), filled by
 * vorCALTools_AVC_ParseSPS. Sizes are in luma samples. */
typedef struct CALAVCSPS {
    uint32_t uProfileIdc, uConstraintFlags /* the constraint_set flags byte as coded */, uLevelIdc, uSPSId;
    uint32_t uChromaFormatIdc, uSeparateColourPlane, uBitDepthLuma, uBitDepthChroma, uScalingMatrixPresent;
    uint32_t uLog2MaxFrameNum, uPicOrderCntType, uMaxNumRefFrames, uFrameMbsOnly, uMbAdaptiveFrameField;
    uint32_t uCodedWidth, uCodedHeight;                      /* pixels: macroblocks x 16, the whole frame */
    uint32_t uCropLeft, uCropRight, uCropTop, uCropBottom;   /* pixels, CropUnitX/CropUnitY applied */
    uint32_t uWidth, uHeight;                                /* display size: coded size minus cropping */
    uint32_t uSarNum, uSarDen;                               /* sample aspect ratio; 0 and 0 when not signalled */
    uint32_t uVideoFullRange, uColourPrimaries, uTransferCharacteristics, uMatrixCoefficients; /* 0 and 2, 2, 2 when absent */
    uint32_t uNumUnitsInTick, uTimeScale, uFixedFrameRate;  /* 0 when absent */
    uint32_t uMaxNumReorderFrames, uMaxDecFrameBuffering;   /* from bitstream_restriction; 0 when absent */
} CALAVCSPS;

/* Results of vorCALTools_AVC_ParseSPS. */
#define CAL_AVC_SPS_OK              0
#define CAL_AVC_SPS_ERR_ARGUMENT  (-1) /* null data or record, or a length of 0 or less */
#define CAL_AVC_SPS_ERR_NOT_FOUND (-2) /* no SPS NAL unit in the data */
#define CAL_AVC_SPS_ERR_MALFORMED (-3) /* a field outside its range in ITU-T H.264 7.4.2.1.1 or E.2.1 */
#define CAL_AVC_SPS_ERR_TRUNCATED (-4) /* the data ends inside the SPS syntax */

/* Finds the first SPS in one SPS NAL unit (header byte first), in start-code framed data (the
 * first unit of type 7 after any 00 00 01) or in an AVC decoder configuration record
 * (ISO/IEC 14496-15, first byte 1), and parses all of it: profile-dependent fields, scaling
 * lists, every pic_order_cnt_type, cropping in chroma and field units, the VUI with Table E-1
 * aspect ratios, HRD parameters and bitstream_restriction. Emulation-prevention bytes are
 * removed; no byte outside [pData, pData + iLen) is read. Returns CAL_AVC_SPS_OK with *pSPS
 * filled, or a negative CAL_AVC_SPS_ERR_* with *pSPS cleared (when pSPS is not null). */
VORCAL_API int32_t vorCALTools_AVC_ParseSPS(const uint8_t *pData, int32_t iLen, CALAVCSPS *pSPS);

/* Frame classification. uExtra: the NAL length size for H.264, a pointer to the 4-byte
 * sequence header for WMV3 and WVC1 (4 readable bytes: its fourth is read, no length is
 * passed). */
VORCAL_API int32_t vorCALTools_IsIDRFrame(uint32_t uOTI, const uint8_t *pFrame, int32_t iFrameLen,
                                          CALParam uExtra);
/* 1 for an MPEG-4 Visual B-VOP. */
VORCAL_API int32_t vorCALTools_IsBFrame(uint32_t uOTI, const uint8_t *pFrame, int32_t iFrameLen);
/* 1 when the frame looks like a frame of the codec. */
VORCAL_API int32_t vorCALTools_IsValidVideo(uint32_t uOTI, const uint8_t *pFrame, int32_t iFrameLen);
/* The first VOP start code 00 00 01 B6 and the bytes from it to the end, or null. */
VORCAL_API const uint8_t *_PTOOL_FindVOP(const uint8_t *pData, int32_t iLen, int32_t *piRemaining);

/* MPEG-4 Visual and H.263 decoder configuration. */
typedef struct CALMPEG4DSIInfo {
    uint32_t uProfile;      /* 0 Simple, 1 Simple Scalable, 255 other */
    uint32_t uLevel;        /* 0-5, or 255 */
    uint32_t uSourceFormat; /* H.263 source format, 7 = extended PTYPE */
    uint32_t uWidth;
    uint32_t uHeight;
} CALMPEG4DSIInfo;

/* Walks the DSI headers; writes only the fields of headers met. 1 for an empty DSI, else 0.
 * The reserved plain H.263 source format 6 reports 0 x 0. */
VORCAL_API uint32_t vorCALTools_MPEG4V_GetDSIInfo(const uint8_t *pDSI, uint32_t uLen,
                                                  CALMPEG4DSIInfo *pInfo);
/* The VC-1 profile (top two bits of the extra data); 1 for null or empty extra data. */
VORCAL_API uint32_t vorCALTools_VC1_GetExtraDataInfo(const uint8_t *pExtra, uint32_t uLen,
                                                     uint32_t *puProfile);

#ifdef __cplusplus
}
#endif

#endif /* VORCAL_VIDEO_TOOLS_H */
