// The codec entry list: a singly linked list of at most 100 entries with unique keys.
#include <cstring>

#include <vorcal/core.h>

#include "core/sal.hpp"

namespace {

bool SameKeys(const CALCodecEntry &a, const CALCodecEntry &b) noexcept
{
    return a.uMediaType == b.uMediaType && a.uCodecMode == b.uCodecMode &&
           a.uCodecObjectTypeIndication == b.uCodecObjectTypeIndication;
}

} // namespace

extern "C" CALCodecEntry *_CE_New(void)
{
    auto *pEntry = static_cast<CALCodecEntry *>(vorcal::sal::Alloc(sizeof(CALCodecEntry)));
    if (pEntry)
        std::memset(pEntry, 0, sizeof *pEntry);
    return pEntry;
}

extern "C" int32_t _CE_Add(CALCodecEntry **ppHead, CALCodecEntry *pNew)
{
    if (!ppHead || !pNew)
        return -1;
    if (!*ppHead) {
        pNew->pNext = nullptr;
        *ppHead = pNew;
        return 0;
    }
    uint32_t uExamined = 0;
    CALCodecEntry *pTail = nullptr;
    for (CALCodecEntry *pEntry = *ppHead; pEntry && uExamined < CAL_MAX_CODEC_ENTRIES;
         pEntry = pEntry->pNext) {
        ++uExamined;
        if (SameKeys(*pEntry, *pNew)) {
            // CONTRACT: a known key is replaced in place (result 1), keeping its position.
            CALCodecEntry *pNext = pEntry->pNext;
            *pEntry = *pNew;
            pEntry->pNext = pNext;
            vorcal::sal::Free(pNew);
            return 1;
        }
        pTail = pEntry;
    }
    if (uExamined >= CAL_MAX_CODEC_ENTRIES)
        return -1;
    pNew->pNext = nullptr;
    pTail->pNext = pNew;
    return 0;
}

extern "C" CALCodecEntry *_CE_Find(CALCodecEntry *pHead, uint16_t uMediaType, uint16_t uCodecMode,
                                   uint32_t uCodecObjectTypeIndication)
{
    uint32_t uExamined = 0;
    for (CALCodecEntry *pEntry = pHead; pEntry && uExamined < CAL_MAX_CODEC_ENTRIES;
         pEntry = pEntry->pNext, ++uExamined) {
        if (pEntry->uMediaType == uMediaType && pEntry->uCodecMode == uCodecMode &&
            pEntry->uCodecObjectTypeIndication == uCodecObjectTypeIndication)
            return pEntry;
    }
    return nullptr;
}

extern "C" void _CE_FreeListAll(CALCodecEntry *pHead)
{
    while (pHead) {
        CALCodecEntry *pNext = pHead->pNext;
        vorcal::sal::Free(pHead);
        pHead = pNext;
    }
}
