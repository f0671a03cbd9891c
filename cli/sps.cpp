// vorcal sps: a stream's sequence parameter set through the layer's full parse and through the
// documented SPS tool, side by side. The input is any media the tool reads, a file holding an
// SPS NAL unit, start-code framed bytes or a decoder configuration record, or those bytes as hex.
#include <array>
#include <cctype>
#include <getopt.h>
#include <sys/stat.h>

#include "facts.hpp"
#include "verbs.hpp"

namespace vorcal::cli {

namespace {

enum SpsOption { kOptJson = 1000, kOptStream, kOptWait };

// Inputs that match no media format are read whole as parameter-set bytes up to this size.
constexpr size_t kRawMaxBytes = 65536;

struct ParameterSet {
    Codec codec = Codec::Unknown;
    std::vector<uint8_t> nal; // header first
    std::string source;       // where it was found
};

// What a codec's parse gives, ready to print: ffprobe-named facts, the full record, and the
// documented tool's record (when the codec has one), with the rows that pair their fields.
struct SpsReport {
    bool bOk = false;
    std::string error;   // the full parse's result when it failed
    std::string summary; // one line of the main facts
    Value facts = Value::Object();
    Value full = Value::Object();
    Value tool = Value::Object();
    const char *pFullTitle = "";
    const char *pToolTitle = nullptr; // null: no documented tool for this codec
    std::vector<std::array<std::string, 3>> rows;
};

// ---- H.264 -------------------------------------------------------------------------------

// One field of the full record and its counterpart in the documented tool's record. The tool's
// size is the coded size and its crop offsets are the coded ones, in chroma or field units.
struct AvcRow {
    const char *pName;
    uint32_t CALAVCSPS::*pFull; // null: the full record has no such field
    uint32_t CALSPSInfo::*pTool; // null: the documented tool has no such field
};

constexpr AvcRow kAvcRows[] = {
    {"profile_idc", &CALAVCSPS::uProfileIdc, &CALSPSInfo::uProfile},
    {"constraint_set_flags", &CALAVCSPS::uConstraintFlags, nullptr},
    {"level_idc", &CALAVCSPS::uLevelIdc, &CALSPSInfo::uLevel},
    {"seq_parameter_set_id", &CALAVCSPS::uSPSId, nullptr},
    {"chroma_format_idc", &CALAVCSPS::uChromaFormatIdc, nullptr},
    {"separate_colour_plane_flag", &CALAVCSPS::uSeparateColourPlane, nullptr},
    {"bit_depth_luma", &CALAVCSPS::uBitDepthLuma, nullptr},
    {"bit_depth_chroma", &CALAVCSPS::uBitDepthChroma, nullptr},
    {"seq_scaling_matrix_present_flag", &CALAVCSPS::uScalingMatrixPresent, nullptr},
    {"log2_max_frame_num", &CALAVCSPS::uLog2MaxFrameNum, nullptr},
    {"pic_order_cnt_type", &CALAVCSPS::uPicOrderCntType, nullptr},
    {"max_num_ref_frames", &CALAVCSPS::uMaxNumRefFrames, &CALSPSInfo::uRefFrames},
    {"frame_mbs_only_flag", &CALAVCSPS::uFrameMbsOnly, nullptr},
    {"mb_adaptive_frame_field_flag", &CALAVCSPS::uMbAdaptiveFrameField, nullptr},
    {"coded_width", &CALAVCSPS::uCodedWidth, &CALSPSInfo::uWidth},
    {"coded_height", &CALAVCSPS::uCodedHeight, &CALSPSInfo::uHeight},
    {"frame_cropping_flag", nullptr, &CALSPSInfo::uCropping},
    {"crop_left", &CALAVCSPS::uCropLeft, &CALSPSInfo::uCropLeft},
    {"crop_right", &CALAVCSPS::uCropRight, &CALSPSInfo::uCropRight},
    {"crop_top", &CALAVCSPS::uCropTop, &CALSPSInfo::uCropTop},
    {"crop_bottom", &CALAVCSPS::uCropBottom, &CALSPSInfo::uCropBottom},
    {"width", &CALAVCSPS::uWidth, nullptr},
    {"height", &CALAVCSPS::uHeight, nullptr},
    {"sar_num", &CALAVCSPS::uSarNum, nullptr},
    {"sar_den", &CALAVCSPS::uSarDen, nullptr},
    {"aspect_class", nullptr, &CALSPSInfo::uAspectClass},
    {"video_full_range_flag", &CALAVCSPS::uVideoFullRange, nullptr},
    {"colour_primaries", &CALAVCSPS::uColourPrimaries, nullptr},
    {"transfer_characteristics", &CALAVCSPS::uTransferCharacteristics, nullptr},
    {"matrix_coefficients", &CALAVCSPS::uMatrixCoefficients, nullptr},
    {"num_units_in_tick", &CALAVCSPS::uNumUnitsInTick, nullptr},
    {"time_scale", &CALAVCSPS::uTimeScale, nullptr},
    {"fixed_frame_rate_flag", &CALAVCSPS::uFixedFrameRate, nullptr},
    {"max_num_reorder_frames", &CALAVCSPS::uMaxNumReorderFrames, nullptr},
    {"max_dec_frame_buffering", &CALAVCSPS::uMaxDecFrameBuffering, nullptr},
};

SpsReport DescribeAvcSps(const std::vector<uint8_t> &nal)
{
    AvcFacts facts;
    ExamineAvcSps(nal, facts);
    SpsReport report;
    report.bOk = facts.bFullSps;
    report.pFullTitle = "vorCALTools_AVC_ParseSPS";
    report.pToolTitle = "vorCALTools_AVC_GetSPSInfo";
    if (const std::string profile = AvcProfileName(facts.uProfileIdc, facts.uConstraintFlags); !profile.empty())
        report.facts.Add("profile", profile);
    report.facts.Add("level", facts.uLevelIdc);
    if (facts.bFullSps) {
        DescribeFullSps(facts.full, report.facts);
        const FullSps &f = facts.full;
        const std::string range = ColorRangeName(f);
        std::string profile = AvcProfileName(f.uProfileIdc, f.uConstraintFlags);
        if (profile.empty())
            profile = Sprintf("profile_idc %u", f.uProfileIdc);
        report.summary = Sprintf("%s, level %u, %ux%u (coded %ux%u), SAR %u:%u, %s, range %s, matrix %s, transfer %s, "
                                 "primaries %s",
                                 profile.c_str(), f.uLevelIdc, f.uWidth,
                                 f.uHeight, f.uCodedWidth, f.uCodedHeight, f.uSarNum, f.uSarDen, PixFmtName(f).c_str(),
                                 range.empty() ? "unknown" : range.c_str(), ColorSpaceName(f.uMatrixCoefficients),
                                 ColorTransferName(f.uTransferCharacteristics), ColorPrimariesName(f.uColourPrimaries));
    } else {
        report.error = Sprintf("the full SPS parse failed: %s (%d)", FullSpsResultName(facts.iFullResult),
                               facts.iFullResult);
    }
    report.full.Add("result", facts.iFullResult).Add("result_name", FullSpsResultName(facts.iFullResult));
    report.tool = SpsToolRecord(facts.uSpsToolResult, facts.spsTool);
    report.rows.push_back({"result", Sprintf("%d %s", facts.iFullResult, FullSpsResultName(facts.iFullResult)),
                           Sprintf("%u %s", facts.uSpsToolResult, SpsToolResultName(facts.uSpsToolResult))});
    for (const AvcRow &row : kAvcRows) {
        std::string full = "-", tool = "-";
        if (row.pFull) {
            report.full.Add(row.pName, facts.full.*row.pFull);
            const uint32_t uValue = facts.full.*row.pFull;
            full = row.pFull == &CALAVCSPS::uConstraintFlags ? Sprintf("0x%02X", uValue) : std::to_string(uValue);
        }
        if (row.pTool)
            tool = std::to_string(facts.spsTool.*row.pTool);
        report.rows.push_back({row.pName, full, tool});
    }
    return report;
}

// ---- HEVC --------------------------------------------------------------------------------

// The fields of CALHEVCSPS by their syntax names (ITU-T H.265 7.3.2.2, E.2.1); the constraint
// flags and the compatibility flags in hex.
struct HevcRow {
    const char *pName;
    uint32_t CALHEVCSPS::*pField;
    bool bHex;
};

constexpr HevcRow kHevcRows[] = {
    {"general_profile_space", &CALHEVCSPS::uProfileSpace, false},
    {"general_tier_flag", &CALHEVCSPS::uTierFlag, false},
    {"general_profile_idc", &CALHEVCSPS::uProfileIdc, false},
    {"general_compatibility_flags", &CALHEVCSPS::uProfileCompatibilityFlags, true},
    {"general_constraint_flags_high", &CALHEVCSPS::uConstraintFlagsHigh, true},
    {"general_constraint_flags_low", &CALHEVCSPS::uConstraintFlagsLow, true},
    {"general_level_idc", &CALHEVCSPS::uLevelIdc, false},
    {"sps_video_parameter_set_id", &CALHEVCSPS::uVPSId, false},
    {"sps_max_sub_layers", &CALHEVCSPS::uMaxSubLayers, false},
    {"sps_temporal_id_nesting_flag", &CALHEVCSPS::uTemporalIdNesting, false},
    {"sps_seq_parameter_set_id", &CALHEVCSPS::uSPSId, false},
    {"chroma_format_idc", &CALHEVCSPS::uChromaFormatIdc, false},
    {"separate_colour_plane_flag", &CALHEVCSPS::uSeparateColourPlane, false},
    {"coded_width", &CALHEVCSPS::uCodedWidth, false},
    {"coded_height", &CALHEVCSPS::uCodedHeight, false},
    {"conf_win_left", &CALHEVCSPS::uConfWinLeft, false},
    {"conf_win_right", &CALHEVCSPS::uConfWinRight, false},
    {"conf_win_top", &CALHEVCSPS::uConfWinTop, false},
    {"conf_win_bottom", &CALHEVCSPS::uConfWinBottom, false},
    {"width", &CALHEVCSPS::uWidth, false},
    {"height", &CALHEVCSPS::uHeight, false},
    {"bit_depth_luma", &CALHEVCSPS::uBitDepthLuma, false},
    {"bit_depth_chroma", &CALHEVCSPS::uBitDepthChroma, false},
    {"log2_max_pic_order_cnt_lsb", &CALHEVCSPS::uLog2MaxPicOrderCntLsb, false},
    {"max_dec_pic_buffering", &CALHEVCSPS::uMaxDecPicBuffering, false},
    {"max_num_reorder_pics", &CALHEVCSPS::uMaxNumReorderPics, false},
    {"max_latency_increase_plus1", &CALHEVCSPS::uMaxLatencyIncreasePlus1, false},
    {"log2_min_luma_coding_block_size", &CALHEVCSPS::uLog2MinCbSize, false},
    {"log2_ctb_size", &CALHEVCSPS::uLog2CtbSize, false},
    {"scaling_list_enabled_flag", &CALHEVCSPS::uScalingListEnabled, false},
    {"num_short_term_ref_pic_sets", &CALHEVCSPS::uNumShortTermRefPicSets, false},
    {"long_term_ref_pics_present_flag", &CALHEVCSPS::uLongTermRefPicsPresent, false},
    {"num_long_term_ref_pics_sps", &CALHEVCSPS::uNumLongTermRefPicsSps, false},
    {"sar_num", &CALHEVCSPS::uSarNum, false},
    {"sar_den", &CALHEVCSPS::uSarDen, false},
    {"video_full_range_flag", &CALHEVCSPS::uVideoFullRange, false},
    {"colour_primaries", &CALHEVCSPS::uColourPrimaries, false},
    {"transfer_characteristics", &CALHEVCSPS::uTransferCharacteristics, false},
    {"matrix_coeffs", &CALHEVCSPS::uMatrixCoefficients, false},
    {"num_units_in_tick", &CALHEVCSPS::uNumUnitsInTick, false},
    {"time_scale", &CALHEVCSPS::uTimeScale, false},
    {"min_spatial_segmentation_idc", &CALHEVCSPS::uMinSpatialSegmentationIdc, false},
    {"extension_flags", &CALHEVCSPS::uExtensionFlags, true},
};

SpsReport DescribeHevcSps(const std::vector<uint8_t> &nal)
{
    HevcFacts facts;
    ExamineHevcSps(nal, facts);
    SpsReport report;
    report.bOk = facts.bOk;
    report.pFullTitle = "vorCALTools_HEVC_ParseSPS";
    const CALHEVCSPS &f = facts.full;
    if (facts.bOk) {
        std::string profile = HevcProfileName(f);
        if (!profile.empty())
            report.facts.Add("profile", profile);
        else
            profile = Sprintf("general_profile_idc %u", f.uProfileIdc);
        report.facts.Add("level", f.uLevelIdc);
        DescribeFullSps(f, report.facts);
        report.summary = Sprintf("%s, level %u, %ux%u (coded %ux%u), SAR %u:%u, %s, range %s, matrix %s, transfer %s, "
                                 "primaries %s",
                                 profile.c_str(), f.uLevelIdc, f.uWidth, f.uHeight, f.uCodedWidth, f.uCodedHeight,
                                 f.uSarNum, f.uSarDen, PixFmtName(f).c_str(), ColorRangeName(f).c_str(),
                                 ColorSpaceName(f.uMatrixCoefficients), ColorTransferName(f.uTransferCharacteristics),
                                 ColorPrimariesName(f.uColourPrimaries));
    } else {
        report.error = Sprintf("the full SPS parse failed: %s (%d)", HevcResultName(facts.iResult), facts.iResult);
    }
    report.full.Add("result", facts.iResult).Add("result_name", HevcResultName(facts.iResult));
    report.rows.push_back({"result", Sprintf("%d %s", facts.iResult, HevcResultName(facts.iResult)), ""});
    for (const HevcRow &row : kHevcRows) {
        const uint32_t uValue = f.*row.pField;
        report.full.Add(row.pName, uValue);
        report.rows.push_back({row.pName, row.bHex ? Sprintf("0x%X", uValue) : std::to_string(uValue), ""});
    }
    return report;
}

// ---- Inputs --------------------------------------------------------------------------------

bool IsAvcSps(const uint8_t *pUnit, size_t)
{
    return (pUnit[0] & 0x1F) == 7;
}

// The codecs whose parameter sets the verb reads: where their SPS is in raw bytes and which
// unit of a frame is one, and what their parses give.
struct SpsCodec {
    Codec codec;
    std::vector<uint8_t> (*pFind)(const std::vector<uint8_t> &data);
    bool (*pIsSps)(const uint8_t *pUnit, size_t uSize);
    SpsReport (*pDescribe)(const std::vector<uint8_t> &nal);
};

constexpr SpsCodec kSpsCodecs[] = {
    {Codec::H264, FindAvcSps, IsAvcSps, DescribeAvcSps},
    {Codec::Hevc, FindHevcSps, IsHevcSps, DescribeHevcSps},
};

const SpsCodec *CodecEntry(Codec codec)
{
    for (const SpsCodec &entry : kSpsCodecs)
        if (entry.codec == codec)
            return &entry;
    return nullptr;
}

const char *RawSource(const std::vector<uint8_t> &data)
{
    if (data.size() >= 7 && data[0] == 1)
        return "decoder configuration record";
    if (data.size() >= 3 && data[0] == 0 && data[1] == 0)
        return "start-code framed data";
    return "SPS NAL unit";
}

// The SPS of raw bytes, tried for each codec; false with a failure when none is there.
bool FromRawBytes(const std::vector<uint8_t> &data, const char *pWhat, ParameterSet &ps, Failure &failure)
{
    for (const SpsCodec &entry : kSpsCodecs)
        if (std::vector<uint8_t> nal = entry.pFind(data); !nal.empty()) {
            ps = {entry.codec, std::move(nal), Sprintf("%s (%s)", pWhat, RawSource(data))};
            return true;
        }
    failure.SetNoOffset(Sprintf("no SPS NAL unit in the %s (%zu bytes)", pWhat, data.size()));
    return false;
}

// Hex digits with any spaces, tabs and colons between them; false when the text holds anything
// else or no digit.
bool IsHexText(const std::string &text)
{
    bool bDigit = false;
    for (const char c : text) {
        if (std::isxdigit(static_cast<unsigned char>(c)))
            bDigit = true;
        else if (c != ' ' && c != ':' && c != '\t')
            return false;
    }
    return bDigit;
}

bool ParseHex(const std::string &text, std::vector<uint8_t> &bytes, Failure &failure)
{
    std::string digits;
    for (const char c : text)
        if (std::isxdigit(static_cast<unsigned char>(c)))
            digits += c;
    if (digits.size() % 2) {
        failure.SetNoOffset(Sprintf("not a file, and as hex an odd number of digits (%zu)", digits.size()));
        return false;
    }
    for (size_t i = 0; i < digits.size(); i += 2)
        bytes.push_back(static_cast<uint8_t>(std::stoul(digits.substr(i, 2), nullptr, 16)));
    return true;
}

// The first SPS of a media file's stream: in its configuration, else in its frames.
bool FromMedia(std::unique_ptr<MediaFile> file, int iStream, ParameterSet &ps, Failure &failure)
{
    const int iChosen = ChooseStream(*file, iStream, MediaKind::Video);
    const StreamInfo *pInfo = iChosen >= 0 ? &file->Streams()[static_cast<size_t>(iChosen)] : nullptr;
    const SpsCodec *pEntry = pInfo ? CodecEntry(pInfo->codec) : nullptr;
    if (!pEntry) {
        failure.SetNoOffset(pInfo ? Sprintf("stream %d is %s, which has no sequence parameter set the tool reads",
                                            iChosen, CodecName(pInfo->codec))
                                  : Sprintf("no stream %d", iStream));
        return false;
    }
    ps.codec = pInfo->codec;
    if (ps.nal = pEntry->pFind(pInfo->config); !ps.nal.empty()) {
        ps.source = Sprintf("stream %d configuration at offset %llu", iChosen,
                            static_cast<unsigned long long>(pInfo->uConfigOffset));
        return true;
    }
    std::unique_ptr<PacketReader> reader = file->Packets(static_cast<size_t>(iChosen));
    Packet packet;
    ReadResult r;
    for (uint64_t uIndex = 0; (r = reader->Next(packet, failure)) == ReadResult::Packet; ++uIndex) {
        ForEachNal(packet.data.data(), packet.data.size(), pInfo->framing, pInfo->uNalLengthSize,
                   [&](const uint8_t *p, size_t uSize) {
                       if (ps.nal.empty() && pEntry->pIsSps(p, uSize))
                           ps.nal.assign(p, p + uSize);
                   });
        if (!ps.nal.empty()) {
            ps.source = Sprintf("stream %d frame %llu at offset %llu", iChosen, static_cast<unsigned long long>(uIndex),
                                static_cast<unsigned long long>(packet.uOffset));
            return true;
        }
    }
    if (r != ReadResult::Error)
        failure.SetNoOffset(Sprintf("no SPS in stream %d", iChosen));
    return false;
}

// Reads the parameter set the argument names; false with a failure.
bool LoadParameterSet(const std::string &arg, int iWaitSeconds, int iStream, ParameterSet &ps, Failure &failure)
{
    struct stat info {};
    if (arg != "-" && stat(arg.c_str(), &info) != 0 && IsHexText(arg)) {
        std::vector<uint8_t> bytes;
        return ParseHex(arg, bytes, failure) && FromRawBytes(bytes, "hex bytes", ps, failure);
    }
    std::unique_ptr<Input> input = Input::Open(arg, iWaitSeconds, failure);
    if (!input)
        return false;
    const auto head = input->Peek(kRawMaxBytes + 1, failure);
    if (failure.Failed())
        return false;
    Format format{};
    if (DetectFormat(head.data(), head.size(), head.size() <= kRawMaxBytes, format)) {
        std::unique_ptr<MediaFile> file = MediaFile::Open(std::move(input), failure);
        return file && FromMedia(std::move(file), iStream, ps, failure);
    }
    if (head.empty() || head.size() > kRawMaxBytes) {
        failure.Set(0, head.empty() ? "the input is empty"
                                    : "unrecognised data: not a media file the tool reads, and too long for "
                                      "parameter-set bytes");
        return false;
    }
    return FromRawBytes(std::vector<uint8_t>(head.begin(), head.end()), "file", ps, failure);
}

} // namespace

Value SpsToolRecord(uint32_t uResult, const CALSPSInfo &tool)
{
    Value record = Value::Object();
    record.Add("result", uResult)
        .Add("profile_idc", tool.uProfile)
        .Add("level_idc", tool.uLevel)
        .Add("width", tool.uWidth)
        .Add("height", tool.uHeight)
        .Add("ref_frames", tool.uRefFrames)
        .Add("cropping", tool.uCropping)
        .Add("crop_left", tool.uCropLeft)
        .Add("crop_right", tool.uCropRight)
        .Add("crop_top", tool.uCropTop)
        .Add("crop_bottom", tool.uCropBottom)
        .Add("aspect_class", tool.uAspectClass);
    return record;
}

int SpsVerb(Console &console, int argc, char **argv)
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
            return UsageError(console, "sps", Sprintf("bad option %s", argv[optind - 1]));
    }
    if (argc - optind != 1)
        return UsageError(console, "sps", "needs one file or hex string");
    const std::string arg = argv[optind];
    ParameterSet ps;
    Failure failure;
    if (!LoadParameterSet(arg, static_cast<int>(uWait), iStream, ps, failure)) {
        Report(console, arg, failure);
        return kExitData;
    }
    SpsReport report = CodecEntry(ps.codec)->pDescribe(ps.nal);
    if (bJson) {
        Value root = Value::Object();
        root.Add("input", arg).Add("codec_name", CodecName(ps.codec)).Add("source", ps.source);
        root.Add("sps_size", static_cast<uint64_t>(ps.nal.size()));
        root.Add("sps_bytes", HexBytes(ps.nal.data(), ps.nal.size(), 1024));
        for (const auto &[key, value] : report.facts.Members())
            if (key != "size_source")
                root.Add(key, value);
        root.Add("sps", std::move(report.full));
        if (report.pToolTitle)
            root.Add("sps_tool", std::move(report.tool));
        JsonWriter writer(console.pOut);
        root.Write(writer);
    } else {
        std::fprintf(console.pOut, "# %s: %s SPS from the %s, %zu bytes: %s\n", arg.c_str(), CodecName(ps.codec),
                     ps.source.c_str(), ps.nal.size(), HexBytes(ps.nal.data(), ps.nal.size(), 24).c_str());
        if (!report.summary.empty())
            std::fprintf(console.pOut, "# %s\n", report.summary.c_str());
        if (report.pToolTitle) {
            std::fprintf(console.pOut, "%-32s %-26s %s\n", "field", report.pFullTitle, report.pToolTitle);
            for (const auto &[name, full, tool] : report.rows)
                std::fprintf(console.pOut, "%-32s %-26s %s\n", name.c_str(), full.c_str(), tool.c_str());
        } else {
            std::fprintf(console.pOut, "%-32s %s\n", "field", report.pFullTitle);
            for (const auto &[name, full, tool] : report.rows)
                std::fprintf(console.pOut, "%-32s %s\n", name.c_str(), full.c_str());
        }
    }
    if (!report.bOk) {
        Report(console, arg, report.error);
        return kExitData;
    }
    return kExitOk;
}

} // namespace vorcal::cli
