/*
 * vorcal/video_tools.h - video bitstream tools: the header bit reader, big-endian fields,
 * H.264 and HEVC framing, conversion, configuration runs and sequence parameter sets, frame
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

/* HEVC (ITU-T H.265): framing, conversion, the hvcC record, the SPS and the intra test.
 * Framings are told by the CAL_AVC_FORMAT_* codes; where a tool takes data of either framing,
 * an iNALLengthSize of 0 stands for start codes and 1 to 4 for length fields of that size. Start-
 * code data may begin with zero bytes, and zero bytes at the end of a unit are trailing_zero_8bits,
 * not part of it (7.4.2: the last byte of a NAL unit is never 0x00). No tool reads a byte outside
 * the data or writes one beyond the destination size it is given. */

/* Results of the HEVC tools; the conversions otherwise return the bytes written. */
#define CAL_HEVC_OK              0
#define CAL_HEVC_ERR_ARGUMENT  (-1) /* null data, a negative length, a NAL length size outside 1-4 */
#define CAL_HEVC_ERR_NOT_FOUND (-2) /* no SPS in the data */
#define CAL_HEVC_ERR_MALFORMED (-3) /* a field out of range, a unit shorter than its 2-byte header,
                                     * start-code data that does not begin with a start code */
#define CAL_HEVC_ERR_TRUNCATED (-4) /* a length field pointing past the data, data ending inside a
                                     * length field or inside the syntax parsed */
#define CAL_HEVC_ERR_NO_ROOM   (-5) /* the destination cannot hold the result */
#define CAL_HEVC_ERR_TOO_LONG  (-6) /* a unit longer than its length field can carry, or a result
                                     * over 2^31 - 1 bytes */

/* nal_unit_type values (Table 7-1) with a role in the tools below. */
#define CAL_HEVC_NAL_BLA_W_LP       16u /* first IRAP type */
#define CAL_HEVC_NAL_RSV_IRAP_VCL23 23u /* last IRAP type */
#define CAL_HEVC_NAL_VPS            32u
#define CAL_HEVC_NAL_SPS            33u
#define CAL_HEVC_NAL_PPS            34u
#define CAL_HEVC_NAL_AUD            35u
#define CAL_HEVC_NAL_PREFIX_SEI     39u
#define CAL_HEVC_NAL_SUFFIX_SEI     40u

/* CAL_AVC_FORMAT_* of HEVC data: ANNEXB when it begins with a start code whose two-byte NAL unit
 * header lies inside the data and is valid (forbidden_zero_bit 0, nuh_temporal_id_plus1 not 0),
 * UNDETERMINED below 4 bytes, NAL otherwise (length fields, an hvcC record). */
VORCAL_API int32_t vorCALTools_HEVC_CheckFormat(const uint8_t *pData, int32_t iLen);

/* Converts one frame: iSourceFormat CAL_AVC_FORMAT_NAL reads iNALLengthSize-byte length fields
 * (1-4) and writes every unit behind 00 00 00 01; CAL_AVC_FORMAT_ANNEXB writes every unit behind
 * an iNALLengthSize-byte length field; 0 takes vorCALTools_HEVC_CheckFormat's answer. Every unit
 * must hold its 2-byte header. Bytes written (with pDst null: the bytes it would write), or a
 * CAL_HEVC_ERR_* result. */
VORCAL_API int32_t vorCALTools_HEVC_ConvertFormat(uint8_t *pDst, int32_t iDstSize, const uint8_t *pSrc,
                                                  int32_t iSrcLen, int32_t iSourceFormat,
                                                  int32_t iNALLengthSize);

/* The HEVC decoder configuration record (ISO/IEC 14496-15 8.3.3.1), as vorCALTools_HEVC_ParseHvcC
 * reads it. */
typedef struct CALHEVCConfig {
    uint32_t uConfigurationVersion;
    uint32_t uProfileSpace, uTierFlag, uProfileIdc;
    uint32_t uProfileCompatibilityFlags; /* general_profile_compatibility_flag[0] in bit 31 */
    uint32_t uConstraintFlagsHigh;       /* the first 16 of the 48 constraint indicator bits */
    uint32_t uConstraintFlagsLow;        /* the other 32 */
    uint32_t uLevelIdc;
    uint32_t uMinSpatialSegmentationIdc, uParallelismType;
    uint32_t uChromaFormatIdc, uBitDepthLuma, uBitDepthChroma; /* chromaFormat, bitDepth*Minus8 + 8 */
    uint32_t uAvgFrameRate, uConstantFrameRate, uNumTemporalLayers, uTemporalIdNested;
    uint32_t uNALLengthSize;             /* lengthSizeMinusOne + 1 */
    uint32_t uNumOfArrays, uNumOfNalus;  /* arrays, and units in all of them */
} CALHEVCConfig;

