// AAC silence frames: the raw-data-block templates behind an optional ADTS header, and the
// allocation step every mute-frame generator shares. The per-instance cache of
// vorCALTools_GetSilenceFrame belongs to the codec instance, in the wrapper layer.
#include <array>
#include <cstring>
#include <span>

#include <vorcal/audio_tools.h>

#include "aacparse/syntax.hpp"
#include "core/sal.hpp"
#include "tools/mute_frame.hpp"

namespace vorcal::tools::mute {
namespace {

// One silent raw_data_block per mode (ISO/IEC 14496-3 4.4.2.1): 0 SCE, 1 CPE, then SCE, CPE and
// SCE with parametric stereo, each followed by a fill element of extension type SBR data and
// the end element (modes 2, 3, 4).
constexpr auto kAacMode0 = std::to_array<uint8_t>({
    0x00, 0xD0, 0x2B, 0x82, 0xEB, 0x94, 0xE5, 0x2F, 0xF8, 0x08, 0xB8});
constexpr auto kAacMode1 = std::to_array<uint8_t>({
    0x21, 0x15, 0x93, 0x40, 0x59, 0x72, 0x94, 0x92, 0x11, 0x13, 0x40, 0x59, 0x72, 0x94, 0x92, 0x11,
    0x17});
constexpr auto kAacMode2 = std::to_array<uint8_t>({
    0x00, 0xD0, 0x30, 0x83, 0xE2, 0x5B, 0x66, 0x25, 0x77, 0xC4, 0x5A, 0xB7, 0x14, 0x05, 0xD0, 0x40,
    0x00, 0x00, 0x00, 0x03, 0x80, 0x38});
constexpr auto kAacMode3 = std::to_array<uint8_t>({
    0x21, 0x19, 0x13, 0x40, 0x7C, 0xAB, 0x6C, 0xA4, 0xA1, 0x08, 0x9A, 0x03, 0xE5, 0x5B, 0x65, 0x25,
    0x08, 0x45, 0xAF, 0x74, 0x20, 0x5D, 0x42, 0x00, 0x00, 0x00, 0x1C, 0x60, 0x03, 0x03, 0x80});
constexpr auto kAacMode4 = std::to_array<uint8_t>({
    0x00, 0xD0, 0x30, 0x83, 0xE2, 0x5B, 0x66, 0x39, 0x40, 0xCC, 0x9B, 0x37, 0x14, 0x05, 0xD0, 0x40,
    0x00, 0x00, 0x00, 0x03, 0x89, 0x50, 0x40, 0x38});

constexpr std::array<std::span<const uint8_t>, 5> kAacModes = {kAacMode0, kAacMode1, kAacMode2,
                                                               kAacMode3, kAacMode4};
static_assert(kAacMode0.size() == 11 && kAacMode1.size() == 17 && kAacMode2.size() == 22 &&
              kAacMode3.size() == 31 && kAacMode4.size() == 24);
// id_syn_ele: ID_SCE (0) for the mono templates, ID_CPE (1) with element tag 0 for the stereo ones.
static_assert(kAacMode0[0] == 0x00 && kAacMode2[0] == 0x00 && kAacMode4[0] == 0x00);
static_assert(kAacMode1[0] == 0x21 && kAacMode3[0] == 0x21);

constexpr int32_t kFirstSbrMode = 2;
constexpr uint32_t kMinRate = 8000;
constexpr uint32_t kMaxRate = 96000;

} // namespace

int32_t AllocateFrame(std::span<const uint8_t> header, std::span<const uint8_t> body,
                      uint8_t **ppFrame, uint32_t *puFrameLen) noexcept
{
    const uint32_t uLen = static_cast<uint32_t>(header.size() + body.size());
    auto *pFrame = static_cast<uint8_t *>(sal::Alloc(uLen));
    if (!pFrame)
        return -1;
    if (!header.empty())
        std::memcpy(pFrame, header.data(), header.size());
    if (!body.empty())
        std::memcpy(pFrame + header.size(), body.data(), body.size());
    *ppFrame = pFrame;
    *puFrameLen = uLen;
    return 0;
}

int32_t AacMuteFrame(uint8_t **ppFrame, uint32_t *puFrameLen, uint32_t /*uReserved*/,
                     uint32_t uSamplingRate, uint32_t uChannels, uint32_t bADTS,
                     int32_t iMode) noexcept
{
    if (!ppFrame || !puFrameLen)
        return -1;
    if (uSamplingRate < kMinRate || uSamplingRate > kMaxRate || iMode < 0 ||
        iMode >= static_cast<int32_t>(kAacModes.size()))
        return -1;
    const std::span<const uint8_t> body = kAacModes[static_cast<std::size_t>(iMode)];
    if (!bADTS)
        return AllocateFrame({}, body, ppFrame, puFrameLen);

    // The SBR modes pass the output rate; AAC_MakeADTS halves it back to the core rate, so they
    // accept up to 48000 Hz only.
    const uint32_t uHeaderRate = iMode >= kFirstSbrMode ? uSamplingRate * 2 : uSamplingRate;
    std::array<uint8_t, vorcal::aac::kAdtsHeaderSize> header{};
    if (AAC_MakeADTS(header.data(), static_cast<int32_t>(uHeaderRate), uChannels, iMode,
                     static_cast<uint32_t>(body.size())) != 0) {
        // CONTRACT: the template length stays behind in the length output.
        *puFrameLen = static_cast<uint32_t>(body.size());
        return -1;
    }
    return AllocateFrame(header, body, ppFrame, puFrameLen);
}

} // namespace vorcal::tools::mute

using namespace vorcal::tools;

extern "C" int32_t AAC_MuteFrame(uint8_t **ppFrame, uint32_t *uFrameLen, uint32_t uReserved,
                                 uint32_t uSamplingRate, uint32_t uChannels, uint32_t bADTS,
                                 int32_t uMode)
{
    return mute::AacMuteFrame(ppFrame, uFrameLen, uReserved, uSamplingRate, uChannels, bADTS,
                              uMode);
}
