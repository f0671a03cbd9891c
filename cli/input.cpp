#include "input.hpp"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <poll.h>
#include <sys/stat.h>
#include <unistd.h>

namespace vorcal::cli {

namespace {

// Waits for a writer on a FIFO opened without blocking: data or a hang-up ends the wait.
bool WaitForWriter(int iFd, int iWaitSeconds, Failure &failure)
{
    struct pollfd poll_fd = {iFd, POLLIN, 0};
    for (;;) {
        const int r = poll(&poll_fd, 1, iWaitSeconds * 1000);
        if (r > 0)
            break;
        if (r == 0) {
            failure.SetNoOffset(Sprintf("no writer opened the FIFO within %d s", iWaitSeconds));
            return false;
        }
        if (errno != EINTR) {
            failure.SetNoOffset(std::strerror(errno));
            return false;
        }
    }
    // From here on reads block as on any pipe.
    const int iFlags = fcntl(iFd, F_GETFL);
    if (iFlags < 0 || fcntl(iFd, F_SETFL, iFlags & ~O_NONBLOCK) < 0) {
        failure.SetNoOffset(std::strerror(errno));
        return false;
    }
    return true;
}

} // namespace

std::unique_ptr<Input> Input::Open(const std::string &path, int iWaitSeconds, Failure &failure)
{
    std::unique_ptr<Input> input(new Input);
    if (path == "-") {
        input->iFd_ = STDIN_FILENO;
    } else {
        struct stat info {};
        if (stat(path.c_str(), &info) != 0) {
            failure.SetNoOffset(std::strerror(errno));
            return nullptr;
        }
        if (S_ISDIR(info.st_mode)) {
            failure.SetNoOffset("is a directory, not a file");
            return nullptr;
        }
        const bool bFifo = S_ISFIFO(info.st_mode);
        input->iFd_ = open(path.c_str(), O_RDONLY | O_CLOEXEC | (bFifo ? O_NONBLOCK : 0));
        if (input->iFd_ < 0) {
            failure.SetNoOffset(std::strerror(errno));
            return nullptr;
        }
        input->bOwnFd_ = true;
        if (bFifo && !WaitForWriter(input->iFd_, iWaitSeconds, failure))
            return nullptr;
    }
    struct stat info {};
    if (fstat(input->iFd_, &info) != 0) {
        failure.SetNoOffset(std::strerror(errno));
        return nullptr;
    }
    if (S_ISDIR(info.st_mode)) {
        failure.SetNoOffset("is a directory, not a file");
        return nullptr;
    }
    if (S_ISREG(info.st_mode)) {
        input->bSeekable_ = true;
        input->uSize_ = static_cast<uint64_t>(info.st_size);
        // Standard input may be a file opened at some offset: read from where it stands.
        const off_t iAt = lseek(input->iFd_, 0, SEEK_CUR);
        input->uRawPosition_ = input->uPosition_ = iAt > 0 ? static_cast<uint64_t>(iAt) : 0;
    }
    return input;
}

std::unique_ptr<Input> Input::FromMemory(const uint8_t *pData, size_t uSize, bool bSeekable, size_t uMaxRead)
{
    std::unique_ptr<Input> input(new Input);
    input->pMemory_ = pData;
    input->uMaxRead_ = uMaxRead ? uMaxRead : 1;
    input->uSize_ = uSize;
    input->bSeekable_ = bSeekable;
    return input;
}

Input::~Input()
{
    if (bOwnFd_)
        close(iFd_);
}

bool Input::RawRead(uint8_t *pDst, size_t uWant, size_t &uGot, Failure &failure)
{
    uGot = 0;
    if (pMemory_ || iFd_ < 0) {
        const uint64_t uLeft = uRawPosition_ < uSize_ ? uSize_ - uRawPosition_ : 0;
        uGot = static_cast<size_t>(std::min<uint64_t>(std::min(uWant, uMaxRead_), uLeft));
        if (uGot)
            std::memcpy(pDst, pMemory_ + uRawPosition_, uGot);
        uRawPosition_ += uGot;
        return true;
    }
    for (;;) {
        const ssize_t n = read(iFd_, pDst, uWant);
        if (n >= 0) {
            uGot = static_cast<size_t>(n);
            uRawPosition_ += uGot;
            return true;
        }
        if (errno != EINTR) {
            failure.Set(uRawPosition_, Sprintf("read error: %s", std::strerror(errno)));
            return false;
        }
    }
}

bool Input::Read(uint8_t *pDst, size_t uWant, size_t &uGot, Failure &failure)
{
    uGot = 0;
    if (uPeekedPos_ < peeked_.size()) {
        uGot = std::min(uWant, peeked_.size() - uPeekedPos_);
        std::memcpy(pDst, peeked_.data() + uPeekedPos_, uGot);
        uPeekedPos_ += uGot;
        if (uPeekedPos_ == peeked_.size()) {
            peeked_.clear();
            uPeekedPos_ = 0;
        }
        uPosition_ += uGot;
        return true;
    }
    if (!RawRead(pDst, uWant, uGot, failure))
        return false;
    uPosition_ += uGot;
    return true;
}

bool Input::ReadExact(uint8_t *pDst, size_t uWant, Failure &failure, const char *pWhat)
{
    const uint64_t uStart = uPosition_;
    size_t uDone = 0;
    while (uDone < uWant) {
        size_t uGot = 0;
        if (!Read(pDst + uDone, uWant - uDone, uGot, failure))
            return false;
        if (uGot == 0) {
            failure.Set(uStart, Sprintf("truncated: %s needs %zu bytes, the input ends after %zu", pWhat,
                                       uWant, uDone));
            return false;
        }
        uDone += uGot;
    }
    return true;
}

bool Input::Skip(uint64_t uCount, uint64_t &uSkipped, Failure &failure)
{
    uSkipped = 0;
    const size_t uFromPeek = static_cast<size_t>(std::min<uint64_t>(uCount, peeked_.size() - uPeekedPos_));
    uPeekedPos_ += uFromPeek;
    uSkipped += uFromPeek;
    uPosition_ += uFromPeek;
    if (uPeekedPos_ == peeked_.size()) {
        peeked_.clear();
        uPeekedPos_ = 0;
    }
    if (uSkipped == uCount)
        return true;
    if (bSeekable_) {
        // Nothing to read: the size is known and the next read starts at the new position.
        const uint64_t uLeft = uSize_ > uRawPosition_ ? uSize_ - uRawPosition_ : 0;
        const uint64_t uStep = std::min(uCount - uSkipped, uLeft);
        if (!pMemory_ && lseek(iFd_, static_cast<off_t>(uRawPosition_ + uStep), SEEK_SET) < 0) {
            failure.Set(uRawPosition_, Sprintf("seek error: %s", std::strerror(errno)));
            return false;
        }
        uRawPosition_ += uStep;
        uPosition_ += uStep;
        uSkipped += uStep;
        return true;
    }
    uint8_t scratch[65536];
    while (uSkipped < uCount) {
        size_t uGot = 0;
        if (!RawRead(scratch, static_cast<size_t>(std::min<uint64_t>(sizeof scratch, uCount - uSkipped)), uGot,
                     failure))
            return false;
        if (uGot == 0)
            break;
        uSkipped += uGot;
        uPosition_ += uGot;
    }
    return true;
}

std::span<const uint8_t> Input::Peek(size_t uWant, Failure &failure)
{
    if (uPeekedPos_ > 0) {
        peeked_.erase(peeked_.begin(), peeked_.begin() + static_cast<ptrdiff_t>(uPeekedPos_));
        uPeekedPos_ = 0;
    }
    size_t uHave = peeked_.size();
    peeked_.resize(std::max(uWant, uHave));
    while (uHave < uWant) {
        size_t uGot = 0;
        if (!RawRead(peeked_.data() + uHave, uWant - uHave, uGot, failure) || uGot == 0)
            break;
        uHave += uGot;
    }
    peeked_.resize(uHave);
    return {peeked_.data(), peeked_.size()};
}

bool Input::ReadAt(uint64_t uOffset, uint8_t *pDst, size_t uWant, Failure &failure)
{
    if (!bSeekable_ || uOffset > uSize_ || uWant > uSize_ - uOffset) {
        failure.Set(uOffset, Sprintf("truncated: %zu bytes needed here, the file ends at %llu", uWant,
                                    static_cast<unsigned long long>(uSize_)));
        return false;
    }
    if (uWant == 0)
        return true;
    if (pMemory_) {
        std::memcpy(pDst, pMemory_ + uOffset, uWant);
        return true;
    }
    size_t uDone = 0;
    while (uDone < uWant) {
        const ssize_t n = pread(iFd_, pDst + uDone, uWant - uDone, static_cast<off_t>(uOffset + uDone));
        if (n < 0 && errno == EINTR)
            continue;
        if (n <= 0) {
            failure.Set(uOffset + uDone, n < 0 ? Sprintf("read error: %s", std::strerror(errno))
                                               : std::string("truncated: the file shrank while being read"));
            return false;
        }
        uDone += static_cast<size_t>(n);
    }
    return true;
}

} // namespace vorcal::cli
