// vorcal frames: one line per frame with what the layer's classification tools answer.
#include <getopt.h>

#include "facts.hpp"
#include "verbs.hpp"

namespace vorcal::cli {

namespace {

enum FramesOption { kOptJson = 1000, kOptStream, kOptWait };

// H.264 NAL unit types as numbers, HEVC ones by their Table 7-1 names.
std::string JoinTypes(Codec codec, const std::vector<uint32_t> &types)
{
    std::string text;
    for (uint32_t uType : types)
        text += (text.empty() ? "" : ",") +
                (codec == Codec::Hevc ? std::string(vorCALTools_HEVC_NALTypeName(uType)) : std::to_string(uType));
    return text.empty() ? "-" : text;
}

} // namespace

int FramesVerb(Console &console, int argc, char **argv)
{
    static const option kOptions[] = {{"json", no_argument, nullptr, kOptJson},
                                      {"stream", required_argument, nullptr, kOptStream},
                                      {"wait", required_argument, nullptr, kOptWait},
                                      {nullptr, 0, nullptr, 0}};
    bool bJson = false;
    uint64_t uWait = kDefaultWaitSeconds, uStream = 0;
    int iStream = -1;
    for (int c; (c = getopt_long(argc, argv, "", kOptions, nullptr)) != -1;) {
        if (c == kOptJson)
            bJson = true;
        else if (c == kOptStream && ParseNumber(optarg, 0, 1u << 20, uStream))
            iStream = static_cast<int>(uStream);
        else if (c == kOptWait && ParseNumber(optarg, 0, 86400, uWait))
            continue;
        else
            return UsageError(console, "frames", Sprintf("bad option %s", argv[optind - 1]));
    }
    if (argc - optind != 1)
        return UsageError(console, "frames", "needs one file");
    const std::string path = argv[optind];
    std::unique_ptr<MediaFile> file = OpenMedia(console, path, static_cast<int>(uWait));
    if (!file)
        return kExitData;
    const int iChosen = ChooseStream(*file, iStream, MediaKind::Video);
    if (iChosen < 0) {
        Report(console, path, Sprintf("no stream %d", iStream));
        return kExitData;
    }
    const StreamInfo &info = file->Streams()[static_cast<size_t>(iChosen)];
    // H.264 and HEVC: the NAL unit walk and the format test.
    const bool bH264 = info.codec == Codec::H264 || info.codec == Codec::Hevc;
    const bool bAudio = KindOf(info.codec) == MediaKind::Audio;
    std::unique_ptr<PacketReader> reader = file->Packets(static_cast<size_t>(iChosen));

    if (!bJson) {
        std::fprintf(console.pOut, "# %s: stream %d, %s, %s\n", path.c_str(), iChosen, CodecName(info.codec),
                     FormatName(file->GetFormat()));
        if (bH264)
            std::fprintf(console.pOut, "%-7s %-12s %-8s %-4s %-4s %-2s %-6s %-14s %s\n", "index", "offset", "size",
                         "key", "pict", "B", "sync", "format_test", "nal_unit_types");
        else if (bAudio)
            std::fprintf(console.pOut, "%-7s %-12s %-8s %s\n", "index", "offset", "size", "frame_type");
        else
            std::fprintf(console.pOut, "%-7s %-12s %-8s %-4s %-4s %-2s %-6s %s\n", "index", "offset", "size", "key",
                         "pict", "B", "sync", "valid");
    }
    Value frames = Value::Array();
    Packet packet;
    Failure failure;
    uint64_t uIndex = 0, uKeys = 0, uDisagree = 0;
    ReadResult r;
    while ((r = reader->Next(packet, failure)) == ReadResult::Packet) {
        const FrameFacts facts = ClassifyFrame(info, packet);
        uKeys += facts.iIntra ? 1 : 0;
        uDisagree += facts.bFormatAgrees ? 0 : 1;
        const char *pSync = packet.iContainerSync < 0 ? "-" : packet.iContainerSync ? "1" : "0";
        const char *pFormat = facts.iFormat == 2 ? "annexb" : facts.iFormat == 1 ? "length" : "short";
        if (bJson) {
            Value frame = Value::Object();
            frame.Add("index", uIndex).Add("offset", packet.uOffset).Add("size", static_cast<uint64_t>(packet.data.size()));
            frame.Add("key", facts.iIntra);
            if (!bAudio) {
                frame.Add("pict_type", facts.pictType).Add("b", facts.iB).Add("valid", facts.iValid);
                if (packet.iContainerSync >= 0)
                    frame.Add("sync", packet.iContainerSync);
            }
            if (bH264) {
                Value types = Value::Array();
                for (uint32_t uType : facts.nalTypes)
                    types.Push(uType);
                frame.Add("nal_unit_types", std::move(types));
                if (info.codec == Codec::Hevc) {
                    Value names = Value::Array();
                    for (uint32_t uType : facts.nalTypes)
                        names.Push(vorCALTools_HEVC_NALTypeName(uType));
                    frame.Add("nal_unit_names", std::move(names));
                }
                frame.Add("format_test", pFormat).Add("format_agrees", facts.bFormatAgrees);
            }
            if (facts.iAmrFrameType >= 0)
                frame.Add("amr_frame_type", facts.iAmrFrameType);
            frames.Push(std::move(frame));
        } else if (bH264) {
            std::fprintf(console.pOut, "%-7llu %-12llu %-8zu %-4d %-4s %-2d %-6s %-14s %s\n",
                         static_cast<unsigned long long>(uIndex), static_cast<unsigned long long>(packet.uOffset),
                         packet.data.size(), facts.iIntra, facts.pictType.c_str(), facts.iB, pSync,
                         facts.bFormatAgrees ? pFormat : Sprintf("%s (wrong)", pFormat).c_str(),
                         JoinTypes(info.codec, facts.nalTypes).c_str());
        } else if (bAudio) {
            std::fprintf(console.pOut, "%-7llu %-12llu %-8zu %s\n", static_cast<unsigned long long>(uIndex),
                         static_cast<unsigned long long>(packet.uOffset), packet.data.size(),
                         facts.iAmrFrameType >= 0 ? std::to_string(facts.iAmrFrameType).c_str() : "-");
        } else {
            std::fprintf(console.pOut, "%-7llu %-12llu %-8zu %-4d %-4s %-2d %-6s %d\n",
                         static_cast<unsigned long long>(uIndex), static_cast<unsigned long long>(packet.uOffset),
                         packet.data.size(), facts.iIntra, facts.pictType.c_str(), facts.iB, pSync, facts.iValid);
        }
        ++uIndex;
    }
    if (bJson) {
        JsonWriter writer(console.pOut);
        Value root = Value::Object();
        root.Add("frames", std::move(frames));
        root.Write(writer);
    } else {
        std::fprintf(console.pOut, "# %llu frames, %llu key%s", static_cast<unsigned long long>(uIndex),
                     static_cast<unsigned long long>(uKeys), info.codec == Codec::Hevc ? " (IRAP)" : "");
        if (bH264)
            std::fprintf(console.pOut, ", %llu where the format test misreads the framing",
                         static_cast<unsigned long long>(uDisagree));
        std::fputc('\n', console.pOut);
    }
    if (r == ReadResult::Error) {
        Report(console, path, failure);
        return kExitData;
    }
    return kExitOk;
}

} // namespace vorcal::cli
