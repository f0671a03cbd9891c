// The bytes of one input: a regular file (seekable, its size known), standard input, a pipe or a
// FIFO (read front to back only), or a block of memory (tests and fuzz targets). Offsets are 64
// bits wide on every target.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <vector>

#include "common.hpp"

namespace vorcal::cli {

class Input {
public:
    // Opens PATH, or standard input for "-". A directory is refused. A FIFO is opened without
    // blocking and waits at most iWaitSeconds for a writer to connect.
    static std::unique_ptr<Input> Open(const std::string &path, int iWaitSeconds, Failure &failure);
    // Wraps caller-owned bytes that outlive the Input; bSeekable false makes it behave as a pipe
    // that delivers at most uMaxRead bytes per read.
    static std::unique_ptr<Input> FromMemory(const uint8_t *pData, size_t uSize, bool bSeekable = true,
                                             size_t uMaxRead = SIZE_MAX);

    ~Input();
    Input(const Input &) = delete;
    Input &operator=(const Input &) = delete;

    bool Seekable() const { return bSeekable_; }
    // Bytes of a seekable input.
    uint64_t Size() const { return uSize_; }

    // Sequential reading from the current position: up to uWant bytes into pDst. Returns false
    // on a read error; uGot 0 means the end of the input.
    bool Read(uint8_t *pDst, size_t uWant, size_t &uGot, Failure &failure);
    // Reads exactly uWant bytes; false with a failure naming the offset when the input ends first.
    bool ReadExact(uint8_t *pDst, size_t uWant, Failure &failure, const char *pWhat);
    // Skips uCount bytes; uSkipped tells how many there were.
    bool Skip(uint64_t uCount, uint64_t &uSkipped, Failure &failure);
    // Offset of the next byte Read returns.
    uint64_t Position() const { return uPosition_; }

    // The next bytes, at most uWant, without consuming them (fewer only at the end).
    std::span<const uint8_t> Peek(size_t uWant, Failure &failure);

    // Seekable inputs only: exactly uWant bytes at uOffset; false when they are not all there.
    bool ReadAt(uint64_t uOffset, uint8_t *pDst, size_t uWant, Failure &failure);

private:
    Input() = default;
    bool RawRead(uint8_t *pDst, size_t uWant, size_t &uGot, Failure &failure);

    int iFd_ = -1;
    bool bOwnFd_ = false;
    bool bSeekable_ = false;
    uint64_t uSize_ = 0;
    uint64_t uPosition_ = 0;
    const uint8_t *pMemory_ = nullptr; // memory inputs
    size_t uMaxRead_ = SIZE_MAX;
    uint64_t uRawPosition_ = 0;        // offset of the next byte the source delivers
    std::vector<uint8_t> peeked_;      // bytes read ahead by Peek, not yet consumed
    size_t uPeekedPos_ = 0;
};

} // namespace vorcal::cli
