// A test-only AAC raw data block writer (ISO/IEC 13818-7 syntax), independent of the library:
// codewords come from the codebook data in aacparse/data, quantised values are packed by the
// codebooks' index formulas, with sign bits and escape sequences written as the standard lays
// them out.
#pragma once

#include <cstdint>
#include <cstdlib>
#include <fstream>
#include <map>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

#include "bit_writer.hpp"

namespace vorcal::test {

using Code = std::pair<uint32_t, unsigned>; // codeword, length

// The data lines of a table in aacparse/data, '#' comments left out; the column header fails
// the callers' numeric fields.
inline std::vector<std::string> TableLines(const std::string &name)
{
    std::ifstream in(VORCAL_AAC_TABLE_DIR "/" + name);
    std::vector<std::string> lines;
    for (std::string line; std::getline(in, line);)
        if (!line.empty() && line[0] != '#')
            lines.push_back(line);
    return lines;
}
inline Code CodeOf(const std::string &hex, int length)
{
    return {uint32_t(std::stoul(hex, nullptr, 16)), unsigned(length)};
}

// Spectral codebooks 1-11 by (codebook, index) and the scale factor codebook by difference.
struct AacCodebooks {
    std::map<std::pair<int, int>, Code> spectral;
    std::map<std::pair<int, int>, std::vector<int>> values; // the quantised values of each index
    std::map<int, Code> scalefactor;

    static const AacCodebooks &Get()
    {
        static const AacCodebooks books = [] {
            AacCodebooks b;
            std::string hex, values;
            int cb = 0, index = 0, length = 0, diff = 0;
            for (const std::string &line : TableLines("aac_spectral_codebooks.tsv"))
                if (std::istringstream row(line); row >> cb >> index >> length >> hex >> values) {
                    b.spectral[{cb, index}] = CodeOf(hex, length);
                    std::istringstream list(values);
                    for (std::string v; std::getline(list, v, ',');)
                        b.values[{cb, index}].push_back(std::stoi(v));
                }
            for (const std::string &line : TableLines("aac_scalefactor_codebook.tsv"))
                if (std::istringstream row(line); row >> index >> length >> hex >> diff)
                    b.scalefactor[diff] = CodeOf(hex, length);
            return b;
        }();
        return books;
    }
};

inline void PutCode(BitWriter &w, Code c) { w.Put(c.first, c.second); }
inline void PutScalefactorDiff(BitWriter &w, int diff)
{
    PutCode(w, AacCodebooks::Get().scalefactor.at(diff));
}

inline bool SignedBook(int cb) { return cb == 1 || cb == 2 || cb == 5 || cb == 6; }
inline unsigned Dimension(int cb) { return cb <= 4 ? 4 : 2; }

// Codewords of codebook cb for the lines (a multiple of its dimension); values beyond 15 in
// codebook 11 go out as escapes.
inline void PutLines(BitWriter &w, int cb, const std::vector<int> &lines)
{
    const unsigned dim = Dimension(cb);
    for (size_t j = 0; j < lines.size(); j += dim) {
        int q[4] = {};
        for (unsigned d = 0; d < dim; ++d)
            q[d] = SignedBook(cb) ? lines[j + d]
                                  : std::min(std::abs(lines[j + d]), cb == 11 ? 16 : 99);
        int index = 0;
        if (cb <= 2)
            index = 27 * (q[0] + 1) + 9 * (q[1] + 1) + 3 * (q[2] + 1) + (q[3] + 1);
        else if (cb <= 4)
            index = 27 * q[0] + 9 * q[1] + 3 * q[2] + q[3];
        else if (cb <= 6)
            index = 9 * (q[0] + 4) + (q[1] + 4);
        else
            index = (cb <= 8 ? 8 : cb <= 10 ? 13 : 17) * q[0] + q[1];
        PutCode(w, AacCodebooks::Get().spectral.at({cb, index}));
        if (!SignedBook(cb))
            for (unsigned d = 0; d < dim; ++d)
                if (lines[j + d] != 0)
                    w.PutBit(lines[j + d] < 0);
        for (unsigned d = 0; cb == 11 && d < dim; ++d)
            if (const int m = std::abs(lines[j + d]); m >= 16) {
                unsigned n = 0; // escape_prefix of n ones, the 0, then n + 4 bits of m - 2^(n+4)
                while ((m >> (n + 5)) != 0)
                    ++n;
                w.Put((1u << n) - 1, n).PutBit(0).Put(uint32_t(m) - (1u << (n + 4)), n + 4);
            }
    }
}

// ics_info of a long window (ONLY_LONG_SEQUENCE, no prediction).
inline void PutLongInfo(BitWriter &w, unsigned maxSfb)
{
    w.Put(0, 1).Put(0, 2).Put(0, 1).Put(maxSfb, 6).Put(0, 1);
}

// ics_info of an EIGHT_SHORT_SEQUENCE with its scale_factor_grouping bits.
inline void PutShortInfo(BitWriter &w, unsigned maxSfb, unsigned grouping)
{
    w.Put(0, 1).Put(2, 2).Put(1, 1).Put(maxSfb, 4).Put(grouping, 7);
}

// section_data of one group: (codebook, length) pairs, lengths in sectBits pieces with escapes.
inline void PutSections(BitWriter &w, const std::vector<std::pair<unsigned, unsigned>> &sections,
                        unsigned sectBits = 5)
{
    const unsigned esc = (1u << sectBits) - 1;
    for (auto [cb, len] : sections) {
        w.Put(cb, 4);
        for (; len >= esc; len -= esc)
            w.Put(esc, sectBits);
        w.Put(len, sectBits);
    }
}

// n zero bits (BitWriter::Put takes at most 32).
inline BitWriter &PutZeros(BitWriter &w, unsigned n)
{
    while (n--)
        w.PutBit(0);
    return w;
}

// Differences of 0 for n bands: a 1-bit code each.
inline void PutZeroScalefactors(BitWriter &w, unsigned n) { PutZeros(w, n); }

// pulse_data_present, tns_data_present and gain_control_data_present all 0.
inline void PutNoTools(BitWriter &w) { w.Put(0, 3); }

} // namespace vorcal::test