/* Reads the fixed part of an hvcC record and checks that every array and unit lies inside it:
 * CAL_HEVC_OK with *pConfig filled, else a CAL_HEVC_ERR_* result with *pConfig cleared. */
VORCAL_API int32_t vorCALTools_HEVC_ParseHvcC(const uint8_t *pRecord, int32_t iLen, CALHEVCConfig *pConfig);

/* The units of every array of an hvcC record, in record order (VPS, SPS, PPS, SEI as it holds
 * them), each behind 00 00 00 01. Bytes written (with pDst null: the bytes needed), or a
 * CAL_HEVC_ERR_* result. */
VORCAL_API int32_t vorCALTools_HEVC_HvcCToAnnexB(uint8_t *pDst, int32_t iDstSize, const uint8_t *pRecord,
                                                 int32_t iRecordLen);

/* Flags of vorCALTools_HEVC_MakeHvcC. */
#define CAL_HEVC_HVCC_COMPLETE 1u /* array_completeness 1: the samples carry no units of the arrays' types (hvc1) */
#define CAL_HEVC_HVCC_WITH_SEI 2u /* also an array of the prefix SEI units found */

/* Builds an hvcC record from the VPS, SPS and PPS units in front of the first coded slice of
 * start-code framed data (duplicates dropped): profile, tier, compatibility, constraint flags and
 * level, chroma format and bit depths of the first SPS (the highest tier and level of all
 * parameter sets), min_spatial_segmentation_idc of its VUI, parallelismType from the PPSs,
 * numTemporalLayers and temporalIdNested of the SPS, lengthSizeMinusOne iNALLengthSize - 1 (1-4),
 * arrays VPS, SPS, PPS. Bytes written (with pDst null: the bytes needed), or a CAL_HEVC_ERR_* result
 * (CAL_HEVC_ERR_NOT_FOUND without a base-layer SPS, its own result when the first one does not
 * parse, CAL_HEVC_ERR_MALFORMED for bit depths above 15, which the record cannot carry). */
VORCAL_API int32_t vorCALTools_HEVC_MakeHvcC(uint8_t *pDst, int32_t iDstSize, const uint8_t *pSrc, int32_t iSrcLen,
                                             int32_t iNALLengthSize, uint32_t uFlags);

/* One NAL unit of a walk (vorCALTools_HEVC_NextNAL, vorCALTools_HEVC_NextHvcCNAL). Clear the
 * whole record to start a walk; the walk keeps its place in the last three fields. */
typedef struct CALHEVCNAL {
    const uint8_t *pUnit;      /* the first byte of the unit's two-byte NAL unit header */
    int32_t iLen;              /* bytes of the unit */
    int32_t iStart;            /* offset of the unit's start code, length field or record length */
    uint32_t uType;            /* nal_unit_type */
    uint32_t uLayerId;         /* nuh_layer_id */
    uint32_t uTemporalIdPlus1; /* nuh_temporal_id_plus1 */
    uint32_t uArrayComplete;   /* hvcC walks: array_completeness of the unit's array, else 0 */
    int32_t iNext;             /* walk state: where the next step begins */
    uint32_t uArraysLeft, uUnitsLeft; /* walk state of hvcC walks */
} CALHEVCNAL;

/* One step of a walk over the units of a frame or stream (iNALLengthSize 0: start codes, 1-4:
 * length fields): 1 with *pUnit describing the next unit, 0 after the last, or a CAL_HEVC_ERR_*
 * result where the data breaks (the units before it were valid). */
VORCAL_API int32_t vorCALTools_HEVC_NextNAL(const uint8_t *pData, int32_t iLen, int32_t iNALLengthSize,
                                            CALHEVCNAL *pUnit);
/* One step of a walk over the units in the arrays of an hvcC record, results as above. */
VORCAL_API int32_t vorCALTools_HEVC_NextHvcCNAL(const uint8_t *pRecord, int32_t iLen, CALHEVCNAL *pUnit);
/* The Table 7-1 name of a nal_unit_type ("TRAIL_N", "CRA_NUT", "VPS_NUT", "RSV_VCL_N10",
 * "UNSPEC48", ...), or null above 63. */
