/*
 * A minimal media engine written against the C interface: it registers a toy H.264 video
 * decoder, opens dump slot 0, initialises the decoder with a length-prefixed configuration
 * and decodes a few length-prefixed frames. The decoder asks for Annex B frames without
 * in-band parameter sets, so the layer converts what it is given; the toy decoder prints what
 * reaches it. The dump file holds what the engine passed.
 *
 * usage: vorcal_example_engine DUMP_FILE
 */
#include <stdio.h>

#include <vorcal/vorcal.h>

static int32_t ToyGetProperty(uint32_t uProperty, uint32_t *puValue)
{
    switch (uProperty) {
    case CAL_PROP_STREAM_PARAMETERS: *puValue = 1; return 0;
    case CAL_PROP_H264_FRAME_FORMAT: *puValue = CAL_AVC_FORMAT_ANNEXB; return 0;
    case CAL_PROP_H264_CONFIG_FORMAT: *puValue = CAL_AVC_FORMAT_ANNEXB; return 0;
    case CAL_PROP_H264_INBAND_PARAM_SETS: *puValue = 0; return 0;
    default: return -1;
    }
}

static void PrintBytes(const char *pWhat, const uint8_t *pData, int32_t iLen)
{
    int32_t i;
    printf("  decoder %s (%d bytes):", pWhat, (int)iLen);
    for (i = 0; i < iLen && i < 24; ++i)
        printf(" %02X", pData[i]);
    printf("%s\n", iLen > 24 ? " ..." : "");
}

static int32_t ToyInit(uint32_t uOTI, const uint8_t *pConfig, int32_t iConfigLen, const uint8_t *pConfigEnhance,
                       int32_t iEnhLen, uint32_t uNALLengthSize, uint32_t *puWidth, uint32_t *puHeight,
                       uint32_t *puPitch, CALParam *ppUserData)
{
    (void)pConfigEnhance; (void)iEnhLen; (void)uNALLengthSize; (void)puWidth; (void)puHeight; (void)puPitch;
    printf("  decoder Init, OTI 0x%X\n", (unsigned)uOTI);
    PrintBytes("configuration", pConfig, iConfigLen);
    *ppUserData = 0x1234; /* the decoder's own context */
    return 0;
}

static int32_t ToyDeinit(CALParam ud)
{
    printf("  decoder Deinit, context 0x%X\n", (unsigned)ud);
    return 0;
}

static int32_t ToyDecode(const uint8_t *pData, int32_t iLen, CALParam uParam3, CALParam uParam4,
                         uint32_t *puDecodeResult, CALParam ud)
{
    (void)uParam3; (void)uParam4; (void)ud;
    PrintBytes("frame", pData, iLen);
    *puDecodeResult = 0;
    return 0;
}

int main(int argc, char **argv)
{
    /* avcC record: Baseline, level 3.0, 4-byte lengths, one SPS (320x240), one PPS. */
    static const uint8_t kConfig[] = {0x01, 0x42, 0xC0, 0x1E, 0xFF, 0xE1, 0x00, 0x0A, 0x67, 0x42, 0xC0,
                                      0x1E, 0xDA, 0x05, 0x07, 0xE8, 0x40, 0x00, 0x01, 0x00, 0x04, 0x68,
                                      0xCE, 0x3C, 0x80};
    /* An IDR frame that repeats its parameter sets, then two P frames (4-byte lengths). */
    static const uint8_t kFrame0[] = {0x00, 0x00, 0x00, 0x0A, 0x67, 0x42, 0xC0, 0x1E, 0xDA, 0x05, 0x07, 0xE8,
                                      0x40, 0x00, 0x00, 0x00, 0x00, 0x04, 0x68, 0xCE, 0x3C, 0x80, 0x00, 0x00,
                                      0x00, 0x06, 0x65, 0x88, 0x84, 0x00, 0x33, 0xFF};
    static const uint8_t kFrame1[] = {0x00, 0x00, 0x00, 0x05, 0x41, 0x9A, 0x02, 0x0C, 0x5F};
    static const uint8_t kFrame2[] = {0x00, 0x00, 0x00, 0x05, 0x41, 0x9A, 0x04, 0x0C, 0x5F};
    const uint8_t *apFrames[] = {kFrame0, kFrame1, kFrame2};
    const int32_t aiLens[] = {sizeof kFrame0, sizeof kFrame1, sizeof kFrame2};
    CALVideoDecoderFunctions functions = {ToyGetProperty, ToyInit, ToyDeinit, ToyDecode, NULL, NULL};
    uint32_t uWidth = 0, uHeight = 0, uPitch = 0, uResult = 0;
    CALHandle *hCAL;
    CALCodec *hCodec;
    int32_t i, iInit;

    if (argc != 2) {
        fprintf(stderr, "usage: %s DUMP_FILE\n", argv[0]);
        return 2;
    }
    printf("%s\n", vorCAL_GetVersionInfo());
    hCAL = vorCAL_GetHandle(0, 1, 1);
    if (!hCAL || !vorCAL_RegisterCodec(hCAL, 2, 1, CAL_OTI_H264, &functions, sizeof functions)) {
        fprintf(stderr, "cannot register the decoder\n");
        return 1;
    }
    if (vorCAL_DumpFrames(hCAL, argv[1], 0) == 0)
        fprintf(stderr, "cannot open %s: decoding without a dump\n", argv[1]);
    hCodec = vorCAL_GetCodec(hCAL, 2, 1, CAL_OTI_H264);
    if (!hCodec) {
        fprintf(stderr, "no decoder\n");
        return 1;
    }
    printf("engine: Init with a %d-byte avcC record\n", (int)sizeof kConfig);
    iInit = vorCAL_VideoDecoderInit(hCodec, CAL_OTI_H264, kConfig, sizeof kConfig, NULL, 0, 4, &uWidth,
                                    &uHeight, &uPitch, 0);
    printf("engine: Init result %d, picture %ux%u%s\n", (int)iInit, (unsigned)uWidth, (unsigned)uHeight,
           uWidth ? "" : " (the layer reads the picture size from start-code framed configurations only)");
    for (i = 0; i < 3; ++i) {
        int32_t iResult;
        printf("engine: Decode frame %d (%d bytes, length-prefixed)\n", (int)i, (int)aiLens[i]);
        iResult = vorCAL_VideoDecoderDecode(hCodec, apFrames[i], aiLens[i], 0, 0, &uResult);
        printf("engine: Decode result %d, result word %u\n", (int)iResult, (unsigned)uResult);
    }
    vorCAL_VideoDecoderDeinit(hCodec);
    vorCAL_ReleaseCodec(hCodec);
    vorCAL_ReleaseHandle(hCAL);
    printf("engine: dump written to %s\n", argv[1]);
    return 0;
}
