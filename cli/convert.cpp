// vorcal convert and vorcal replay: a stream's configuration and frames through the layer's
// decoder wrappers to a recording codec, showing or writing what the codec receives.
#include <getopt.h>

#include <vorcal/wrapper.h>

#include "facts.hpp"
#include "session.hpp"
#include "verbs.hpp"

namespace vorcal::cli {

namespace {

enum Option {
    kOptJson = 1000, kOptTo, kOptWants, kOptNalLength, kOptStripPs, kOptTrustConfig, kOptStream, kOptWait, kOptCodec,
    kOptNoMain, kOptVopStart, kOptNoLevel3, kOptNoUnknownProfile, kOptNoH263Plus, kOptLockAmr, kOptParams, kOptOut
};

struct Settings {
    bool bJson = false;
    int iFraming = 0; // CAL_AVC_FORMAT_* the codec asks for, 0 none
    int iNalLength = 0;
    int iStream = -1;
    uint64_t uWait = kDefaultWaitSeconds;
    Codec codec = Codec::Unknown;
    std::string output;
    std::vector<std::pair<uint32_t, uint32_t>> answers;
};

// Parses the options both verbs know; false after a usage error (its code in iStatus).
bool ParseOptions(Console &console, const char *pVerb, int argc, char **argv, Settings &settings, int &iStatus)
{
    static const option kOptions[] = {
        {"json", no_argument, nullptr, kOptJson},
        {"to", required_argument, nullptr, kOptTo},
        {"wants", required_argument, nullptr, kOptWants},
        {"nal-length", required_argument, nullptr, kOptNalLength},
        {"strip-ps", no_argument, nullptr, kOptStripPs},
        {"trust-config", no_argument, nullptr, kOptTrustConfig},
        {"stream", required_argument, nullptr, kOptStream},
        {"wait", required_argument, nullptr, kOptWait},
        {"codec", required_argument, nullptr, kOptCodec},
        {"no-main", no_argument, nullptr, kOptNoMain},
        {"vop-start", no_argument, nullptr, kOptVopStart},
        {"no-level3", no_argument, nullptr, kOptNoLevel3},
        {"no-unknown-profile", no_argument, nullptr, kOptNoUnknownProfile},
        {"no-h263-plus", no_argument, nullptr, kOptNoH263Plus},
        {"lock-amr", no_argument, nullptr, kOptLockAmr},
        {"params", no_argument, nullptr, kOptParams},
        {"output", required_argument, nullptr, kOptOut},
        {nullptr, 0, nullptr, 0}};
    const bool bConvert = std::string(pVerb) == "convert";
    struct Flag {
        int iOption;
        uint32_t uProperty, uValue;
    };
    static constexpr Flag kFlags[] = {
        {kOptStripPs, CAL_PROP_H264_INBAND_PARAM_SETS, 0},
        {kOptTrustConfig, CAL_PROP_TRUST_CONFIGURATION, 1},
        {kOptNoMain, CAL_PROP_H264_NO_MAIN_PROFILE, 1},      {kOptVopStart, CAL_PROP_MPEG4_VOP_START, 1},
        {kOptNoLevel3, CAL_PROP_MPEG4_NO_LEVEL3, 1},         {kOptNoUnknownProfile, CAL_PROP_MPEG4_NO_UNKNOWN_PROFILE, 1},
        {kOptNoH263Plus, CAL_PROP_H263_NO_EXTENDED_PTYPE, 1}, {kOptLockAmr, CAL_PROP_AMR_FRAME_TYPE_LOCK, 1},
        {kOptParams, CAL_PROP_STREAM_PARAMETERS, 1}};
    static constexpr struct {
        const char *pName;
        Codec codec;
    } kCodecs[] = {{"h264", Codec::H264}, {"hevc", Codec::Hevc}, {"mpeg4", Codec::Mpeg4Visual}, {"h263", Codec::H263},
                   {"aac", Codec::Aac},   {"amrnb", Codec::AmrNb},        {"amrwb", Codec::AmrWb}};
    uint64_t uNumber = 0;
    for (int c; (c = getopt_long(argc, argv, bConvert ? "" : "o:", kOptions, nullptr)) != -1;) {
        const std::string arg = optarg ? optarg : "";
        bool bOk = true;
        bool bFlag = false;
        for (const Flag &flag : kFlags)
            if (c == flag.iOption && (bConvert ? flag.iOption == kOptStripPs || flag.iOption == kOptTrustConfig : true)) {
                settings.answers.emplace_back(flag.uProperty, flag.uValue);
                bFlag = true;
            }
        if (bFlag)
            continue;
        switch (c) {
        case kOptJson: settings.bJson = true; break;
        case kOptTo:
        case kOptWants:
            bOk = (c == kOptTo) == bConvert && (arg == "annexb" || arg == "length");
            settings.iFraming = arg == "annexb" ? CAL_AVC_FORMAT_ANNEXB : CAL_AVC_FORMAT_NAL;
            break;
        case kOptNalLength:
            bOk = ParseNumber(optarg, 1, 4, uNumber);
            settings.iNalLength = static_cast<int>(uNumber);
            break;
        case kOptStream:
            bOk = ParseNumber(optarg, 0, 1u << 20, uNumber);
            settings.iStream = static_cast<int>(uNumber);
            break;
        case kOptWait: bOk = ParseNumber(optarg, 0, 86400, settings.uWait); break;
        case kOptCodec:
            bOk = !bConvert;
            settings.codec = Codec::Unknown;
            for (const auto &entry : kCodecs)
                if (arg == entry.pName)
                    settings.codec = entry.codec;
            bOk = bOk && settings.codec != Codec::Unknown;
            break;
        case 'o':
        case kOptOut:
            bOk = !bConvert;
            settings.output = arg;
            break;
        default: bOk = false; break;
        }
        if (!bOk) {
            iStatus = UsageError(console, pVerb, Sprintf("bad option %s", argv[optind - 1]));
            return false;
        }
    }
    if (settings.iFraming) {
        settings.answers.emplace_back(CAL_PROP_H264_FRAME_FORMAT, settings.iFraming);
        settings.answers.emplace_back(CAL_PROP_H264_CONFIG_FORMAT, settings.iFraming);
    }
    return true;
}

const char *HowReceived(const Received &got, const uint8_t *pIn, size_t uIn, Codec codec, bool bDropped)
{
    if (!got.bCalled)
        return bDropped ? "dropped" : "not delivered";
    if (got.p == pIn)
        return got.bytes.size() == uIn ? "passed" : "shortened";
    if (got.p > pIn && got.p < pIn + uIn)
        return codec == Codec::Mpeg4Visual ? "moved to VOP" : "stripped";
    return KindOf(codec) == MediaKind::Audio ? "substituted" : "converted";
}

} // namespace

int ConvertVerb(Console &console, int argc, char **argv)
{
    Settings settings;
    int iStatus = kExitOk;
    if (!ParseOptions(console, "convert", argc, argv, settings, iStatus))
        return iStatus;
    if (argc - optind != 2)
        return UsageError(console, "convert", "needs IN and OUT");
    if (!settings.iFraming)
        return UsageError(console, "convert", "needs --to annexb or --to length");
    const std::string in = argv[optind], out = argv[optind + 1];
    std::unique_ptr<MediaFile> file = OpenMedia(console, in, static_cast<int>(settings.uWait));
    if (!file)
        return kExitData;
    const int iChosen = ChooseStream(*file, settings.iStream, MediaKind::Video);
    const StreamInfo *pInfo = iChosen >= 0 ? &file->Streams()[static_cast<size_t>(iChosen)] : nullptr;
    if (!pInfo || (pInfo->codec != Codec::H264 && pInfo->codec != Codec::Hevc)) {
        Report(console, in, Sprintf("convert takes H.264 or HEVC; stream %d is %s", iChosen,
                                   pInfo ? CodecName(pInfo->codec) : "missing"));
        return kExitData;
    }
    const uint32_t uNalLength = settings.iNalLength     ? static_cast<uint32_t>(settings.iNalLength)
                                : pInfo->uNalLengthSize ? pInfo->uNalLengthSize
                                                        : 4;
    LayerSession session(MediaKind::Video, OtiOf(pInfo->codec), settings.answers);
    if (!session.Ok()) {
        Report(console, in, "the layer gave no codec instance");
        return kExitData;
    }
    Output output;
    if (!output.Open(console, out))
        return kExitData;
    const bool bAnnexB = settings.iFraming == CAL_AVC_FORMAT_ANNEXB;
    uint32_t uWidth = 0, uHeight = 0;
    const int32_t iInit = session.VideoInit(pInfo->config, uNalLength, uWidth, uHeight);
    if (iInit == CAL_RESULT_REFUSED || !session.Init().bCalled) {
        Report(console, in, Sprintf("the layer refused the stream at Init (result %d)", iInit));
        output.Close(console);
        return kExitData;
    }
    if (bAnnexB)
        output.Write(session.Init().bytes.data(), session.Init().bytes.size());
    else
        output.WriteRecord(session.Init().bytes);

    std::unique_ptr<PacketReader> reader = file->Packets(static_cast<size_t>(iChosen));
    Packet packet;
    Failure failure;
    ReadResult r;
    uint64_t uIndex = 0, uWritten = 0;
    Value dropped = Value::Array();
    while ((r = reader->Next(packet, failure)) == ReadResult::Packet) {
        uint32_t uWord = 0;
        const int32_t iResult = session.VideoDecode(packet.data, uWord);
        if (!session.Last().bCalled) {
            Failure drop;
            drop.Set(packet.uOffset, Sprintf("frame %llu dropped by the layer (result %d, result word %u)",
                                            static_cast<unsigned long long>(uIndex), iResult, uWord));
            Report(console, in, drop);
            dropped.Push(uIndex);
            iStatus = kExitData;
        } else if (bAnnexB) {
            output.Write(session.Last().bytes.data(), session.Last().bytes.size());
            ++uWritten;
        } else {
            output.WriteRecord(session.Last().bytes);
            ++uWritten;
        }
        ++uIndex;
    }
    if (r == ReadResult::Error) {
        Report(console, in, failure);
        iStatus = kExitData;
    }
    if (!output.Close(console))
        iStatus = kExitData;
    if (settings.bJson) {
        JsonWriter writer(console.pOut);
        Value root = Value::Object();
        root.Add("input", in).Add("output", out).Add("to", bAnnexB ? "annexb" : "length");
        root.Add("nal_length_size", uNalLength).Add("config_size", static_cast<uint64_t>(session.Init().bytes.size()));
        root.Add("frames_in", uIndex).Add("frames_out", uWritten).Add("dropped", std::move(dropped));
        root.Add("bytes", output.Bytes());
        root.Write(writer);
    } else if (out != "-") {
        std::fprintf(console.pOut, "%s: %llu of %llu frames written to %s (%s, %llu bytes)\n", in.c_str(),
                     static_cast<unsigned long long>(uWritten), static_cast<unsigned long long>(uIndex), out.c_str(),
                     bAnnexB ? "Annex B stream" : "frame dump", static_cast<unsigned long long>(output.Bytes()));
    }
    return iStatus;
}

int ReplayVerb(Console &console, int argc, char **argv)
{
    Settings settings;
    int iStatus = kExitOk;
    if (!ParseOptions(console, "replay", argc, argv, settings, iStatus))
        return iStatus;
    if (argc - optind != 1)
        return UsageError(console, "replay", "needs one input");
    const std::string in = argv[optind];
    std::unique_ptr<MediaFile> file = OpenMedia(console, in, static_cast<int>(settings.uWait), true);
    if (!file)
        return kExitData;
    const int iChosen = ChooseStream(*file, settings.iStream, MediaKind::Video);
    if (iChosen < 0) {
        Report(console, in, Sprintf("no stream %d", settings.iStream));
        return kExitData;
    }
    const StreamInfo &info = file->Streams()[static_cast<size_t>(iChosen)];
    const Codec codec = settings.codec != Codec::Unknown ? settings.codec : info.codec;
    const uint32_t uOti = OtiOf(codec);
    const MediaKind kind = KindOf(codec);
    if (uOti == 0 || kind == MediaKind::Unknown)
        return UsageError(console, "replay", Sprintf("the codec of %s is not known: give --codec", in.c_str()));
    LayerSession session(kind, uOti, settings.answers);
    if (!session.Ok()) {
        Report(console, in, "the layer gave no codec instance");
        return kExitData;
    }
    Output output;
    if (!settings.output.empty() && !output.Open(console, settings.output))
        return kExitData;
    const bool bWrite = !settings.output.empty();

    std::unique_ptr<PacketReader> reader = file->Packets(static_cast<size_t>(iChosen));
    Packet packet;
    Failure failure;
    ReadResult r = reader->Next(packet, failure);
    bool bHavePacket = r == ReadResult::Packet;

    // Init.
    Value init = Value::Object();
    int32_t iInit = 0;
    if (kind == MediaKind::Video) {
        uint32_t uWidth = 0, uHeight = 0;
        const uint32_t uNalLength = settings.iNalLength   ? static_cast<uint32_t>(settings.iNalLength)
                                    : info.uNalLengthSize ? info.uNalLengthSize
                                                          : 4;
        iInit = session.VideoInit(info.config, uNalLength, uWidth, uHeight);
        init.Add("nal_length_size", uNalLength).Add("width", uWidth).Add("height", uHeight);
    } else {
        AudioParams params;
        iInit = session.AudioInit(info.config, bHavePacket ? packet.data : std::vector<uint8_t>(), params);
        init.Add("sample_rate", params.uSampleRate).Add("channels", params.uChannels);
        init.Add("bits_per_sample", params.uBitsPerSample).Add("samples_per_frame", params.uSamplesPerFrame);
    }
    const Received &got = session.Init();
    const char *pInitHow = !got.bCalled                                    ? "refused"
                           : got.p == nullptr || got.bytes == info.config ? "passed"
                                                                            : "converted";
    init.Add("result", iInit).Add("config_size", static_cast<uint64_t>(info.config.size()));
    init.Add("received", pInitHow).Add("received_size", static_cast<uint64_t>(got.bytes.size()));
    if (!settings.bJson) {
        std::fprintf(console.pOut, "# %s: %s through the layer as OTI 0x%X\n", in.c_str(), CodecName(codec), uOti);
        std::fprintf(console.pOut, "init: configuration %zu bytes, codec received %zu bytes (%s), result %d",
                     info.config.size(), got.bytes.size(), pInitHow, iInit);
        for (const auto &[key, value] : init.Members())
            if (key != "result" && key != "config_size" && key != "received" && key != "received_size")
                std::fprintf(console.pOut, ", %s %s", key.c_str(), value.Text().c_str());
        std::fprintf(console.pOut, "\n%-7s %-12s %-8s %-18s %-8s %s\n", "index", "offset", "size", "received", "size",
                     "detail");
    }
    if (bWrite)
        output.WriteRecord(got.bytes);
    if (!got.bCalled || iInit == CAL_RESULT_REFUSED) {
        Report(console, in, Sprintf("the layer refused the stream at Init (result %d)", iInit));
        iStatus = kExitData;
        bHavePacket = false;
    }

    Value frames = Value::Array();
    uint64_t uIndex = 0, uChanged = 0, uDropped = 0;
    while (bHavePacket) {
        uint32_t uWord = 0;
        const int32_t iResult =
            kind == MediaKind::Video ? session.VideoDecode(packet.data, uWord) : session.AudioDecode(packet.data);
        const Received &last = session.Last();
        const char *pHow = HowReceived(last, session.LastInput(), packet.data.size(), codec,
                                       iResult == CAL_RESULT_DROPPED && uWord == CAL_DECODE_RESULT_DROPPED);
        uChanged += std::string(pHow) != "passed";
        uDropped += !last.bCalled;
        std::string detail;
        if ((codec == Codec::H264 || codec == Codec::Hevc) && last.bCalled) {
            // The units the codec got; fewer than the frame had means parameter sets were cut too.
            std::vector<uint32_t> types, typesIn;
            const int32_t iGot = static_cast<int32_t>(last.bytes.size());
            const int32_t iFormat = codec == Codec::Hevc ? vorCALTools_HEVC_CheckFormat(last.bytes.data(), iGot)
                                                         : vorCALTools_AVC_CheckFormat(last.bytes.data(), iGot);
            const Framing framing = iFormat == CAL_AVC_FORMAT_ANNEXB ? Framing::AnnexB : Framing::LengthPrefixed;
            NalUnitTypes(codec, last.bytes.data(), last.bytes.size(), framing, 4, types);
            NalUnitTypes(codec, packet.data.data(), packet.data.size(), info.framing, info.uNalLengthSize, typesIn);
            if (std::string(pHow) == "converted" && types.size() < typesIn.size())
                pHow = "stripped+converted";
            for (uint32_t uType : types)
                detail += (detail.empty() ? "nal " : ",") + std::to_string(uType);
        } else if ((codec == Codec::AmrNb || codec == Codec::AmrWb) && last.bCalled && !last.bytes.empty() &&
                   !packet.data.empty()) {
            detail = Sprintf("frame type %u -> %u", (packet.data[0] >> 3) & 0x0Fu, (last.bytes[0] >> 3) & 0x0Fu);
        } else if (last.bCalled) {
            detail = HexBytes(last.bytes.data(), last.bytes.size(), 8);
        }
        if (settings.bJson) {
            Value frame = Value::Object();
            frame.Add("index", uIndex).Add("offset", packet.uOffset).Add("size", static_cast<uint64_t>(packet.data.size()));
            frame.Add("received", pHow).Add("received_size", static_cast<uint64_t>(last.bytes.size()));
            frame.Add("result", iResult);
            if (kind == MediaKind::Video)
                frame.Add("result_word", uWord);
            frame.Add("detail", detail);
            frames.Push(std::move(frame));
        } else {
            std::fprintf(console.pOut, "%-7llu %-12llu %-8zu %-18s %-8zu %s\n", static_cast<unsigned long long>(uIndex),
                         static_cast<unsigned long long>(packet.uOffset), packet.data.size(), pHow, last.bytes.size(),
                         detail.c_str());
        }
        if (bWrite && last.bCalled)
            output.WriteRecord(last.bytes);
        ++uIndex;
        r = reader->Next(packet, failure);
        bHavePacket = r == ReadResult::Packet;
    }
    if (settings.bJson) {
        JsonWriter writer(console.pOut);
        Value root = Value::Object();
        root.Add("codec_name", CodecName(codec)).Add("init", std::move(init)).Add("frames", std::move(frames));
        root.Write(writer);
    } else {
        std::fprintf(console.pOut, "# %llu frames: %llu passed unchanged, %llu changed (%llu dropped)\n",
                     static_cast<unsigned long long>(uIndex), static_cast<unsigned long long>(uIndex - uChanged),
                     static_cast<unsigned long long>(uChanged), static_cast<unsigned long long>(uDropped));
    }
    if (r == ReadResult::Error) {
        Report(console, in, failure);
        iStatus = kExitData;
    }
    if (bWrite && !output.Close(console))
        iStatus = kExitData;
    return iStatus;
}

} // namespace vorcal::cli
