#include "common.hpp"

#include <cstdarg>
#include <vector>

namespace vorcal::cli {

std::string Sprintf(const char *pFormat, ...)
{
    va_list args;
    va_start(args, pFormat);
    va_list copy;
    va_copy(copy, args);
    const int n = std::vsnprintf(nullptr, 0, pFormat, copy);
    va_end(copy);
    std::string text(n > 0 ? static_cast<size_t>(n) : 0, '\0');
    if (n > 0)
        std::vsnprintf(text.data(), text.size() + 1, pFormat, args);
    va_end(args);
    return text;
}

void Report(const Console &console, std::string_view name, const Failure &failure)
{
    if (failure.bHasOffset)
        std::fprintf(console.pErr, "vorcal: %.*s: offset %llu: %s\n", static_cast<int>(name.size()), name.data(),
                     static_cast<unsigned long long>(failure.uOffset), failure.text.c_str());
    else
        Report(console, name, failure.text);
}

void Report(const Console &console, std::string_view name, std::string_view text)
{
    std::fprintf(console.pErr, "vorcal: %.*s: %.*s\n", static_cast<int>(name.size()), name.data(),
                 static_cast<int>(text.size()), text.data());
}

const char *CodecName(Codec codec)
{
    switch (codec) {
    case Codec::H264: return "h264";
    case Codec::Hevc: return "hevc";
    case Codec::Mpeg4Visual: return "mpeg4";
    case Codec::H263: return "h263";
    case Codec::Mpeg1Video: return "mpeg1video";
    case Codec::Mpeg2Video: return "mpeg2video";
    case Codec::Aac: return "aac";
    case Codec::AmrNb: return "amr_nb";
    case Codec::AmrWb: return "amr_wb";
    default: return "unknown";
    }
}

MediaKind KindOf(Codec codec)
{
    switch (codec) {
    case Codec::H264:
    case Codec::Hevc:
    case Codec::Mpeg4Visual:
    case Codec::H263:
    case Codec::Mpeg1Video:
    case Codec::Mpeg2Video: return MediaKind::Video;
    case Codec::Aac:
    case Codec::AmrNb:
    case Codec::AmrWb: return MediaKind::Audio;
    default: return MediaKind::Unknown;
    }
}

const char *FormatName(Format format)
{
    switch (format) {
    case Format::Mp4: return "ISO BMFF (MP4/MOV/3GP/M4A)";
    case Format::AnnexB: return "H.264 Annex B elementary stream";
    case Format::HevcAnnexB: return "HEVC Annex B elementary stream";
    case Format::Adts: return "ADTS AAC";
    case Format::Amr: return "AMR storage file";
    case Format::AmrWb: return "AMR-WB storage file";
    case Format::Mpeg4Visual: return "MPEG-4 Visual elementary stream";
    case Format::H263: return "H.263 elementary stream";
    case Format::Mpeg12Video: return "MPEG-1/2 video elementary stream";
    default: return "frame dump";
    }
}

} // namespace vorcal::cli
