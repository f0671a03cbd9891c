// ADTS recognition over arbitrary buffers, DSI parsing, and header building checked against
// recognition: a built header always describes exactly one frame.
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <vector>

#include <vorcal/audio_tools.h>

#include "fuzz_sal.hpp"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    // The whole input as one exact-size buffer, so that any read past it is caught.
    const std::vector<uint8_t> buffer(pData, pData + uSize);
    if (uSize <= INT32_MAX)
        vorCALTools_AAC_isADTSAAC(static_cast<int32_t>(uSize), buffer.data());
    if (uSize >= 6)
        (void)_GetAACFrameLength(buffer.data());
    if (uSize < 2)
        return 0;

    vorcal::fuzz::Input in(pData, uSize);
    const uint8_t dsi[2] = {in.Byte(), in.Byte()};
    uint32_t uRate = 0, uChannels = 0, uSBR = 0;
    vorCALTools_AAC_ParseDSI(dsi, &uRate, &uChannels, &uSBR);
    if (uChannels > 15 || uSBR > 1 || (uRate != 0 && uRate < 8000) || uRate > 96000)
        std::abort();

    // Raw lengths up to 8184 fit the 13-bit frame_length field.
    const int32_t iRaw = static_cast<int32_t>(((in.Byte() << 8) | in.Byte()) % 8185);
    std::vector<uint8_t> frame(static_cast<size_t>(iRaw) + 7, 0);
    vorCALTools_Make_ADTS_Header(dsi, iRaw, frame.data());
    if (_GetAACFrameLength(frame.data()) != frame.size() ||
        vorCALTools_AAC_isADTSAAC(static_cast<int32_t>(frame.size()), frame.data()) != 7)
        std::abort();
    return 0;
}
