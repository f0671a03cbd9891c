// The header bit reader: MSB first through a 32-bit cache, emulation-prevention bytes removed
// as bytes are loaded, ue(v) codes. Every video tool reads headers through these functions.
// Past the end of the buffer the reader loads zero bytes and never touches memory beyond it.
#pragma once

#include <bit>
#include <cstdint>

#include <vorcal/video_tools.h>

namespace vorcal::tools::bs {

// Loads one byte into the cache; true when next byte >= length after the load.
inline bool Load(CALToolsBS &bs) noexcept
{
    const uint8_t *pBuf = bs.pBuffer;
    uint32_t uNext = bs.uNextByte;
    uint32_t uByte = uNext < bs.uLength ? pBuf[uNext] : 0u;
    // ITU-T H.264 7.4.1: 00 00 03 -> 00 00. The look-back is on raw bytes and never removes a
    // byte at index 0-3.
    if (uByte == 0x03 && uNext >= 4 && pBuf[uNext - 2] == 0 && pBuf[uNext - 1] == 0) {
        ++uNext;
        uByte = uNext < bs.uLength ? pBuf[uNext] : 0u;
    }
    bs.uCache = (bs.uCache << 8) | uByte;
    if (uNext != UINT32_MAX)
        ++uNext;
    bs.uNextByte = uNext;
    return uNext >= bs.uLength;
}

// Starts a reader on a buffer: four bytes loaded, bit position 0.
inline void Init(CALToolsBS &bs, const uint8_t *pBuffer, uint32_t uLength) noexcept
{
    bs.uCache = 0;
    bs.uBitPos = 0;
    bs.uReserved = 0;
    bs.pBuffer = pBuffer;
    bs.uNextByte = 0;
    bs.uLength = pBuffer ? uLength : 0;
    for (int i = 0; i < 4; ++i)
        Load(bs);
}

// The unread bits, left-aligned (peek).
inline uint32_t Peek(const CALToolsBS &bs) noexcept
{
    return bs.uCache << bs.uBitPos;
}

// Makes uLoads loads; true when any of them reported the end. Past the end the loads go on
// supplying zero bytes, so that the cache always matches the bit position: bits inside the
// buffer stay the buffer's and bits past it read as zeros.
inline bool LoadMany(CALToolsBS &bs, uint64_t uLoads) noexcept
{
    bool bEnd = false;
    for (; uLoads != 0; --uLoads) {
        if (bs.uCache == 0 && bs.uNextByte >= bs.uLength) {
            // Only zeros are left to load: move the index without touching anything.
            const uint64_t uNext = uint64_t{bs.uNextByte} + uLoads;
            bs.uNextByte = uNext > UINT32_MAX ? UINT32_MAX : static_cast<uint32_t>(uNext);
            return true;
        }
        bEnd |= Load(bs);
    }
    return bEnd;
}

// Consumes n bits: loads (bit position + n) / 8 bytes. True when a load reached the end.
inline bool Skip(CALToolsBS &bs, uint32_t n) noexcept
{
    const uint64_t uTotal = uint64_t{bs.uBitPos} + n;
    bs.uBitPos = static_cast<uint32_t>(uTotal & 7);
    return LoadMany(bs, uTotal >> 3);
}

// The next n bits right-aligned; exact while n + bit position <= 32, 0 for n = 0 or n > 32.
inline uint32_t Read(CALToolsBS &bs, uint32_t n) noexcept
{
    const uint32_t uShift = 32u - n;
    const uint32_t uValue = (n == 0 || uShift >= 32u) ? 0u : Peek(bs) >> uShift;
    Skip(bs, n);
    return uValue;
}

inline uint32_t ReadBit(CALToolsBS &bs) noexcept
{
    return Read(bs, 1);
}

// ue(v), ITU-T H.264 9.1; 0xFFFFFFFF without consuming when 32 zero bits are in view.
inline uint32_t ReadUE(CALToolsBS &bs) noexcept
{
    const uint32_t uLeadingZeros = static_cast<uint32_t>(std::countl_zero(Peek(bs)));
    if (uLeadingZeros == 32)
        return 0xFFFFFFFFu;
    return Read(bs, 2 * uLeadingZeros + 1) - 1;
}

inline bool Align(CALToolsBS &bs) noexcept
{
    return bs.uBitPos != 0 && Skip(bs, 8 - bs.uBitPos);
}

// Loads n bytes with the bit position unchanged; true when a load reached the end.
inline bool SkipBytes(CALToolsBS &bs, int32_t n) noexcept
{
    return n > 0 && LoadMany(bs, static_cast<uint64_t>(n));
}

} // namespace vorcal::tools::bs