VORCAL_API const char *vorCALTools_HEVC_NALTypeName(uint32_t uType);

/* 1 when the frame holds a coded slice of an IRAP picture (nal_unit_type 16-23: BLA, IDR, CRA)
 * before its data breaks, else 0. iNALLengthSize 0: start codes; 1-4: length fields. */
VORCAL_API int32_t vorCALTools_HEVC_IsIRAP(const uint8_t *pFrame, int32_t iLen, int32_t iNALLengthSize);

/* The run of VPS, SPS, PPS, AUD and prefix SEI units in front of the first coded slice (types
 * 0-31) of a frame (iNALLengthSize 0: start codes, 1-4: length fields): its start (the first
 * such unit's start code or length field) and, in *piConfigLen, its bytes up to the first
 * slice's start code or length field (to the end of the frame when no slice follows). Null with
 * *piConfigLen 0 when the frame begins with a slice, has no such unit or breaks before its
 * first slice. */
VORCAL_API const uint8_t *vorCALTools_HEVC_GetConfigStream(const uint8_t *pData, int32_t iLen,
                                                           int32_t iNALLengthSize, int32_t *piConfigLen);

/* The sequence parameter set (ITU-T H.265 7.3.2.2 and the VUI of Annex E), filled by
 * vorCALTools_HEVC_ParseSPS. Sizes are in luma samples. */
typedef struct CALHEVCSPS {
    uint32_t uProfileSpace, uTierFlag, uProfileIdc, uProfileCompatibilityFlags; /* general_*; flag[0] in bit 31 */
    uint32_t uConstraintFlagsHigh, uConstraintFlagsLow; /* the 48 constraint bits as in CALHEVCConfig */
    uint32_t uLevelIdc;                                 /* general_level_idc: 30 x the level */
    uint32_t uVPSId, uMaxSubLayers, uTemporalIdNesting, uSPSId;
    uint32_t uChromaFormatIdc, uSeparateColourPlane;
    uint32_t uCodedWidth, uCodedHeight;                 /* pic_width/height_in_luma_samples */
    uint32_t uConfWinLeft, uConfWinRight, uConfWinTop, uConfWinBottom; /* offsets x SubWidthC/SubHeightC */
    uint32_t uWidth, uHeight;                           /* display size: coded size minus the window */
    uint32_t uBitDepthLuma, uBitDepthChroma, uLog2MaxPicOrderCntLsb;
    uint32_t uMaxDecPicBuffering, uMaxNumReorderPics, uMaxLatencyIncreasePlus1; /* highest sub-layer */
    uint32_t uLog2MinCbSize, uLog2CtbSize;
    uint32_t uScalingListEnabled, uNumShortTermRefPicSets, uLongTermRefPicsPresent, uNumLongTermRefPicsSps;
    uint32_t uSarNum, uSarDen;                          /* 0 and 0 when not signalled */
    uint32_t uVideoFullRange, uColourPrimaries, uTransferCharacteristics, uMatrixCoefficients; /* 0 and 2, 2, 2 when absent */
    uint32_t uNumUnitsInTick, uTimeScale;               /* 0 when absent */
    uint32_t uMinSpatialSegmentationIdc;                /* bitstream_restriction; 0 when absent */
    uint32_t uExtensionFlags; /* bit 0 sps_range_extension_flag, 1 multilayer, 2 3d, 3 scc, 4-7 sps_extension_4bits */
} CALHEVCSPS;

/* Finds the first SPS in one SPS NAL unit (header first), in start-code framed data or in an
 * hvcC record (first byte 1) and parses it up to its extension flags: profile_tier_level with
 * sub-layers, conformance window, short-term reference picture sets (with inter prediction),
 * long-term references, scaling lists, PCM, the VUI with Table E-1 aspect ratios and HRD
 * parameters. Emulation-prevention bytes are removed. Returns CAL_HEVC_OK with *pSPS filled, or
 * a CAL_HEVC_ERR_* result with *pSPS cleared (when pSPS is not null). */
VORCAL_API int32_t vorCALTools_HEVC_ParseSPS(const uint8_t *pData, int32_t iLen, CALHEVCSPS *pSPS);

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
