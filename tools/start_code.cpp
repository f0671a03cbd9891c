#include "tools/start_code.hpp"

namespace vorcal::tools {

size_t FindStartCodePrefix(const uint8_t *pData, size_t uFrom, size_t uEnd) noexcept
{
    if (uEnd < 3)
        return uEnd;
    // The byte two ahead decides how far to move: anything above 1 cannot end a prefix soon.
    for (size_t i = uFrom; i + 2 < uEnd;) {
        const uint8_t c = pData[i + 2];
        if (c > 1)
            i += 3;
        else if (c == 1 && pData[i] == 0 && pData[i + 1] == 0)
            return i;
        else
            ++i;
    }
    return uEnd;
}

} // namespace vorcal::tools
