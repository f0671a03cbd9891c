// The system layer of the fuzz targets: malloc-backed memory that can be made to fail, traces
// formatted (so that every format argument is read) and dropped, and no files.
#pragma once

#include <cstddef>
#include <cstdint>

namespace vorcal::fuzz {

// The nth allocation from now (1-based) fails; 0 disarms.
void FailAllocation(uint32_t n);
// Blocks allocated and not freed since the process started.
size_t LiveBlocks();

// Reads fuzz input bytes front to back; past the end it yields zeros.
class Input {
public:
    Input(const uint8_t *pData, size_t uSize) : p_(pData), n_(uSize) {}
    uint8_t Byte() { return pos_ < n_ ? p_[pos_++] : 0; }
    uint32_t U32()
    {
        uint32_t v = 0;
        for (int i = 0; i < 4; ++i)
            v = (v << 8) | Byte();
        return v;
    }
    // The rest of the input.
    const uint8_t *Rest() const { return p_ ? p_ + pos_ : nullptr; }
    size_t RestSize() const { return n_ - pos_; }

private:
    const uint8_t *p_;
    size_t n_;
    size_t pos_ = 0;
};

} // namespace vorcal::fuzz
