// A test-only bit writer: builds bitstreams field by field (MSB first), with ue(v)/se(v) codes
// and H.264 emulation prevention, so that each field of a hand-built header is visible in the
// test that builds it.
#pragma once

#include <cstdint>
#include <vector>

namespace vorcal::test {

class BitWriter {
public:
    // Appends the low n bits of value (n up to 32), most significant first.
    BitWriter &Put(uint32_t value, unsigned n)
    {
        for (unsigned i = n; i-- > 0;)
            PutBit((value >> i) & 1u);
        return *this;
    }
    BitWriter &PutBit(uint32_t bit)
    {
        if (bitPos_ == 0)
            bytes_.push_back(0);
        if (bit)
            bytes_.back() |= static_cast<uint8_t>(0x80u >> bitPos_);
        bitPos_ = (bitPos_ + 1) & 7;
        return *this;
    }
    // ue(v), ITU-T H.264 9.1.
    BitWriter &PutUE(uint32_t value)
    {
        const uint64_t v = uint64_t{value} + 1;
        unsigned bits = 0;
        while ((v >> bits) > 1)
            ++bits;
        Put(0, bits);
        for (unsigned i = bits + 1; i-- > 0;)
            PutBit(static_cast<uint32_t>((v >> i) & 1u));
        return *this;
    }
    // se(v), ITU-T H.264 9.1.1.
    BitWriter &PutSE(int32_t value)
    {
        return PutUE(value > 0 ? static_cast<uint32_t>(2 * value - 1) : static_cast<uint32_t>(-2 * int64_t{value}));
    }
    BitWriter &PutBytes(const std::vector<uint8_t> &bytes)
    {
        for (uint8_t b : bytes)
            Put(b, 8);
        return *this;
    }
    // Pads with zero bits to a byte boundary.
    BitWriter &Align()
    {
        while (bitPos_ != 0)
            PutBit(0);
        return *this;
    }
    // rbsp_trailing_bits: a 1 bit, then zeros to the boundary.
    BitWriter &Trailing()
    {
        PutBit(1);
        return Align();
    }
    size_t BitCount() const { return bytes_.size() * 8 - (bitPos_ ? 8 - bitPos_ : 0); }
    const std::vector<uint8_t> &Bytes() const { return bytes_; }

    // Inserts emulation-prevention bytes (00 00 0x with x <= 3 -> 00 00 03 0x), ITU-T H.264 7.4.1.
    static std::vector<uint8_t> Escape(const std::vector<uint8_t> &rbsp)
    {
        std::vector<uint8_t> out;
        int zeros = 0;
        for (uint8_t b : rbsp) {
            if (zeros >= 2 && b <= 3) {
                out.push_back(3);
                zeros = 0;
            }
            out.push_back(b);
            zeros = b == 0 ? zeros + 1 : 0;
        }
        return out;
    }

private:
    std::vector<uint8_t> bytes_;
    unsigned bitPos_ = 0;
};

} // namespace vorcal::test
