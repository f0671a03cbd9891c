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
 * ---------------------------------------------------------------------------------------- */



/* ------------------------------------------------------------------------------------------
 * Detection entry.
 * ---------------------------------------------------------------------------------------- */



#ifdef __cplusplus
}
#endif

#endif /* VORCAL_AACPARSE_H */
