#include "tests/StressFiles.h"

#include "tests/fixtures/BiLevelWriter.h"
#include "tests/fixtures/JpegBlockWriter.h"
#include "tests/fixtures/NitfImageWriter.h"
#include "tests/fixtures/RpfFrameWriter.h"

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
#define VX_SANITIZED_HEAP 1
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
#define VX_SANITIZED_HEAP 1
#endif
#endif

#ifdef VX_SANITIZED_HEAP
// The sanitizer runtime's count (gcc ships no header for it).
extern "C" size_t __sanitizer_get_current_allocated_bytes();
#else
#include <malloc.h>
#endif

namespace {

constexpr uint32_t kJpegBlockSide = 16;
constexpr uint32_t kBiLevelWidth = 96, kBiLevelHeight = 48;
constexpr uint64_t kFnvOffset = 1469598103934665603ull, kFnvPrime = 1099511628211ull;

std::string AsString(const std::vector<uint8_t>& bytes)
{
    return std::string(bytes.begin(), bytes.end());
}

NitfImagePlan BlockedImage(const std::string& IREP, int32_t bands, int32_t side, int32_t blockSide)
{
    NitfImagePlan plan;
    plan.rows = plan.columns = side;
    plan.NPPBH = plan.NPPBV = blockSide;
    plan.NBPR = plan.NBPC = (side + blockSide - 1) / blockSide;
    plan.IREP = IREP;
    plan.bands.assign(size_t(bands), NitfBandPlan{});
    return plan;
}

std::string JpegFile(unsigned seed)
{
    std::vector<Bytes> blocks;
    for (unsigned block = 0; block < 4; ++block)
        blocks.push_back(EncodeJpegBlock(TestPattern(kJpegBlockSide, kJpegBlockSide, 1, seed * 4 + block), {}));
    NitfImagePlan plan = BlockedImage("MONO", 1, 2 * kJpegBlockSide, kJpegBlockSide);
    plan.IC = "C3";
    plan.COMRAT = "00.0";
    return BuildImageFile(plan, AsString(BuildNitfJpegData(blocks, NitfApp6Plan{2, 2, 0, 0})));
}

std::string BiLevelFile(unsigned seed)
{
    std::vector<uint8_t> packed(size_t(kBiLevelWidth / 8) * kBiLevelHeight);
    for (size_t i = 0; i < packed.size(); ++i)
        packed[i] = static_cast<uint8_t>((i * 37 + seed * 11) ^ (i / 12));
    NitfImagePlan plan; // one block of the image's size, MONO
    plan.columns = int32_t(kBiLevelWidth);
    plan.rows = int32_t(kBiLevelHeight);
    plan.NBPP = 1;
    plan.IC = "C1";
    plan.COMRAT = seed % 2 ? "2DS " : "1D  ";
    return BuildImageFile(plan, AsString(EncodeT4Strip(packed, kBiLevelWidth, kBiLevelHeight, seed % 2 == 1)));
}

std::string RpfFile(unsigned seed)
{
    RpfFramePlan plan;
    plan.product = seed % 2 ? RpfProduct::Cib : RpfProduct::Cadrg;
    plan.bigEndian = seed % 3 != 0;
    plan.indexImage = PatternIndexImage();
    plan.maskedSubframes = {seed % kRpfSubframeCount};
    return BuildRpfFrame(plan).bytes;
}

std::string UncompressedFile(unsigned seed)
{
    NitfImagePlan plan = BlockedImage("RGB", 3, 40, 16);
    plan.IMODE = "BPRS"[seed % 4];
    plan.bands[0].IREPBAND = "R";
    plan.bands[1].IREPBAND = "G";
    plan.bands[2].IREPBAND = "B";
    const PixelValue pixel = [seed](int32_t band, int32_t row, int32_t column) {
        return uint64_t(band * 71 + row * 13 + column * 7 + seed * 5) & 0xFF;
    };
    return BuildImageFile(plan, JoinBlocks(BuildImageBlocks(plan, pixel)));
}

void Mix(uint64_t& digest, const uint8_t* bytes, size_t count)
{
    for (size_t i = 0; i < count; ++i)
        digest = (digest ^ bytes[i]) * kFnvPrime;
}

} // namespace

std::vector<StressFile> FilesOfEveryKind(unsigned seed)
{
    return {{"jpeg", JpegFile(seed)},
            {"bilevel", BiLevelFile(seed)},
            {"rpf", RpfFile(seed)},
            {"uncompressed", UncompressedFile(seed)}};
}

bool DrawResult::operator==(const DrawResult& other) const
{
    return openResult == other.openResult && status == other.status && width == other.width &&
           height == other.height && pixelKind == other.pixelKind && failedRows == other.failedRows &&
           digest == other.digest;
}

DrawResult OpenDrawClose(const HandlerExports& rh, const std::string& path, uint32_t maxRows)
{
    DrawResult result;
    OpenedImage image(rh, path);
    result.openResult = image.result;
    result.status = image.handle.status;
    if (!image.Ready())
        return result;
    result.width = image.handle.width;
    result.height = image.handle.height;
    result.pixelKind = image.handle.pixelKind;
    result.digest = kFnvOffset;
    if (image.handle.palette != nullptr)
        Mix(result.digest, image.handle.palette->entries, size_t(image.handle.palette->entryCount) * 3);
    const uint32_t rows = result.height < maxRows ? result.height : maxRows;
    std::vector<uint8_t> pixels;
    if (!image.Draw(0, 0, int32_t(result.width), int32_t(rows), pixels, result.failedRows))
        result.failedRows = UINT32_MAX;
    Mix(result.digest, pixels.data(), pixels.size());
    return result;
}

size_t HeapInUse()
{
#ifdef VX_SANITIZED_HEAP
    return __sanitizer_get_current_allocated_bytes();
#else
    return mallinfo2().uordblks;
#endif
}
