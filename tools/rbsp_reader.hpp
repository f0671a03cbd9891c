// Reads the RBSP of one NAL unit MSB first, for the parameter-set parsers of H.264 and HEVC:
// a 0x03 after two zero bytes is an emulation-prevention byte and is dropped (ITU-T H.264 7.4.1,
// H.265 7.4.2). Past the end every bit reads as 0. The first failure is remembered, a read past
// the end or a value out of range, so that zeros read past the end are not taken for a
// malformed field nor a broken field for a cut.
#pragma once

#include <cstddef>
#include <cstdint>
#include <iterator>

namespace vorcal::tools {

enum class RbspError { kNone, kMalformed, kTruncated };

class RbspReader {
public:
    RbspReader(const uint8_t *pData, size_t uLen) noexcept : p_(pData), n_(uLen) {}

    // The next n bits (n <= 32), right-aligned.
    uint32_t Bits(uint32_t n) noexcept
    {
        uint64_t v = 0;
        while (n > 0) {
            if (left_ == 0 && !Fetch()) {
                overrun_ = overrun_ || !bad_;
                return static_cast<uint32_t>(v << n);
            }
            const uint32_t uTake = n < left_ ? n : left_;
            left_ -= uTake;
            v = (v << uTake) | ((cur_ >> left_) & ((1u << uTake) - 1));
            n -= uTake;
        }
        return static_cast<uint32_t>(v);
    }
    uint32_t Bit() noexcept { return Bits(1); }
    // Skips n bits, any number.
    void Skip(uint64_t n) noexcept
    {
        for (; n > 32 && !Failed(); n -= 32)
            Bits(32);
        Bits(static_cast<uint32_t>(n > 32 ? 32 : n));
    }

    // ue(v), ITU-T H.264 9.1 and H.265 9.2: up to 31 leading zeros (values up to 2^32 - 2); more
    // is an error.
    uint32_t UE() noexcept
    {
        uint32_t uZeros = 0;
        while (Bit() == 0) {
            if (++uZeros > 31 || Failed()) {
                Require(false);
                return 0;
            }
        }
        return static_cast<uint32_t>((uint64_t{1} << uZeros) - 1 + Bits(uZeros));
    }
    // se(v), ITU-T H.264 9.1.1 and H.265 9.2.2.
    int64_t SE() noexcept
    {
        const uint32_t k = UE();
        return (k & 1) ? int64_t{k / 2} + 1 : -int64_t{k / 2};
    }

    // A ue(v) value checked against its largest legal value.
    uint32_t UE(uint32_t uMax) noexcept
    {
        const uint32_t v = UE();
        Require(v <= uMax);
        return v;
    }
    void Require(bool bOK) noexcept { bad_ = bad_ || (!bOK && !overrun_); }
    bool Failed() const noexcept { return bad_ || overrun_; }
    RbspError Error() const noexcept
    {
        return overrun_ ? RbspError::kTruncated : bad_ ? RbspError::kMalformed : RbspError::kNone;
    }

private:
    bool Fetch() noexcept
    {
        if (pos_ < n_ && zeros_ >= 2 && p_[pos_] == 0x03) {
            ++pos_;
            zeros_ = 0;
        }
        if (pos_ >= n_)
            return false;
        cur_ = p_[pos_++];
        zeros_ = cur_ == 0 ? zeros_ + 1 : 0;
        left_ = 8;
        return true;
    }

    const uint8_t *p_;
    size_t n_;
    size_t pos_ = 0;
    uint32_t cur_ = 0;
    uint32_t left_ = 0;  // unread bits of cur_
    uint32_t zeros_ = 0; // zero bytes just read
    bool overrun_ = false;
    bool bad_ = false;
};

// Table E-1 of ITU-T H.264 and H.265 (the same table): the sample aspect ratios of
// aspect_ratio_idc 1 to 16; 255 is Extended_SAR, 0 and 17-254 leave the ratio unspecified.
inline constexpr uint16_t kSampleAspectRatios[17][2] = {{0, 0},   {1, 1},   {12, 11}, {10, 11}, {16, 11}, {40, 33},
                                                        {24, 11}, {20, 11}, {32, 11}, {80, 33}, {18, 11}, {15, 11},
                                                        {64, 33}, {160, 99}, {4, 3},  {3, 2},   {2, 1}};
inline constexpr uint32_t kExtendedSar = 255;

// aspect_ratio_idc and, for Extended_SAR, sar_width and sar_height (E.1.1 and E.2.1). Ratios
// the table leaves unspecified keep *puNum and *puDen as they are.
inline void ReadSampleAspectRatio(RbspReader &r, uint32_t *puNum, uint32_t *puDen) noexcept
{
    const uint32_t uIdc = r.Bits(8);
    if (uIdc == kExtendedSar) {
        *puNum = r.Bits(16);
        *puDen = r.Bits(16);
    } else if (uIdc < std::size(kSampleAspectRatios)) {
        *puNum = kSampleAspectRatios[uIdc][0];
        *puDen = kSampleAspectRatios[uIdc][1];
    }
}

} // namespace vorcal::tools
