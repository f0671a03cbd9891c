// ADTS recognition over arbitrary buffers, DSI parsing, and header building checked against
// recognition: a built header always describes exactly one frame.
#include <cstdint>
#include <cstdlib>
#include <vector>

#include <vorcal/audio_tools.h>

#include "fuzz_sal.hpp"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    const std::vector<uint8_t> buffer(pData, pData + uSize); // exact size, so that over-reads are caught
    if (uSize <= INT32_MAX)
        vorCALTools_AAC_isADTSAAC(static_cast<int32_t>(uSize), buffer.data());
    if (uSize < 4)
        return 0;
    uint32_t uRate = 0, uChannels = 0, uSBR = 0;
    vorCALTools_AAC_ParseDSI(pData, &uRate, &uChannels, &uSBR);
    if (uChannels > 15 || uSBR > 1 || (uRate != 0 && uRate < 8000) || uRate > 96000)
        std::abort();
    // Raw lengths up to 8184 fit the 13-bit frame_length field.
    std::vector<uint8_t> frame((((pData[2] << 8) | pData[3]) % 8185) + 7u, 0);
    vorCALTools_Make_ADTS_Header(pData, static_cast<int32_t>(frame.size() - 7), frame.data());
    if (vorCALTools_AAC_isADTSAAC(static_cast<int32_t>(frame.size()), frame.data()) != 7)
        std::abort();
    return 0;
}
