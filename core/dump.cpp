// Frame dumping: four process-wide dump slots in the CAL handle.
#include "core/dump.hpp"

#include "core/handle.hpp"
#include "core/sal.hpp"

namespace vorcal::core {

bool IsDumpOpen(const CALHandle *hCAL, uint32_t uSlot) noexcept
{
    // A handle that is no longer the live one has been freed: its slots are gone.
    return hCAL && hCAL == LiveHandle() && uSlot < CAL_DUMP_SLOTS && hCAL->m_hDumpFile[uSlot] != 0;
}

void WriteDumpRecord(const CALHandle *hCAL, uint32_t uSlot, const uint8_t *pData,
                     int32_t iLen) noexcept
{
    if (!IsDumpOpen(hCAL, uSlot) || iLen < 0 || (!pData && iLen != 0))
        return;
    const SALFile hFile = hCAL->m_hDumpFile[uSlot];
    const uint32_t uLen = static_cast<uint32_t>(iLen);
    // CONTRACT: two writes, the length in host byte order then the payload; their results are
    // not examined.
    sal::WriteFile(hFile, &uLen, sizeof uLen);
    sal::WriteFile(hFile, pData, uLen);
}

} // namespace vorcal::core

extern "C" CALParam vorCAL_DumpFrames(CALHandle *hCAL, const char *pPath, uint32_t uSlot)
{
    using namespace vorcal;
    if (!hCAL || uSlot >= CAL_DUMP_SLOTS)
        return 0;
    // CONTRACT: the result is the new file handle; with a null path, the result of closing.
    CALParam uResult = 0;
    if (hCAL->m_hDumpFile[uSlot] != 0) {
        uResult = static_cast<CALParam>(sal::CloseFile(hCAL->m_hDumpFile[uSlot]));
        hCAL->m_hDumpFile[uSlot] = 0;
    }
    if (!pPath)
        return uResult;
    hCAL->m_hDumpFile[uSlot] = sal::OpenFile(pPath, SAL_FILE_MODE_WRITE);
    return hCAL->m_hDumpFile[uSlot];
}
