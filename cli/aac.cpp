// vorcal aac: the layer's whole-frame AAC parser over every frame of an AAC stream.
#include <array>
#include <getopt.h>

#include "facts.hpp"
#include "verbs.hpp"

namespace vorcal::cli {

namespace {

enum AacOption { kOptJson = 1000, kOptFrames, kOptStream, kOptWait };

// id_syn_ele names (ISO/IEC 14496-3 Table 4.85), the order of CALAACFrameInfo::auElements.
constexpr std::array<const char *, 8> kElements = {"SCE", "CPE", "CCE", "LFE", "DSE", "PCE", "FIL", "END"};
constexpr size_t kResults = 6; // CAL_AAC_PARSE_OK ... CAL_AAC_PARSE_LEFTOVER

std::string ElementList(const CALAACFrameInfo &info)
{
    std::string text;
    for (size_t i = 0; i < kElements.size(); ++i)
        if (info.auElements[i])
            text += Sprintf("%s%s=%u", text.empty() ? "" : ",", kElements[i], info.auElements[i]);
    return text.empty() ? "-" : text;
}

} // namespace

int AacVerb(Console &console, int argc, char **argv)
{
    static const option kOptions[] = {{"json", no_argument, nullptr, kOptJson},
                                      {"frames", no_argument, nullptr, kOptFrames},
                                      {"stream", required_argument, nullptr, kOptStream},
                                      {"wait", required_argument, nullptr, kOptWait},
                                      {nullptr, 0, nullptr, 0}};
    bool bJson = false, bFrames = false;
    uint64_t uWait = kDefaultWaitSeconds, uStream = 0;
    int iStream = -1;
    for (int c; (c = getopt_long(argc, argv, "", kOptions, nullptr)) != -1;) {
        if (c == kOptJson)
            bJson = true;
        else if (c == kOptFrames)
            bFrames = true;
        else if (c == kOptStream && ParseNumber(optarg, 0, 1u << 20, uStream))
            iStream = static_cast<int>(uStream);
        else if (c == kOptWait && ParseNumber(optarg, 0, 86400, uWait))
            continue;
        else
            return UsageError(console, "aac", Sprintf("bad option %s", argv[optind - 1]));
    }
    if (argc - optind != 1)
        return UsageError(console, "aac", "needs one file");
    const std::string path = argv[optind];
    std::unique_ptr<MediaFile> file = OpenMedia(console, path, static_cast<int>(uWait));
    if (!file)
        return kExitData;
    const int iChosen = ChooseStream(*file, iStream, MediaKind::Audio);
    const StreamInfo *pInfo = iChosen >= 0 ? &file->Streams()[static_cast<size_t>(iChosen)] : nullptr;
    if (!pInfo || pInfo->codec != Codec::Aac) {
        Report(console, path, pInfo ? Sprintf("stream %d is %s, not AAC", iChosen, CodecName(pInfo->codec))
                                    : Sprintf("no stream %d", iStream));
        return kExitData;
    }
    const StreamInfo &info = *pInfo;
    AacFrameExaminer examiner(info);
    if (!examiner.Ok()) {
        Report(console, path, info.config.empty() ? "no AudioSpecificConfig for the raw AAC frames"
                                                  : "the layer gave no AAC parser");
        return kExitData;
    }
    if (!bJson)
        std::fprintf(console.pOut, "# %s: stream %u, %s, %s frames\n", path.c_str(), info.uIndex,
                     FormatName(file->GetFormat()), info.bAdtsFrames ? "ADTS" : "raw");
    if (bFrames && !bJson)
        std::fprintf(console.pOut, "%-7s %-12s %-6s %-6s %-26s %-3s %-3s %s\n", "index", "offset", "bytes", "bits",
                     "elements", "sbr", "ps", "result");

    std::unique_ptr<PacketReader> reader = file->Packets(static_cast<size_t>(iChosen));
    Packet packet;
    Failure failure, firstBad;
    ReadResult r;
    uint64_t uIndex = 0, uBytes = 0;
    std::array<uint64_t, kResults + 1> results{}; // the last slot counts unknown results
    Value frames = Value::Array();
    while ((r = reader->Next(packet, failure)) == ReadResult::Packet) {
        CALAACFrameInfo frame{};
        const int32_t iResult = examiner.Frame(packet, &frame);
        const size_t uSlot = iResult >= 0 && static_cast<size_t>(iResult) < kResults ? static_cast<size_t>(iResult)
                                                                                     : kResults;
        ++results[uSlot];
        uBytes += packet.data.size();
        if (iResult != CAL_AAC_PARSE_OK && !firstBad.Failed())
            firstBad.Set(packet.uOffset, Sprintf("frame %llu: %s", static_cast<unsigned long long>(uIndex),
                                                 AacParseResultName(iResult)));
        if (bFrames && bJson) {
            Value elements = Value::Object();
            for (size_t i = 0; i < kElements.size(); ++i)
                elements.Add(kElements[i], frame.auElements[i]);
            Value item = Value::Object();
            item.Add("index", uIndex).Add("offset", packet.uOffset);
            item.Add("size", static_cast<uint64_t>(packet.data.size()));
            item.Add("frame_bytes", frame.uFrameBytes).Add("bits", frame.uBits).Add("elements", std::move(elements));
            item.Add("sbr", frame.uSBR).Add("ps", frame.uPS).Add("result", AacParseResultName(iResult));
            item.Add("result_code", iResult);
            frames.Push(std::move(item));
        } else if (bFrames) {
            std::fprintf(console.pOut, "%-7llu %-12llu %-6u %-6u %-26s %-3u %-3u %s\n",
                         static_cast<unsigned long long>(uIndex), static_cast<unsigned long long>(packet.uOffset),
                         frame.uFrameBytes, frame.uBits, ElementList(frame).c_str(), frame.uSBR, frame.uPS,
                         AacParseResultName(iResult));
        }
        ++uIndex;
    }

    AacFacts facts = ExamineAacConfig(info);
    examiner.Finish(facts);
    Value summary = Value::Object();
    summary.Add("index", info.uIndex).Add("codec_name", CodecName(info.codec));
    if (const std::string profile = AacProfileName(facts); !profile.empty())
        summary.Add("profile", profile);
    summary.Add("sample_rate", std::to_string(facts.uOutRate)).Add("channels", facts.uOutChannels);
    summary.Add("object_type", facts.uObjectType).Add("core_sample_rate", facts.uCoreRate);
    summary.Add("core_channels", facts.uCoreChannels).Add("sbr", SignalName(facts.sbr)).Add("ps", SignalName(facts.ps));
    summary.Add("framing", info.bAdtsFrames ? "adts" : "raw");
    summary.Add("nb_frames", std::to_string(uIndex)).Add("bytes", uBytes).Add("parsed_to_end", results[0]);
    Value counts = Value::Object();
    for (size_t i = 0; i <= kResults; ++i)
        if (results[i])
            counts.Add(AacParseResultName(static_cast<int32_t>(i)), results[i]);
    summary.Add("results", std::move(counts));

    if (bJson) {
        JsonWriter writer(console.pOut);
        Value root = Value::Object();
        root.Add("stream", std::move(summary));
        if (bFrames)
            root.Add("frames", std::move(frames));
        root.Write(writer);
    } else {
        std::fprintf(console.pOut, "object type %u, profile %s, core %u Hz %u ch, output %u Hz %u ch, SBR %s, PS %s\n",
                     facts.uObjectType, AacProfileName(facts).c_str(), facts.uCoreRate, facts.uCoreChannels,
                     facts.uOutRate, facts.uOutChannels, SignalName(facts.sbr), SignalName(facts.ps));
        std::fprintf(console.pOut, "%llu frames, %llu bytes, %llu parsed to their exact end",
                     static_cast<unsigned long long>(uIndex), static_cast<unsigned long long>(uBytes),
                     static_cast<unsigned long long>(results[0]));
        for (size_t i = 1; i <= kResults; ++i)
            if (results[i])
                std::fprintf(console.pOut, ", %llu %s", static_cast<unsigned long long>(results[i]),
                             AacParseResultName(static_cast<int32_t>(i)));
        std::fputc('\n', console.pOut);
    }
    // One line on the error stream: a read failure first (it says where the file broke), else
    // the first frame that did not parse to its end.
    const uint64_t uBad = uIndex - results[0];
    if (r == ReadResult::Error) {
        if (uBad)
            failure.text += Sprintf(" (and %llu frames before it did not parse to their end)",
                                    static_cast<unsigned long long>(uBad));
        Report(console, path, failure);
        return kExitData;
    }
    if (uBad) {
        firstBad.text += Sprintf("; %llu of %llu frames did not parse to their end",
                                 static_cast<unsigned long long>(uBad), static_cast<unsigned long long>(uIndex));
        Report(console, path, firstBad);
        return kExitData;
    }
    return kExitOk;
}

} // namespace vorcal::cli
