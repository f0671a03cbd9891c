// Every start-code variant built for this target (portable, SSE2, AVX2, AVX-512BW, AVX-512VBMI
// or NEON), forced in turn, against a byte-by-byte reference: random data with dense and sparse
// zero bytes and planted prefixes, every start and end offset of a 64-byte block with the data
// ending at an inaccessible page, kilobyte frames across block and group edges, and the H.264
// fixtures. The variants come from the internal object library (the layer's are hidden).
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>
#if defined(__arm__) && defined(__linux__)
#include <sys/auxv.h>
#endif

#include <algorithm>
#include <fstream>
#include <iterator>
#include <random>
#include <string>
#include <string_view>
#include <vector>

#include "tools/start_code.hpp"

namespace {

using namespace vorcal::tools;
using Bytes = std::vector<uint8_t>;

size_t Reference(const uint8_t *d, size_t from, size_t end)
{
    for (size_t i = from; i + 2 < end; ++i) {
        if (d[i] == 0 && d[i + 1] == 0 && d[i + 2] == 1)
            return i;
    }
    return end;
}

// A copy of the bytes that ends where an inaccessible page begins: a read past the end faults.
class Guarded {
public:
    explicit Guarded(const Bytes &b)
    {
        const size_t page = static_cast<size_t>(sysconf(_SC_PAGESIZE));
        size_ = (b.size() + page - 1) / page * page + page;
        base_ = static_cast<uint8_t *>(
            mmap(nullptr, size_, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0));
        mprotect(base_ + size_ - page, page, PROT_NONE);
        data_ = base_ + size_ - page - b.size();
        std::copy(b.begin(), b.end(), data_);
    }
    ~Guarded() { munmap(base_, size_); }
    const uint8_t *data() const { return data_; }

private:
    uint8_t *base_, *data_;
    size_t size_;
};

// The search and the copying search with uRoom bytes of room on [from, end) of d, against the
// reference; the destination has guard bytes that must stay untouched.
testing::AssertionResult MatchesReference(const uint8_t *d, size_t from, size_t end, size_t room)
{
    const size_t ref = Reference(d, from, end);
    if (const size_t r = FindStartCodePrefix(d, from, end); r != ref)
        return testing::AssertionFailure() << "search " << r << ", reference " << ref;
    if (from > end)
        return testing::AssertionSuccess();
    Bytes dst(room + 16, 0xEE);
    if (const size_t r = FindStartCodePrefixCopy(d, from, end, dst.data(), room); r != ref)
        return testing::AssertionFailure() << "copying search " << r << ", reference " << ref;
    if (!std::equal(d + from, d + from + std::min(ref - from, room), dst.begin()))
        return testing::AssertionFailure() << "bytes before the prefix not copied";
    if (!std::all_of(dst.begin() + std::ptrdiff_t(room), dst.end(), [](uint8_t b) { return b == 0xEE; }))
        return testing::AssertionFailure() << "written at or past the room";
    return testing::AssertionSuccess();
}

// Zero bytes dense or sparse, a 01 often enough after them.
Bytes RandomBytes(std::mt19937 &rng, size_t n, unsigned rarity)
{
    Bytes d(n);
    for (auto &b : d) {
        const unsigned r = rng() % rarity;
        b = r == 0 ? 0 : (r == 1 ? 1 : static_cast<uint8_t>(rng() | 2));
    }
    return d;
}

void Plant(Bytes &d, size_t at)
{
    d[at] = d[at + 1] = 0;
    d[at + 2] = 1;
}

// Whether this CPU runs a variant: those the library may choose, and NEON on a 32-bit target
// that does not assume it when the kernel reports it (the library itself asks nothing).
bool RunsHere(const StartCodeVariant &variant)
{
    if (variant.pSupported())
        return true;
#if defined(__arm__) && defined(__linux__)
    constexpr unsigned long kHwcapNeon = 1ul << 12;
    return std::string_view(variant.pKernels->pName) == "neon" && (getauxval(AT_HWCAP) & kHwcapNeon) != 0;
#else
    return false;
#endif
}

class StartCodeKernel : public testing::TestWithParam<size_t> {
protected:
    void SetUp() override
    {
        const auto &variant = StartCodeVariants()[GetParam()];
        if (!RunsHere(variant))
            GTEST_SKIP() << variant.pKernels->pName << " is not supported by this CPU";
        UseStartCodeKernels(variant.pKernels);
    }
    void TearDown() override { UseStartCodeKernels(nullptr); }
};

TEST_P(StartCodeKernel, MatchesReferenceOnRandomData)
{
    std::mt19937 rng(99);
    for (int round = 0; round < 5000; ++round) {
        Bytes d = RandomBytes(rng, rng() % 400 + 3, (round % 2 ? 8u : 100000u) >> (round % 3));
        Plant(d, rng() % (d.size() - 2));
        const size_t end = rng() % (d.size() + 1), from = rng() % (end + 3);
        ASSERT_TRUE(MatchesReference(d.data(), from, end, rng() % (end + 40))) << round;
    }
    for (uint8_t last : {1, 2}) { // a long zero run, with and without its 01
        Bytes z(200, 0);
        z[199] = last;
        EXPECT_TRUE(MatchesReference(z.data(), 0, z.size(), z.size()));
    }
}

TEST_P(StartCodeKernel, EveryStartAndEndOffsetOfABlock)
{
    // The data ends at an inaccessible page and its length takes every offset of a 64-byte
    // block, below and above the size of a screened group with its unaligned first block; the
    // search starts at several offsets, the room ends with the data, on a block edge or anywhere;
    // a prefix sits at the end, one byte before, across the last block edge, or nowhere, or the
    // data ends in zeros.
    std::mt19937 rng(5);
    for (size_t first : {size_t{3}, size_t{300}}) {
        for (size_t len = first; len < first + 2 * 64; ++len) {
            for (int plant = 0; plant < 5; ++plant) {
                Bytes d = RandomBytes(rng, len, 64);
                std::replace(d.begin(), d.end(), uint8_t{1}, uint8_t{2});
                if (plant < 3)
                    Plant(d, len - 3 - std::min<size_t>(len - 3, plant == 2 ? 62 + rng() % 3 : plant));
                else if (plant == 3)
                    std::fill(d.end() - 3, d.end(), 0); // a zero run to the end, no 01
                const Guarded g(d);
                for (size_t from : {size_t{0}, size_t{1}, size_t{2}, size_t{63}, size_t(rng() % len)}) {
                    if (from >= len)
                        continue;
                    for (size_t room : {len - from, len - from - (len - from) % 64, size_t(rng() % (len - from + 1))})
                        ASSERT_TRUE(MatchesReference(g.data(), from, len, room))
                            << len << " " << plant << " " << from << " " << room;
                }
            }
        }
    }
}

TEST_P(StartCodeKernel, LargeFramesAcrossBlockAndGroupEdges)
{
    // Frames of several kilobytes reach the strided search and the screened groups, which both
    // start at 64-byte boundaries of the address; prefixes are planted with their first zero
    // pair across a 64- or 256-byte boundary of the address, at a stride edge, and at the end.
    std::mt19937 rng(7);
    for (int round = 0; round < 400; ++round) {
        Bytes d(4200 + rng() % 9000);
        for (auto &b : d)
            b = static_cast<uint8_t>(rng() | 2);
        const size_t toLine = (64 - reinterpret_cast<uintptr_t>(d.data()) % 64) % 64, lines = d.size() / 64 - 2;
        const size_t edges[] = {toLine + 64 * (rng() % lines) + 63, toLine + 64 * (rng() % lines) + 62,
                                toLine + 256 * (rng() % (lines / 4)) + 255, 2047, d.size() - 3};
        Plant(d, edges[round % 5] - (round % 5 < 3 ? 0 : rng() % 2));
        const size_t from = rng() % 3 == 0 ? 0 : rng() % 2000;
        ASSERT_TRUE(MatchesReference(d.data(), from, d.size(), d.size())) << round;
    }
}

TEST_P(StartCodeKernel, FindsEveryUnitOfTheFixtures)
{
    for (const char *name : {"baseline_176x144.h264", "main_320x180.h264", "main_320x180.nal"}) {
        std::ifstream in(std::string(VORCAL_TEST_DATA_DIR) + "/h264/" + name, std::ios::binary);
        const Bytes d{std::istreambuf_iterator<char>(in), {}};
        ASSERT_GT(d.size(), 1000u) << name;
        const Guarded g(d);
        size_t units = 0;
        for (size_t from = 0; from < d.size(); ++units) {
            ASSERT_TRUE(MatchesReference(g.data(), from, d.size(), d.size() - from)) << name << " at " << from;
            from = Reference(d.data(), from, d.size()) + 3;
        }
        EXPECT_GT(units, 5u) << name;
    }
}

std::string VariantName(const testing::TestParamInfo<size_t> &info)
{
    return StartCodeVariants()[info.param].pKernels->pName;
}

INSTANTIATE_TEST_SUITE_P(Variants, StartCodeKernel, testing::Range<size_t>(0, StartCodeVariants().size()), VariantName);

TEST(StartCodeDispatch, UsesTheWidestSupportedVariant)
{
    UseStartCodeKernels(nullptr);
    const auto variants = StartCodeVariants();
    const auto widest = std::find_if(variants.rbegin(), variants.rend(), [](const auto &v) { return v.pSupported(); });
    ASSERT_NE(widest, variants.rend());
    EXPECT_STREQ(ActiveStartCodeKernels().pName, widest->pKernels->pName);
}

} // namespace
