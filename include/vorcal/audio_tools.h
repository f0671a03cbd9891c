/*
 * vorcal/audio_tools.h - AAC decoder-specific information and ADTS helpers, silence frames,
 * AMR/DRA mute-frame generators and AAC type detection.
 *
 * Pointer arguments must be valid unless a function says otherwise. Frames the generators
 * allocate come from the system layer's memory table and are freed through it.
 */
#ifndef VORCAL_AUDIO_TOOLS_H
#define VORCAL_AUDIO_TOOLS_H

#include <stdint.h>
#include <vorcal/wrapper.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Reads rate, channel configuration and the SBR object type (5) from the first two bytes of an
 * AudioSpecificConfig; takes no length, so pDSI must hold 2 readable bytes. Sampling-frequency
 * indices 12-15 report 0 Hz. Returns 0. */
VORCAL_API int32_t vorCALTools_AAC_ParseDSI(const uint8_t *pDSI, uint32_t *puSamplingRate,
                                            uint32_t *puChannels, uint32_t *puSBR);
/* 7: the size of an ADTS header without CRC. */
VORCAL_API int32_t vorCALTools_Get_ADTS_HeaderSize(void);
/* Writes a 7-byte ADTS header (profile 1, buffer fullness 0x7FF) for uFrameLen raw bytes. Reads
 * 2 bytes of pDSI and writes 7 bytes to pHeader; neither size is passed. */
VORCAL_API int32_t vorCALTools_Make_ADTS_Header(const uint8_t *pDSI, int32_t uFrameLen, uint8_t *pHeader);
/* The 13-bit frame_length field of an ADTS header: reads bytes 3-5, so pHeader must hold 6
 * readable bytes. */
VORCAL_API uint32_t _GetAACFrameLength(const uint8_t *pHeader);
/* 7 or 9 (header size) when the buffer is exactly one ADTS frame, else 0. Length comes first. */
VORCAL_API int32_t vorCALTools_AAC_isADTSAAC(int32_t uLen, const uint8_t *pBuf);

/* A silence frame for the instance's codec, cached in the instance (AAC, AAC+SBR, DRA) or
 * static (AMR). 0 success, 1 no instance or AAC channel count not 1-2, 16 no silence frames for
 * this codec, -1 refused. The caller borrows the frame. */
VORCAL_API int32_t vorCALTools_GetSilenceFrame(CALCodec *hCodec, uint32_t uSamplingRate,
                                               uint32_t uChannels, uint32_t uReserved,
                                               uint32_t bADTS, const uint8_t **ppFrame,
                                               uint32_t *puFrameLen);
/* Allocates the AAC silence frame of mode 0-4, optionally behind an ADTS header. 0 or -1. */
VORCAL_API int32_t AAC_MuteFrame(uint8_t **ppFrame, uint32_t *uFrameLen, uint32_t uReserved,
                                 uint32_t uSamplingRate, uint32_t uChannels, uint32_t bADTS,
                                 int32_t uMode);
/* Adds the ADTS header of a silence frame (profile 2, fullness 0x7CF) into seven zeroed bytes.
 * SBR modes (2-4) halve the rate first. 0 or -1. */
VORCAL_API int32_t AAC_MakeADTS(uint8_t *pHeader, int32_t uSamplingRate, uint32_t uChannels,
                                int32_t uMode, uint32_t uRawLen);
/* ADTS sampling_frequency_index 0-11 of an exact rate, or -1. */
VORCAL_API int32_t mute_get_samplerate_idx(int32_t iSamplingRate);
/* Allocates the silent AMR-NB frame of frame type 0-7. 0 or -1. */
VORCAL_API int32_t AMRNB_MuteFrame(uint8_t **ppFrame, uint32_t *uFrameLen, uint32_t uFT);
/* Allocates the silent AMR-WB frame of frame type 0-8. 0 or -1. */
VORCAL_API int32_t AMRWB_MuteFrame(uint8_t **ppFrame, uint32_t *uFrameLen, uint32_t uFT);
/* Allocates the 8-byte silent DRA frame (2 channels at 48000, 44100 or 32000 Hz). 0 or -1. */
VORCAL_API int32_t DRA_MuteFrame(uint8_t **ppFrame, uint32_t *uFrameLen, uint32_t uSamplingRate,
                                 uint32_t uChannels);

/* Runs the parse-only decoder over the raw frame behind an ADTS header and stores 64 (AAC) or
 * 65 (AAC with SBR) as the instance's OTI. Returns the OTI, the unchanged OTI of a non-AAC
 * instance or of a null pFrame (nothing allocated; 0xFFFFFFFF for a null instance), or
 * 0xFFFFFFFF with the instance unchanged when the header cannot be built or memory runs out.
 * Frames under 2 bytes get extra zero padding for the header parse. Not thread-safe: it runs
 * VrAACSBRInfo on the parse-only decoder's one static state, so no two calls may overlap. */
VORCAL_API uint32_t vorCALTools_GetAACType(CALCodec *hCodec, int32_t uSamplingRate,
                                           uint32_t uChannels, const uint8_t *pFrame,
                                           uint32_t uFrameLen);

#ifdef __cplusplus
}
#endif

#endif /* VORCAL_AUDIO_TOOLS_H */
