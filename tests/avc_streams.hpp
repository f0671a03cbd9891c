// Builders for H.264 test streams: units framed with start codes or length fields, and a
// hand-made slice whose frame_num position is visible in the test.
#pragma once

#include <cstdint>
#include <initializer_list>
#include <vector>

#include "bit_writer.hpp"

namespace vorcal::test {

using Bytes = std::vector<uint8_t>;

inline Bytes Cat(std::initializer_list<Bytes> parts)
{
    Bytes out;
    for (const Bytes &p : parts)
        out.insert(out.end(), p.begin(), p.end());
    return out;
}

// Units behind start codes of codeLength (3 or 4) bytes.
inline Bytes AnnexB(std::initializer_list<Bytes> units, int codeLength = 4)
{
    Bytes out;
    for (const Bytes &u : units)
        out = Cat({out, codeLength == 4 ? Bytes{0, 0, 0, 1} : Bytes{0, 0, 1}, u});
    return out;
}

// Units behind big-endian length fields of `size` bytes.
inline Bytes LengthPrefixed(std::initializer_list<Bytes> units, int size)
{
    Bytes out;
    for (const Bytes &u : units) {
        const Bytes field{uint8_t(u.size() >> 24), uint8_t(u.size() >> 16), uint8_t(u.size() >> 8), uint8_t(u.size())};
        out = Cat({out, Bytes(field.end() - size, field.end()), u});
    }
    return out;
}

// A slice unit: first_mb_in_slice, slice_type, pic_parameter_set_id, then `key` as a ue(v) in
// the place of frame_num (what separates pictures for vorCALTools_AVC_GetOneFrame).
inline Bytes Slice(uint8_t header, uint32_t key)
{
    BitWriter w;
    w.PutUE(0).PutUE(header == 0x65 ? 7 : 5).PutUE(0).PutUE(key).Trailing();
    return Cat({{header}, BitWriter::Escape(Cat({w.Bytes(), {0x80, 0x81, 0x82, 0x83, 0x84, 0x85}}))});
}

inline const Bytes kSps{0x67, 0x42, 0xC0, 0x1E, 0xDA, 0x02, 0x80, 0xBF, 0xE5}, kPps{0x68, 0xCE, 0x38, 0x80},
    kSei{0x06, 0x05, 0x02, 0xAA, 0xBB, 0x80};

} // namespace vorcal::test
