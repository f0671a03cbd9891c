// The process-wide CAL handle, codec registration and codec instances.
#include <algorithm>
#include <cstring>

#include <vorcal/core.h>
#include <vorcal/wrapper.h>

#include "core/handle.hpp"
#include "core/sal.hpp"
#include "core/version.hpp"

namespace {

// The one handle; plain data, the engine serialises the core calls.
CALHandle *g_hCAL = nullptr;

} // namespace

const CALHandle *vorcal::core::LiveHandle() noexcept
{
    return g_hCAL;
}

extern "C" CALHandle *vorCAL_GetHandle(uint32_t /*uReserved*/, uint32_t uMajor, uint32_t uMinor)
{
    // CONTRACT: the version test comes first, also when a handle exists (its count stays).
    if (uMajor != vorcal::version::kMajor || uMinor != vorcal::version::kMinor)
        return nullptr;
    if (g_hCAL) {
        ++g_hCAL->m_uRefCount;
        return g_hCAL;
    }
    auto *hCAL = static_cast<CALHandle *>(vorcal::sal::Alloc(sizeof(CALHandle)));
    if (!hCAL)
        return nullptr;
    std::memset(hCAL, 0, sizeof *hCAL);
    hCAL->m_uRefCount = 1;
    g_hCAL = hCAL;
    return hCAL;
}

extern "C" void vorCAL_ReleaseHandle(CALHandle *hCAL)
{
    if (!g_hCAL || hCAL != g_hCAL)
        return;
    if (--hCAL->m_uRefCount != 0)
        return;
    _CE_FreeListAll(hCAL->m_pCodecList);
    hCAL->m_pCodecList = nullptr;
    for (SALFile &hFile : hCAL->m_hDumpFile) {
        if (hFile != 0) {
            vorcal::sal::CloseFile(hFile);
            hFile = 0;
        }
    }
    vorcal::sal::Free(hCAL);
    g_hCAL = nullptr;
}

extern "C" int32_t vorCAL_RegisterCodec(CALHandle *hCAL, uint32_t eMediaType, uint32_t eMode,
                                        uint32_t uCodecObjectTypeIndication, const void *pFunctions,
                                        uint32_t uFunctionsSize)
{
    if (!hCAL)
        return 0;
    CALCodecEntry *pEntry = _CE_New();
    if (!pEntry)
        return 0;
    pEntry->uCodecObjectTypeIndication = uCodecObjectTypeIndication;
    pEntry->uMediaType = static_cast<uint16_t>(eMediaType);
    pEntry->uCodecMode = static_cast<uint16_t>(eMode);
    // CONTRACT: at most six slots are copied, bytes beyond them are ignored; a shorter table
    // leaves the other slots null.
    const size_t uCopy = std::min<size_t>(uFunctionsSize, sizeof pEntry->Functions);
    if (pFunctions && uCopy)
        std::memcpy(pEntry->Functions, pFunctions, uCopy);
    if (_CE_Add(&hCAL->m_pCodecList, pEntry) == -1) {
        vorcal::sal::Free(pEntry); // registry full: the new entry is not kept
        return 0;
    }
    return 1;
}

extern "C" CALCodec *vorCAL_GetCodec(CALHandle *hCAL, uint32_t eMediaType, uint32_t eMode,
                                     uint32_t uCodecObjectTypeIndication)
{
    const CALCodecEntry *pEntry =
        _CE_Find(hCAL ? hCAL->m_pCodecList : nullptr, static_cast<uint16_t>(eMediaType & 0xFFFF),
                 static_cast<uint16_t>(eMode & 0xFFFF), uCodecObjectTypeIndication);
    if (!pEntry) {
        // CONTRACT: the documented message, "not be found" included.
        VORCAL_TRACE(vorcal::kTraceError, 0,
                     "[CAL %d] vorCAL_GetCodec() : Codec Handle not be found [eMediaType = %d, "
                     "eMode = %d, uCodecObjectTypeIndication = %d]\n",
                     __LINE__, static_cast<int>(eMediaType), static_cast<int>(eMode),
                     static_cast<int>(uCodecObjectTypeIndication));
        return nullptr;
    }
    auto *hCodec = static_cast<CALCodec *>(vorcal::sal::Alloc(sizeof(CALCodec)));
    if (!hCodec)
        return nullptr;
    std::memset(hCodec, 0, sizeof *hCodec);
    std::memcpy(hCodec->m_Functions, pEntry->Functions, sizeof hCodec->m_Functions);
    hCodec->m_uCodecObjectTypeIndication = uCodecObjectTypeIndication;
    hCodec->m_hCAL = hCAL;
    return hCodec;
}

extern "C" void vorCAL_ReleaseCodec(CALCodec *hCodec)
{
    if (!hCodec)
        return;
    // CONTRACT: the codec's Deinit is not called and the H.264 buffer is left to the Deinit
    // wrapper.
    if (hCodec->m_pSilenceFrame)
        vorcal::sal::Free(hCodec->m_pSilenceFrame);
    vorcal::sal::Free(hCodec);
}
