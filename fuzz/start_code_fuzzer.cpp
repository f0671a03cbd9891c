// Every start-code variant this CPU runs against a byte-by-byte reference: the search from the
// start the input chooses, and the copying search into a destination of exactly the room it
// chooses (so that a write past the room is caught). The data is a buffer of its own exact
// size, so that a read past its end is caught too.
// Input: start selector, room cut, then the data.
#include <algorithm>
#include <cstdint>
#include <vector>

#include "fuzz_sal.hpp"
#include "tools/start_code.hpp"

#define CHECK(x) ((x) ? void() : __builtin_trap())

namespace {

size_t Reference(const std::vector<uint8_t> &d, size_t from)
{
    for (size_t i = from; i + 2 < d.size(); ++i) {
        if (d[i] == 0 && d[i + 1] == 0 && d[i + 2] == 1)
            return i;
    }
    return d.size();
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *pData, size_t uSize)
{
    using namespace vorcal::tools;
    vorcal::fuzz::Input in(pData, uSize);
    const size_t uStart = in.Byte(), uCut = in.Byte();
    const std::vector<uint8_t> d(in.Rest(), in.Rest() + in.RestSize());
    const size_t n = d.size(), from = n != 0 ? uStart % n : 0, ref = Reference(d, from);
    const size_t room = n - from - std::min(uCut, n - from);
    for (const StartCodeVariant &v : StartCodeVariants()) {
        if (!v.pSupported())
            continue;
        UseStartCodeKernels(v.pKernels);
        CHECK(FindStartCodePrefix(d.data(), from, n) == ref);
        std::vector<uint8_t> dst(room);
        CHECK(FindStartCodePrefixCopy(d.data(), from, n, dst.data(), room) == ref);
        const auto first = d.begin() + std::ptrdiff_t(from);
        CHECK(std::equal(first, first + std::ptrdiff_t(std::min(ref - from, room)), dst.begin()));
    }
    UseStartCodeKernels(nullptr);
    return 0;
}
