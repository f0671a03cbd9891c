// vorcal probe: per stream what the layer's tools find.
#include <algorithm>
#include <getopt.h>

#include "facts.hpp"
#include "verbs.hpp"

namespace vorcal::cli {

namespace {

enum ProbeOption { kOptJson = 1000, kOptWait };

const char *FramingName(Framing framing)
{
    return framing == Framing::AnnexB ? "annexb" : framing == Framing::LengthPrefixed ? "length-prefixed" : "none";
}

void AddSize(Value &stream, uint32_t uWidth, uint32_t uHeight)
{
    if (uWidth && uHeight) {
        stream.Add("width", uWidth);
        stream.Add("height", uHeight);
    }
}

void DescribeAvc(const StreamInfo &info, Value &stream)
{
    const AvcFacts facts = ExamineAvc(info);
    if (facts.sps.empty()) {
        AddSize(stream, info.uWidth, info.uHeight);
        stream.Add("sps", "none found in the configuration");
        return;
    }
    if (const std::string profile = AvcProfileName(facts.uProfileIdc, facts.uConstraintFlags); !profile.empty())
        stream.Add("profile", profile);
    stream.Add("level", facts.uLevelIdc);
    // The display size from the full SPS parse, else from the container, else the coded size
    // the documented tool reports.
    const CALSPSInfo &tool = facts.spsTool;
    if (facts.bFullSps) {
        DescribeFullSps(facts.full, stream);
        if (!facts.full.uSarDen && info.uSarNum && info.uSarDen)
            stream.Add("sample_aspect_ratio", Sprintf("%u:%u", info.uSarNum, info.uSarDen));
    } else {
        stream.Add("sps_error", FullSpsResultName(facts.iFullResult));
        if (info.uWidth && info.uHeight) {
            AddSize(stream, info.uWidth, info.uHeight);
            stream.Add("size_source", "container");
        } else if (facts.uSpsToolResult == 0) {
            AddSize(stream, tool.uWidth, tool.uHeight);
            stream.Add("size_source", "sps_tool (coded size, cropping not applied)");
        }
        if (info.uSarNum && info.uSarDen)
            stream.Add("sample_aspect_ratio", Sprintf("%u:%u", info.uSarNum, info.uSarDen));
    }
    stream.Add("sps_tool", SpsToolRecord(facts.uSpsToolResult, tool));
}

void DescribeHevc(const StreamInfo &info, Value &stream)
{
    const HevcFacts facts = ExamineHevc(info);
    if (facts.sps.empty()) {
        AddSize(stream, info.uWidth, info.uHeight);
        stream.Add("sps", "none found in the configuration");
        return;
    }
    if (!facts.bOk) {
        stream.Add("sps_error", HevcResultName(facts.iResult));
        AddSize(stream, info.uWidth, info.uHeight);
        if (info.uWidth && info.uHeight)
            stream.Add("size_source", "container");
        return;
    }
    if (const std::string profile = HevcProfileName(facts.full); !profile.empty())
        stream.Add("profile", profile);
    stream.Add("level", facts.full.uLevelIdc);
    DescribeFullSps(facts.full, stream);
    if (!facts.full.uSarDen && info.uSarNum && info.uSarDen)
        stream.Add("sample_aspect_ratio", Sprintf("%u:%u", info.uSarNum, info.uSarDen));
}

void DescribeVisual(const StreamInfo &info, const std::vector<uint8_t> &firstFrame, Value &stream)
{
    const VisualFacts facts = ExamineVisual(info, firstFrame);
    if (!facts.profile.empty())
        stream.Add("profile", facts.profile);
    if (facts.iLevel >= 0)
        stream.Add("level", facts.iLevel);
    AddSize(stream, facts.uWidth ? facts.uWidth : info.uWidth, facts.uHeight ? facts.uHeight : info.uHeight);
    if (info.uSarNum && info.uSarDen)
        stream.Add("sample_aspect_ratio", Sprintf("%u:%u", info.uSarNum, info.uSarDen));
    if (facts.iProfileAndLevel >= 0)
        stream.Add("profile_and_level_indication", facts.iProfileAndLevel);
    if (info.codec == Codec::Mpeg4Visual || info.codec == Codec::H263) {
        Value dsi = Value::Object();
        dsi.Add("result", facts.uDsiResult)
            .Add("profile", facts.dsi.uProfile)
            .Add("level", facts.dsi.uLevel)
            .Add("source_format", facts.dsi.uSourceFormat)
            .Add("width", facts.dsi.uWidth)
            .Add("height", facts.dsi.uHeight);
        stream.Add("dsi_tool", std::move(dsi));
    }
}

void DescribeAac(const AacFacts &facts, Value &stream)
{
    if (const std::string profile = AacProfileName(facts); !profile.empty())
        stream.Add("profile", profile);
    stream.Add("sample_rate", std::to_string(facts.uOutRate));
    stream.Add("channels", facts.uOutChannels);
    stream.Add("object_type", facts.uObjectType);
    stream.Add("core_sample_rate", facts.uCoreRate);
    stream.Add("core_channels", facts.uCoreChannels);
    stream.Add("channel_configuration", facts.uChannelConfig);
    stream.Add("sbr", SignalName(facts.sbr));
    stream.Add("ps", SignalName(facts.ps));
}

// Describes one stream, reading its frames where the description needs them (elementary
// streams are counted; AAC frames may signal SBR; AMR frame types are in the frames).
bool DescribeStream(const Console &console, const std::string &path, MediaFile &file, const StreamInfo &info,
                    Value &stream)
{
    stream.Add("index", info.uIndex);
    const MediaKind kind = KindOf(info.codec);
    stream.Add("codec_type", kind == MediaKind::Video ? "video" : kind == MediaKind::Audio ? "audio" : "unknown");
    stream.Add("codec_name", CodecName(info.codec));
    if (!info.sampleEntry.empty())
        stream.Add("codec_tag_string", info.sampleEntry);

    const bool bMp4 = file.GetFormat() == Format::Mp4;
    const bool bReadAll = !bMp4 || info.codec == Codec::Aac;
    const bool bReadFirst = bReadAll || info.codec == Codec::AmrNb || info.codec == Codec::AmrWb ||
                            info.codec == Codec::H263;
    std::vector<uint8_t> firstFrame;
    std::vector<uint32_t> amrTypes;
    AacFrameExaminer aacFrames(info);
    int64_t iFrames = info.iFrameCount;
    Failure failure;
    if (bReadFirst) {
        std::unique_ptr<PacketReader> reader = file.Packets(info.uIndex);
        Packet packet;
        int64_t iCount = 0;
        ReadResult r = ReadResult::End;
        while (reader && (r = reader->Next(packet, failure)) == ReadResult::Packet) {
            if (iCount++ == 0)
                firstFrame = packet.data;
            if (info.codec == Codec::Aac)
                aacFrames.Frame(packet);
            if ((info.codec == Codec::AmrNb || info.codec == Codec::AmrWb) && !packet.data.empty()) {
                const uint32_t uType = (packet.data[0] >> 3) & 0x0F;
                if (std::find(amrTypes.begin(), amrTypes.end(), uType) == amrTypes.end())
                    amrTypes.push_back(uType);
            }
            if (!bReadAll)
                break;
        }
        if (bReadAll)
            iFrames = iCount;
    }

    switch (info.codec) {
    case Codec::H264:
        DescribeAvc(info, stream);
        break;
    case Codec::Hevc:
        DescribeHevc(info, stream);
        break;
    case Codec::Mpeg4Visual:
    case Codec::H263:
    case Codec::Mpeg1Video:
    case Codec::Mpeg2Video:
        DescribeVisual(info, firstFrame, stream);
        break;
    case Codec::Aac: {
        AacFacts facts = ExamineAacConfig(info);
        aacFrames.Finish(facts);
        DescribeAac(facts, stream);
        break;
    }
    case Codec::AmrNb:
    case Codec::AmrWb: {
        stream.Add("sample_rate", info.codec == Codec::AmrNb ? "8000" : "16000");
        stream.Add("channels", 1);
        Value types = Value::Array();
        for (uint32_t uType : amrTypes)
            types.Push(uType);
        stream.Add("amr_frame_types", std::move(types));
        break;
    }
    default:
        AddSize(stream, info.uWidth, info.uHeight);
        if (info.uSampleRate)
            stream.Add("sample_rate", std::to_string(info.uSampleRate));
        if (info.uChannels)
            stream.Add("channels", info.uChannels);
        break;
    }
    if (info.codec == Codec::H264 || info.codec == Codec::Hevc) {
        stream.Add("framing", FramingName(info.framing));
        if (info.framing == Framing::LengthPrefixed)
            stream.Add("nal_length_size", info.uNalLengthSize);
    }
    // The container's configuration is ffprobe's extradata; elsewhere it is what the tool found
    // in front of the first frame (or built from the ADTS header, or a dump's first record).
    if (!info.config.empty())
        stream.Add(bMp4 ? "extradata_size" : "config_size", static_cast<uint64_t>(info.config.size()));
    if (iFrames >= 0)
        stream.Add("nb_frames", std::to_string(iFrames));
    stream.Add("filename", path);
    stream.Add("format_name", file.GetFormat() == Format::Mp4 && !file.Brand().empty()
                                  ? Sprintf("%s (brand %s)", FormatName(file.GetFormat()), file.Brand().c_str())
                                  : std::string(FormatName(file.GetFormat())));
    if (failure.Failed()) {
        Report(console, path, failure);
        return false;
    }
    return true;
}

// The picture facts both SPS records name alike.
template <class Sps> void DescribePicture(const Sps &sps, Value &stream)
{
    AddSize(stream, sps.uWidth, sps.uHeight);
    stream.Add("coded_width", sps.uCodedWidth);
    stream.Add("coded_height", sps.uCodedHeight);
    stream.Add("size_source", "sps");
    if (sps.uSarNum && sps.uSarDen)
        stream.Add("sample_aspect_ratio", Sprintf("%u:%u", sps.uSarNum, sps.uSarDen));
    stream.Add("pix_fmt", PixFmtName(sps));
    if (const std::string range = ColorRangeName(sps); !range.empty())
        stream.Add("color_range", range);
    stream.Add("color_space", ColorSpaceName(sps.uMatrixCoefficients));
    stream.Add("color_transfer", ColorTransferName(sps.uTransferCharacteristics));
    stream.Add("color_primaries", ColorPrimariesName(sps.uColourPrimaries));
    stream.Add("bits_per_raw_sample", std::to_string(sps.uBitDepthLuma));
    stream.Add("chroma_format_idc", sps.uChromaFormatIdc);
    if (sps.uBitDepthChroma != sps.uBitDepthLuma)
        stream.Add("bit_depth_chroma", sps.uBitDepthChroma);
}

} // namespace

void DescribeFullSps(const FullSps &sps, Value &stream)
{
    DescribePicture(sps, stream);
}

void DescribeFullSps(const CALHEVCSPS &sps, Value &stream)
{
    DescribePicture(sps, stream);
}

int ProbeVerb(Console &console, int argc, char **argv)
{
    static const option kOptions[] = {{"json", no_argument, nullptr, kOptJson},
                                      {"wait", required_argument, nullptr, kOptWait},
                                      {nullptr, 0, nullptr, 0}};
    bool bJson = false;
    uint64_t uWait = kDefaultWaitSeconds;
    for (int c; (c = getopt_long(argc, argv, "", kOptions, nullptr)) != -1;) {
        if (c == kOptJson)
            bJson = true;
        else if (c == kOptWait && ParseNumber(optarg, 0, 86400, uWait))
            continue;
        else
            return UsageError(console, "probe", Sprintf("bad option %s", argv[optind - 1]));
    }
    if (optind >= argc)
        return UsageError(console, "probe", "needs at least one file");

    int iStatus = kExitOk;
    Value streams = Value::Array();
    for (int i = optind; i < argc; ++i) {
        const std::string path = argv[i];
        std::unique_ptr<MediaFile> file = OpenMedia(console, path, static_cast<int>(uWait));
        if (!file) {
            iStatus = kExitData;
            continue;
        }
        for (const StreamInfo &info : file->Streams()) {
            Value stream = Value::Object();
            if (!DescribeStream(console, path, *file, info, stream))
                iStatus = kExitData;
            if (bJson) {
                streams.Push(std::move(stream));
            } else {
                std::fputs("[STREAM]\n", console.pOut);
                stream.WriteFlat(console.pOut, "");
                std::fputs("[/STREAM]\n", console.pOut);
            }
        }
        if (file->Notice().Failed()) {
            Report(console, path, file->Notice());
            iStatus = kExitData;
        }
    }
    if (bJson) {
        JsonWriter writer(console.pOut);
        Value root = Value::Object();
        root.Add("streams", std::move(streams));
        root.Write(writer);
    }
    return iStatus;
}

} // namespace vorcal::cli
