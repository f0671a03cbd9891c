// Builders and readers for HEVC tests: units with their two-byte header, the fixtures of
// tests/data/hevc with their reports, and hvcC records built field by field.
#pragma once

#include <cstdint>
#include <cstdio>
#include <fstream>
#include <map>
#include <sstream>
#include <string>
#include <vector>

#include <vorcal/video_tools.h>

#include "avc_streams.hpp"

namespace vorcal::test {

// nal_unit_header() (ITU-T H.265 7.3.1.2) and the payload.
inline Bytes Hevc(uint32_t uType, const Bytes &payload = {0xAF}, uint32_t uLayer = 0, uint32_t uTidPlus1 = 1)
{
    return Cat({{uint8_t((uType << 1) | (uLayer >> 5)), uint8_t(((uLayer & 31) << 3) | uTidPlus1)}, payload});
}

inline Bytes ReadHevcFixture(const std::string &name)
{
    std::ifstream in(std::string(VORCAL_TEST_DATA_DIR) + "/hevc/" + name, std::ios::binary);
    return Bytes((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
}

// A report of tests/data/hevc: the packets ("frame OFFSET SIZE PICT_TYPE KEY") cut from the file
// it describes, and its header lines.
struct HevcReport {
    std::map<std::string, std::string> fields;
    std::vector<Bytes> packets;
    std::vector<bool> keys;
};

inline HevcReport ReadHevcReport(const std::string &name)
{
    const Bytes all = ReadHevcFixture(name);
    std::ifstream in(std::string(VORCAL_TEST_DATA_DIR) + "/hevc/" + name + ".txt");
    HevcReport r;
    for (std::string line; std::getline(in, line);) {
        std::istringstream f(line);
        std::string key, type;
        size_t at = 0, size = 0;
        bool bKey = false;
        if (!(f >> key))
            continue;
        if (key == "frame" && f >> at >> size >> type >> bKey && at + size <= all.size()) {
            r.packets.emplace_back(all.begin() + std::ptrdiff_t(at), all.begin() + std::ptrdiff_t(at + size));
            r.keys.push_back(bKey);
        } else {
            std::getline(f >> std::ws, r.fields[key]);
        }
    }
    return r;
}

// A stream as decode_128x96.decode.txt records it: "SIZE FNV1A64" (the sum in 16 hex digits).
inline std::string Sum(const Bytes &d)
{
    uint64_t h = 0xCBF29CE484222325ull;
    for (uint8_t b : d)
        h = (h ^ b) * 0x100000001B3ull;
    char text[40];
    std::snprintf(text, sizeof text, "%zu %016llx", d.size(), static_cast<unsigned long long>(h));
    return text;
}

// The "key=value" lines of a .probe sidecar (ffprobe's stream fields and "sps.NAME" elements).
inline std::map<std::string, std::string> ReadProbe(const std::string &name)
{
    std::ifstream in(std::string(VORCAL_TEST_DATA_DIR) + "/hevc/" + name + ".probe");
    std::map<std::string, std::string> m;
    for (std::string line; std::getline(in, line);)
        if (const size_t eq = line.find('='); eq != std::string::npos)
            m.emplace(line.substr(0, eq), line.substr(eq + 1)); // the first SPS's value stays
    return m;
}

// The units of a frame in either framing (0: start codes), through the exported walk.
inline std::vector<Bytes> HevcUnits(const Bytes &d, int32_t iSize = 0, int32_t *piResult = nullptr)
{
    std::vector<Bytes> units;
    CALHEVCNAL u{};
    int32_t r;
    while ((r = vorCALTools_HEVC_NextNAL(d.data(), int32_t(d.size()), iSize, &u)) == 1)
        units.emplace_back(u.pUnit, u.pUnit + u.iLen);
    if (piResult)
        *piResult = r;
    return units;
}

// An hvcC record: configurationVersion 1, the 21 bytes given (general_profile_space to
// lengthSizeMinusOne), numOfArrays and the arrays as {array_completeness << 7 | NAL_unit_type,
// units}, each unit behind a 16-bit length.
inline Bytes HvcC(const Bytes &fixed, const std::vector<std::pair<uint8_t, std::vector<Bytes>>> &arrays)
{
    Bytes out = Cat({{1}, fixed, {uint8_t(arrays.size())}});
    for (const auto &[header, units] : arrays) {
        out = Cat({out, {header, uint8_t(units.size() >> 8), uint8_t(units.size())}});
        for (const Bytes &u : units)
            out = Cat({out, {uint8_t(u.size() >> 8), uint8_t(u.size())}, u});
    }
    return out;
}

} // namespace vorcal::test
