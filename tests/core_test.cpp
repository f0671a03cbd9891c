// The CAL handle, the codec registry and codec instances.
#include <array>

#include <gtest/gtest.h>

#include <vorcal/core.h>
#include <vorcal/wrapper.h>

#include "recording_codec.hpp"
#include "recording_sal.hpp"

using vorcal::test::RecordingCodec;
using vorcal::test::RecordingSal;

namespace {

class CoreTest : public ::testing::Test {
protected:
    void SetUp() override
    {
        RecordingSal::Get().Reset();
        RecordingCodec::Get().Reset();
    }
    void TearDown() override
    {
        // Every test releases what it made: nothing may stay allocated or be freed twice.
        EXPECT_TRUE(RecordingSal::Get().liveBlocks.empty());
        EXPECT_EQ(RecordingSal::Get().badFrees, 0u);
    }
    static CALCodecFunc Fn(uintptr_t v) { return reinterpret_cast<CALCodecFunc>(v); }
    // A six-slot table whose slots are distinct markers, so that copies can be told apart.
    static std::array<CALCodecFunc, 6> Marked(uintptr_t base)
    {
        return {Fn(base + 1), Fn(base + 2), Fn(base + 3), Fn(base + 4), Fn(base + 5), Fn(base + 6)};
    }
};

TEST_F(CoreTest, HandleIsCountedAndRecreatedEmpty)
{
    CALHandle *h1 = vorCAL_GetHandle(7, 1, 1);
    ASSERT_NE(h1, nullptr);
    EXPECT_EQ(h1->m_uRefCount, 1u);
    EXPECT_EQ(h1->m_pCodecList, nullptr);
    for (SALFile f : h1->m_hDumpFile)
        EXPECT_EQ(f, 0u);
    EXPECT_EQ(vorCAL_GetHandle(0, 1, 1), h1);
    EXPECT_EQ(h1->m_uRefCount, 2u);

    // Wrong versions are refused first and leave the count alone.
    EXPECT_EQ(vorCAL_GetHandle(0, 1, 2), nullptr);
    EXPECT_EQ(vorCAL_GetHandle(0, 2, 1), nullptr);
    EXPECT_EQ(h1->m_uRefCount, 2u);

    auto table = Marked(0x100);
    ASSERT_EQ(vorCAL_RegisterCodec(h1, 1, 1, 0x40, table.data(), sizeof table), 1);
    vorCAL_ReleaseHandle(h1);
    EXPECT_EQ(h1->m_uRefCount, 1u);
    vorCAL_ReleaseHandle(h1);
    EXPECT_TRUE(RecordingSal::Get().liveBlocks.empty()); // handle and entry freed

    CALHandle *h2 = vorCAL_GetHandle(0, 1, 1);
    ASSERT_NE(h2, nullptr);
    EXPECT_EQ(h2->m_pCodecList, nullptr);
    EXPECT_EQ(vorCAL_GetCodec(h2, 1, 1, 0x40), nullptr);
    vorCAL_ReleaseHandle(h2);
}

TEST_F(CoreTest, ReleaseOfAForeignPointerIsIgnored)
{
    vorCAL_ReleaseHandle(nullptr); // no handle at all
    CALHandle *h = vorCAL_GetHandle(0, 1, 1);
    CALHandle other{};
    other.m_uRefCount = 1;
    vorCAL_ReleaseHandle(&other);
    EXPECT_EQ(other.m_uRefCount, 1u);
    EXPECT_EQ(h->m_uRefCount, 1u);
    EXPECT_EQ(RecordingSal::Get().freeCount, 0u);
    vorCAL_ReleaseHandle(h);
}

TEST_F(CoreTest, OnlyTheLow16BitsOfMediaTypeAndModeAreKeys)
{
    CALHandle *h = vorCAL_GetHandle(0, 1, 1);
    auto table = Marked(0x200);
    ASSERT_EQ(vorCAL_RegisterCodec(h, 0x10001, 0x20002, 0xC1, table.data(), sizeof table), 1);
    ASSERT_NE(h->m_pCodecList, nullptr);
    EXPECT_EQ(h->m_pCodecList->uMediaType, 1);
    EXPECT_EQ(h->m_pCodecList->uCodecMode, 2);

    CALCodec *c = vorCAL_GetCodec(h, 1, 2, 0xC1);
    ASSERT_NE(c, nullptr);
    // The OTI is compared on all 32 bits.
    RecordingSal::Get().traces.clear();
    EXPECT_EQ(vorCAL_GetCodec(h, 1, 2, 0x1C1), nullptr);
    vorCAL_ReleaseCodec(c);
    vorCAL_ReleaseHandle(h);
}

TEST_F(CoreTest, SameKeysReplaceInPlace)
{
    CALHandle *h = vorCAL_GetHandle(0, 1, 1);
    auto a = Marked(0x100), b = Marked(0x200), c = Marked(0x300);
    EXPECT_EQ(vorCAL_RegisterCodec(h, 1, 1, 1, a.data(), sizeof a), 1);
    EXPECT_EQ(vorCAL_RegisterCodec(h, 2, 1, 1, b.data(), sizeof b), 1);
    EXPECT_EQ(vorCAL_RegisterCodec(h, 1, 1, 1, c.data(), sizeof c), 1);
    CALCodecEntry *first = h->m_pCodecList;
    ASSERT_NE(first, nullptr);
    ASSERT_NE(first->pNext, nullptr);
    EXPECT_EQ(first->pNext->pNext, nullptr); // two entries
    EXPECT_EQ(first->uMediaType, 1);
    EXPECT_EQ(first->Functions[0], c[0]);     // the second table, at the first one's place
    EXPECT_EQ(first->Functions[5], c[5]);
    EXPECT_EQ(first->pNext->Functions[0], b[0]);
    // The replacement's own entry was freed: only the handle and two entries are live.
    EXPECT_EQ(RecordingSal::Get().liveBlocks.size(), 3u);
    vorCAL_ReleaseHandle(h);
}

TEST_F(CoreTest, RegistryHoldsAtMost100Entries)
{
    CALHandle *h = vorCAL_GetHandle(0, 1, 1);
    auto t = Marked(0x100);
    for (uint32_t oti = 0; oti < 100; ++oti)
        ASSERT_EQ(vorCAL_RegisterCodec(h, 3, 4, oti, t.data(), sizeof t), 1) << oti;
    auto u = Marked(0x900);
    const uint32_t before = RecordingSal::Get().liveBlocks.size();
    EXPECT_EQ(vorCAL_RegisterCodec(h, 3, 4, 100, u.data(), sizeof u), 0); // the 101st distinct key
    EXPECT_EQ(RecordingSal::Get().liveBlocks.size(), before);             // its entry was freed
    EXPECT_EQ(vorCAL_RegisterCodec(h, 3, 4, 99, u.data(), sizeof u), 1); // a present key still replaces
    EXPECT_EQ(_CE_Find(h->m_pCodecList, 3, 4, 99)->Functions[0], u[0]);
    EXPECT_EQ(_CE_Find(h->m_pCodecList, 3, 4, 100), nullptr);
    vorCAL_ReleaseHandle(h);
}

TEST_F(CoreTest, RegistrationCopiesAtMostSixSlots)
{
    CALHandle *h = vorCAL_GetHandle(0, 1, 1);
    std::array<CALCodecFunc, 8> big{};
    for (size_t i = 0; i < big.size(); ++i)
        big[i] = Fn(0x10 + i);
    EXPECT_EQ(vorCAL_RegisterCodec(h, 1, 1, 1, big.data(), sizeof big), 1);
    auto shortTable = Marked(0x20);
    EXPECT_EQ(vorCAL_RegisterCodec(h, 1, 1, 2, shortTable.data(), 2 * sizeof(CALCodecFunc)), 1);
    const CALCodecEntry *e1 = _CE_Find(h->m_pCodecList, 1, 1, 1);
    const CALCodecEntry *e2 = _CE_Find(h->m_pCodecList, 1, 1, 2);
    EXPECT_EQ(e1->Functions[5], Fn(0x15));
    EXPECT_EQ(e2->Functions[1], shortTable[1]);
    EXPECT_EQ(e2->Functions[2], nullptr);
    EXPECT_EQ(e2->Functions[5], nullptr);
    vorCAL_ReleaseHandle(h);
}

TEST_F(CoreTest, GetCodecCreatesAFreshInstanceEachTime)
{
    CALHandle *h = vorCAL_GetHandle(0, 1, 1);
    auto t = Marked(0x500);
    vorCAL_RegisterCodec(h, 5, 6, 0xD0, t.data(), sizeof t);
    CALCodec *a = vorCAL_GetCodec(h, 5, 6, 0xD0);
    CALCodec *b = vorCAL_GetCodec(h, 0x70005, 0x80006, 0xD0);
    ASSERT_NE(a, nullptr);
    ASSERT_NE(b, nullptr);
    EXPECT_NE(a, b);
    for (int i = 0; i < 6; ++i)
        EXPECT_EQ(a->m_Functions[i], t[i]);
    EXPECT_EQ(a->m_uCodecObjectTypeIndication, 0xD0u);
    EXPECT_EQ(a->m_hCAL, h);
    EXPECT_EQ(a->m_uUserData, 0u);
    EXPECT_EQ(a->m_pSilenceFrame, nullptr);
    EXPECT_EQ(a->m_pIntermediateFrame, nullptr);
    EXPECT_EQ(a->m_uH264NALSize, 0u);
    EXPECT_EQ(RecordingSal::Get().allocSizes.back(), sizeof(CALCodec));

    // Registration after instances exist leaves their copied tables alone.
    auto u = Marked(0x600);
    vorCAL_RegisterCodec(h, 5, 6, 0xD0, u.data(), sizeof u);
    EXPECT_EQ(a->m_Functions[0], t[0]);

    // Release frees the cached silence frame but not the intermediate buffer.
    a->m_pSilenceFrame = static_cast<uint8_t *>(RecordingSal::Get().Alloc(8));
    a->m_uSilenceFrameLen = 8;
    vorCAL_ReleaseCodec(a);
    vorCAL_ReleaseCodec(b);
    vorCAL_ReleaseCodec(nullptr);
    vorCAL_ReleaseHandle(h);
}

TEST_F(CoreTest, UnknownKeyIsTracedWithTheArgumentsAsPassed)
{
    CALHandle *h = vorCAL_GetHandle(0, 1, 1);
    EXPECT_EQ(vorCAL_GetCodec(h, 0x10002, 3, 0xC1), nullptr);
    EXPECT_TRUE(vorcal::test::HasTrace(
        11, 0,
        "[CAL %d] vorCAL_GetCodec() : Codec Handle not be found [eMediaType = %d, eMode = %d, "
        "uCodecObjectTypeIndication = %d]\n",
        "[CAL #] vorCAL_GetCodec() : Codec Handle not be found [eMediaType = 65538, eMode = 3, "
        "uCodecObjectTypeIndication = 193]\n"));
    vorCAL_ReleaseHandle(h);
}

// Every allocation of a registration session, failed in turn: the failing call reports it and
// nothing leaks or is written through a null pointer.
TEST_F(CoreTest, EveryAllocationCanFail)
{
    auto t = Marked(0x100);
    for (uint32_t n = 1; n <= 3; ++n) {
        RecordingSal::Get().Reset();
        RecordingSal::Get().FailAllocation(n);
        CALHandle *h = vorCAL_GetHandle(0, 1, 1);
        if (n == 1) {
            EXPECT_EQ(h, nullptr); // no handle is created, the global stays empty
            EXPECT_TRUE(RecordingSal::Get().liveBlocks.empty());
            continue;
        }
        ASSERT_NE(h, nullptr);
        const int32_t reg = vorCAL_RegisterCodec(h, 1, 1, 1, t.data(), sizeof t);
        EXPECT_EQ(reg, n == 2 ? 0 : 1);
        CALCodec *c = vorCAL_GetCodec(h, 1, 1, 1);
        EXPECT_EQ(c == nullptr, n == 2 || n == 3);
        vorCAL_ReleaseCodec(c);
        vorCAL_ReleaseHandle(h);
        EXPECT_TRUE(RecordingSal::Get().liveBlocks.empty()) << n;
    }
    // With no memory at all every creating call reports failure.
    RecordingSal::Get().Reset();
    RecordingSal::Get().failAll = true;
    EXPECT_EQ(vorCAL_GetHandle(0, 1, 1), nullptr);
    EXPECT_EQ(_CE_New(), nullptr);
}

TEST(Version, StringsAndNumbers)
{
    EXPECT_STREQ(vorCAL_GetVersion(), "0x00000001.0x00000001.0x00000002.");
    EXPECT_STREQ(vorCAL_GetVersionInfo(),
                 "Tessalinova Codec Adaptation Layer Library Version Prx 0x00000001.0x00000001.0x00000002. "
                 "Build Date Jan  2 2012");
    EXPECT_EQ(vorCAL_GetVersionNum(0), 1);
    EXPECT_EQ(vorCAL_GetVersionNum(1), 1);
    EXPECT_EQ(vorCAL_GetVersionNum(2), 2);
    EXPECT_EQ(vorCAL_GetVersionNum(3), 0);
    EXPECT_EQ(vorCAL_GetVersionNum(0xFFFFFFFF), 0);
}

} // namespace
