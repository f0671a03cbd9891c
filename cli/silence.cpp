// vorcal silence: a file of the layer's silence frames that players open.
#include <getopt.h>

#include <vorcal/audio_tools.h>

#include "verbs.hpp"

namespace vorcal::cli {

namespace {

enum SilenceOption { kOptCodec = 1000, kOptRate, kOptChannels, kOptFt, kOptFrames, kOptJson, kOptOut };

enum class Kind { Aac, HeAac, HeAacV2, AmrNb, AmrWb, Dra };

struct KindEntry {
    const char *pName;
    Kind kind;
};
constexpr KindEntry kKinds[] = {{"aac", Kind::Aac},     {"he-aac", Kind::HeAac}, {"he-aacv2", Kind::HeAacV2},
                                {"amrnb", Kind::AmrNb}, {"amrwb", Kind::AmrWb},  {"dra", Kind::Dra}};

// Frees a frame the layer allocated through the system layer.
struct LayerFrame {
    uint8_t *p = nullptr;
    uint32_t uLen = 0;
    ~LayerFrame()
    {
        if (p)
            g_vorSALMemoryTable->Free(p);
    }
};

} // namespace

int SilenceVerb(Console &console, int argc, char **argv)
{
    static const option kOptions[] = {{"codec", required_argument, nullptr, kOptCodec},
                                      {"rate", required_argument, nullptr, kOptRate},
                                      {"channels", required_argument, nullptr, kOptChannels},
                                      {"ft", required_argument, nullptr, kOptFt},
                                      {"frames", required_argument, nullptr, kOptFrames},
                                      {"json", no_argument, nullptr, kOptJson},
                                      {"output", required_argument, nullptr, kOptOut},
                                      {nullptr, 0, nullptr, 0}};
    const KindEntry *pKind = nullptr;
    uint64_t uRate = 0, uChannels = 0, uFt = 99, uFrames = 50;
    bool bJson = false;
    std::string out;
    for (int c; (c = getopt_long(argc, argv, "o:", kOptions, nullptr)) != -1;) {
        bool bOk = true;
        switch (c) {
        case kOptCodec:
            pKind = nullptr;
            for (const KindEntry &entry : kKinds)
                if (std::string(optarg) == entry.pName)
                    pKind = &entry;
            bOk = pKind != nullptr;
            break;
        case kOptRate: bOk = ParseNumber(optarg, 1, 192000, uRate); break;
        case kOptChannels: bOk = ParseNumber(optarg, 1, 8, uChannels); break;
        case kOptFt: bOk = ParseNumber(optarg, 0, 15, uFt); break;
        case kOptFrames: bOk = ParseNumber(optarg, 1, 10000000, uFrames); break;
        case kOptJson: bJson = true; break;
        case 'o':
        case kOptOut: out = optarg; break;
        default: bOk = false; break;
        }
        if (!bOk)
            return UsageError(console, "silence", Sprintf("bad option %s", argv[optind - 1]));
    }
    if (optind != argc)
        return UsageError(console, "silence", Sprintf("unexpected argument %s", argv[optind]));
    if (!pKind)
        return UsageError(console, "silence", "needs --codec");
    if (out.empty())
        return UsageError(console, "silence", "needs -o FILE");

    LayerFrame frame;
    const char *pMagic = "";
    int32_t iResult = -1;
    switch (pKind->kind) {
    case Kind::Aac:
    case Kind::HeAac:
    case Kind::HeAacV2: {
        // Modes 0/1 plain, 2/3 with SBR, 4 with SBR and PS (one coded channel, two decoded). The
        // SBR modes put the core rate, half the output rate, in the ADTS header.
        const bool bSbr = pKind->kind != Kind::Aac;
        if (!uRate)
            uRate = 44100;
        if (!uChannels)
            uChannels = 2;
        if (pKind->kind == Kind::HeAacV2 && uChannels != 2)
            return UsageError(console, "silence", "he-aacv2 frames decode to 2 channels");
        if (uChannels > 2)
            return UsageError(console, "silence", "AAC silence frames have 1 or 2 channels");
        const int32_t iMode = pKind->kind == Kind::HeAacV2 ? 4 : (bSbr ? 2 : 0) + static_cast<int32_t>(uChannels) - 1;
        if (bSbr && uRate % 2)
            return UsageError(console, "silence", "an HE-AAC output rate must be even (twice the core rate)");
        const uint32_t uHeaderRate = static_cast<uint32_t>(bSbr ? uRate / 2 : uRate);
        iResult = AAC_MuteFrame(&frame.p, &frame.uLen, 0, uHeaderRate, pKind->kind == Kind::HeAacV2 ? 1 : static_cast<uint32_t>(uChannels),
                                1, iMode);
        break;
    }
    case Kind::AmrNb:
    case Kind::AmrWb: {
        const bool bWide = pKind->kind == Kind::AmrWb;
        if (uFt == 99)
            uFt = bWide ? 8 : 7;
        iResult = bWide ? AMRWB_MuteFrame(&frame.p, &frame.uLen, static_cast<uint32_t>(uFt))
                        : AMRNB_MuteFrame(&frame.p, &frame.uLen, static_cast<uint32_t>(uFt));
        pMagic = bWide ? "#!AMR-WB\n" : "#!AMR\n";
        uRate = bWide ? 16000 : 8000;
        uChannels = 1;
        break;
    }
    case Kind::Dra:
        if (!uRate)
            uRate = 48000;
        if (!uChannels)
            uChannels = 2;
        iResult = DRA_MuteFrame(&frame.p, &frame.uLen, static_cast<uint32_t>(uRate), static_cast<uint32_t>(uChannels));
        break;
    }
    if (iResult != 0 || !frame.p) {
        std::fprintf(console.pErr, "vorcal: silence: the layer has no %s silence frame for %llu Hz, %llu channels%s\n",
                     pKind->pName, static_cast<unsigned long long>(uRate), static_cast<unsigned long long>(uChannels),
                     uFt != 99 ? Sprintf(", frame type %llu", static_cast<unsigned long long>(uFt)).c_str() : "");
        return kExitData;
    }
    Output output;
    if (!output.Open(console, out))
        return kExitData;
    output.Write(pMagic, std::char_traits<char>::length(pMagic));
    for (uint64_t i = 0; i < uFrames; ++i)
        output.Write(frame.p, frame.uLen);
    if (!output.Close(console))
        return kExitData;
    if (bJson) {
        JsonWriter writer(console.pOut);
        Value root = Value::Object();
        root.Add("codec", pKind->pName).Add("sample_rate", std::to_string(uRate)).Add("channels", uChannels);
        root.Add("frames", uFrames).Add("frame_size", frame.uLen).Add("bytes", output.Bytes()).Add("output", out);
        root.Add("first_bytes", HexBytes(frame.p, frame.uLen, 16));
        root.Write(writer);
    } else if (out != "-") {
        std::fprintf(console.pOut, "%s: %llu %s silence frames of %u bytes (%llu Hz, %llu channels), %llu bytes\n",
                     out.c_str(), static_cast<unsigned long long>(uFrames), pKind->pName, frame.uLen,
                     static_cast<unsigned long long>(uRate), static_cast<unsigned long long>(uChannels),
                     static_cast<unsigned long long>(output.Bytes()));
    }
    return kExitOk;
}

} // namespace vorcal::cli
