#include "bench/BenchFiles.h"

#include "tests/fixtures/JpegBlockWriter.h"
#include "tests/fixtures/NitfImageWriter.h"

#include <gdal.h>
#include <tiffio.h>

#include <cstdint>
#include <cstdio>
#include <fcntl.h>
#include <fstream>
#include <sys/stat.h>
#include <unistd.h>

namespace {

constexpr int kImageSize = 4096;
constexpr int kBlockSize = 1024;
constexpr int kBiLevelSize = 4096;
constexpr int kRgbBands = 3;

bool Exists(const std::string& path)
{
    struct stat info {};
    return ::stat(path.c_str(), &info) == 0;
}

// A repeatable pseudo-random value per pixel, so that compressed sizes are
// those of a textured picture rather than of flat areas.
uint32_t Noise(uint32_t x, uint32_t y)
{
    uint32_t h = x * 0x9E3779B1u ^ y * 0x85EBCA77u;
    h ^= h >> 15;
    h *= 0x2C1B3C6Du;
    return h ^ (h >> 12);
}

uint8_t RgbValue(int band, int x, int y)
{
    const int smooth = band == 0 ? x / 16 : band == 1 ? y / 16 : (x + y) / 32;
    return static_cast<uint8_t>(smooth + (Noise(x, y + band) & 0x0F));
}

uint16_t MonoValue(int x, int y)
{
    return static_cast<uint16_t>(x * 7 + y * 11 + (Noise(x, y) & 0xFF));
}

// An in-memory dataset of the synthetic 8-bit RGB picture.
GDALDatasetH MakePicture(int size)
{
    GDALDatasetH picture = GDALCreate(GDALGetDriverByName("MEM"), "", size, size, kRgbBands, GDT_Byte, nullptr);
    std::vector<uint8_t> row(size);
    for (int band = 0; band < kRgbBands; ++band) {
        GDALRasterBandH target = GDALGetRasterBand(picture, band + 1);
        GDALSetRasterColorInterpretation(target, GDALColorInterp(GCI_RedBand + band));
        for (int y = 0; y < size; ++y) {
            for (int x = 0; x < size; ++x)
                row[x] = RgbValue(band, x, y);
            if (GDALRasterIO(target, GF_Write, 0, y, size, 1, row.data(), size, 1, GDT_Byte, 0, 0) != CE_None)
                return picture;
        }
    }
    return picture;
}

bool WriteNitf(const std::string& path, GDALDatasetH picture, const std::vector<std::string>& options)
{
    std::vector<char*> list;
    for (const std::string& option : options)
        list.push_back(const_cast<char*>(option.c_str()));
    list.push_back(nullptr);
    GDALDatasetH written =
        GDALCreateCopy(GDALGetDriverByName("NITF"), path.c_str(), picture, FALSE, list.data(), nullptr, nullptr);
    if (written == nullptr)
        return false;
    GDALClose(written);
    return true;
}

std::vector<std::string> BlockOptions(int blockSize)
{
    return {"BLOCKXSIZE=" + std::to_string(blockSize), "BLOCKYSIZE=" + std::to_string(blockSize)};
}

// An uncompressed image in the given IMODE through the fixture writer (GDAL
// writes only one interleave).
bool WriteUncompressedImage(const std::string& path, bool rgb, char imode)
{
    NitfImagePlan plan;
    plan.rows = plan.columns = kImageSize;
    plan.NPPBH = plan.NPPBV = kBlockSize;
    plan.NBPR = plan.NBPC = kImageSize / kBlockSize;
    plan.IMODE = imode;
    plan.IREP = rgb ? "RGB" : "MONO";
    plan.NBPP = rgb ? 8 : 16;
    plan.bands.assign(rgb ? kRgbBands : 1, NitfBandPlan{});
    if (rgb) {
        plan.bands[0].IREPBAND = "R";
        plan.bands[1].IREPBAND = "G";
        plan.bands[2].IREPBAND = "B";
    }
    const PixelValue pixel = [rgb](int32_t band, int32_t row, int32_t column) -> uint64_t {
        return rgb ? RgbValue(band, column, row) : MonoValue(column, row);
    };
    std::ofstream out(path, std::ios::binary);
    out << BuildImageFile(plan, JoinBlocks(BuildImageBlocks(plan, pixel)));
    return static_cast<bool>(out);
}

void AddUncompressed(const std::string& dir, bool rgb, std::vector<BenchCase>& cases)
{
    for (char imode : {'B', 'P', 'R', 'S'}) {
        const std::string name = std::string("nc-") + imode + (rgb ? "-rgb8" : "-mono16");
        const std::string path = dir + "/" + name + ".ntf";
        if (Exists(path) || WriteUncompressedImage(path, rgb, imode))
            cases.push_back({name, path, false});
    }
}

// Black strokes on white, roughly as dense as a scanned page of text.
bool BiLevelInk(int x, int y)
{
    const bool inLine = y % 24 < 16 && x % 10 < 7;
    return inLine && (Noise(x / 10, y / 24) & 3) != 0 && (Noise(x / 2, y / 3) & 1) != 0;
}

// One strip of CCITT T.4 one-dimensional coding with byte-aligned EOLs, made
// by libtiff: the bytes that a bi-level NITF image stores.
std::string FaxStrip(const std::string& scratch, int size)
{
    TIFF* tiff = TIFFOpen(scratch.c_str(), "w");
    if (tiff == nullptr)
        return {};
    TIFFSetField(tiff, TIFFTAG_IMAGEWIDTH, size);
    TIFFSetField(tiff, TIFFTAG_IMAGELENGTH, size);
    TIFFSetField(tiff, TIFFTAG_BITSPERSAMPLE, 1);
    TIFFSetField(tiff, TIFFTAG_SAMPLESPERPIXEL, 1);
    TIFFSetField(tiff, TIFFTAG_PHOTOMETRIC, PHOTOMETRIC_MINISWHITE);
    TIFFSetField(tiff, TIFFTAG_COMPRESSION, COMPRESSION_CCITTFAX3);
    TIFFSetField(tiff, TIFFTAG_GROUP3OPTIONS, GROUP3OPT_FILLBITS);
    TIFFSetField(tiff, TIFFTAG_FILLORDER, FILLORDER_MSB2LSB);
    TIFFSetField(tiff, TIFFTAG_ROWSPERSTRIP, size);
    std::vector<uint8_t> row((size + 7) / 8);
    for (int y = 0; y < size; ++y) {
        std::fill(row.begin(), row.end(), 0);
        for (int x = 0; x < size; ++x)
            if (BiLevelInk(x, y))
                row[x / 8] |= static_cast<uint8_t>(0x80 >> (x % 8));
        TIFFWriteScanline(tiff, row.data(), y, 0);
    }
    TIFFClose(tiff);
    tiff = TIFFOpen(scratch.c_str(), "r");
    if (tiff == nullptr)
        return {};
    std::string strip(TIFFRawStripSize(tiff, 0), '\0');
    const tmsize_t got = TIFFReadRawStrip(tiff, 0, strip.data(), static_cast<tmsize_t>(strip.size()));
    TIFFClose(tiff);
    ::unlink(scratch.c_str());
    return got > 0 ? strip.substr(0, got) : std::string();
}

bool WriteBiLevel(const std::string& path)
{
    const std::string strip = FaxStrip(path + ".tif", kBiLevelSize);
    if (strip.empty())
        return false;
    NitfImagePlan plan;
    plan.rows = plan.columns = kBiLevelSize;
    plan.IREP = "MONO";
    plan.IC = "C1";
    plan.COMRAT = "1D  ";
    plan.NBPP = 1;
    std::ofstream out(path, std::ios::binary);
    out << BuildImageFile(plan, strip);
    return static_cast<bool>(out);
}

void AddCorpusFrame(const std::string& corpus, const char* name, const char* file, std::vector<BenchCase>& cases)
{
    const std::string path = corpus + "/" + file;
    if (Exists(path))
        cases.push_back({name, path, false});
}

// Writes the picture as a C8 image in tiles of kBlockSize, then closes the picture.
bool WriteJpeg2000Image(const std::string& path, GDALDatasetH picture)
{
    std::vector<std::string> options = BlockOptions(kBlockSize);
    options.push_back("IC=C8");
    const bool written = WriteNitf(path, picture, options);
    GDALClose(picture);
    return written;
}

// A grey picture of side x side with some texture, in memory.
GDALDatasetH MakeGreyPicture(int side)
{
    GDALDatasetH picture = GDALCreate(GDALGetDriverByName("MEM"), "", side, side, 1, GDT_Byte, nullptr);
    GDALRasterBandH band = GDALGetRasterBand(picture, 1);
    std::vector<uint8_t> row(static_cast<size_t>(side));
    for (int y = 0; y < side; ++y) {
        for (int x = 0; x < side; ++x)
            row[size_t(x)] = uint8_t((x + y) / 64 + (Noise(x, y) & 0x07));
        if (GDALRasterIO(band, GF_Write, 0, y, side, 1, row.data(), side, 1, GDT_Byte, 0, 0) != CE_None)
            break;
    }
    return picture;
}

constexpr int32_t kSparseSide = 73000;
constexpr int32_t kSparseBlockSide = 8192;
constexpr size_t kFlOffset = 342, kLiOffset = 369; // FL (12 digits) and LI (10) of a NITF 2.1 file
constexpr int kDistinctStreams = 8;

// The file of this image with FL and LI declaring dataBytes of image data.
std::string HeaderDeclaring(const NitfImagePlan& plan, uint64_t dataBytes, const std::string& data)
{
    std::string file = BuildImageFile(plan, data);
    const size_t header = file.size() - data.size();
    file.replace(kFlOffset, 12, Digits(header + dataBytes, 12));
    file.replace(kLiOffset, 10, Digits(dataBytes, 10));
    return file;
}

// 9 x 9 blocks of 8192 x 8192 bytes, holes on disk.
bool WriteSparseMono(const std::string& path)
{
    NitfImagePlan plan;
    plan.rows = plan.columns = kSparseSide;
    plan.NPPBH = plan.NPPBV = kSparseBlockSide;
    plan.NBPR = plan.NBPC = (kSparseSide + kSparseBlockSide - 1) / kSparseBlockSide;
    const uint64_t dataBytes = uint64_t(plan.NBPR) * plan.NBPC * kSparseBlockSide * kSparseBlockSide;
    const std::string header = HeaderDeclaring(plan, dataBytes, "");
    const int file = ::open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    const bool written = file >= 0 && ::pwrite(file, header.data(), header.size(), 0) == ssize_t(header.size()) &&
                         ::ftruncate(file, off_t(header.size() + dataBytes)) == 0;
    return (file < 0 || ::close(file) == 0) && written;
}

// Grey blocks of a smooth picture with some texture, kDistinctStreams of
// them repeated over the image: a file of moderate size that decodes as a
// real image of its size would.
bool WriteRepeatedJpeg(const std::string& path, int side, int blockSide)
{
    const int perRow = side / blockSide;
    JpegBlockPlan block;
    block.width = block.height = uint32_t(blockSide);
    std::vector<Bytes> streams;
    for (int k = 0; k < kDistinctStreams; ++k) {
        Bytes pixels(size_t(blockSide) * blockSide);
        for (int y = 0; y < blockSide; ++y)
            for (int x = 0; x < blockSide; ++x)
                pixels[size_t(y) * blockSide + x] = uint8_t((x + y) / 8 + k * 16 + (Noise(x, y + k) & 0x07));
        streams.push_back(EncodeJpegBlock(pixels, block));
    }
    std::vector<Bytes> blocks;
    for (int i = 0; i < perRow * perRow; ++i)
        blocks.push_back(streams[size_t(i % kDistinctStreams)]);
    NitfApp6Plan app6;
    app6.blocksPerRow = app6.blocksPerColumn = uint16_t(perRow);
    const Bytes data = BuildNitfJpegData(blocks, app6);
    NitfImagePlan plan;
    plan.rows = plan.columns = side;
    plan.NPPBH = plan.NPPBV = blockSide;
    plan.NBPR = plan.NBPC = perRow;
    plan.IC = "C3";
    plan.COMRAT = "00.0";
    std::ofstream out(path, std::ios::binary);
    out << HeaderDeclaring(plan, data.size(), std::string(data.begin(), data.end()));
    return static_cast<bool>(out);
}

} // namespace

std::vector<LargeCase> PrepareLargeCases(const std::string& dataDir)
{
    ::mkdir(dataDir.c_str(), 0755);
    std::vector<LargeCase> cases;
    const std::string sparse = dataDir + "/nc-mono8-5gib.ntf";
    if (Exists(sparse) || WriteSparseMono(sparse))
        cases.push_back({"nc-mono8-5gib", sparse, false, kSparseBlockSide});
    for (const auto& [side, blockSide] : {std::pair{32768, 512}, std::pair{65536, 1024}}) {
        const std::string name = "jpeg-" + std::to_string(side) + "-blocks" + std::to_string(blockSide);
        const std::string path = dataDir + "/" + name + ".ntf";
        if (Exists(path) || WriteRepeatedJpeg(path, side, blockSide))
            cases.push_back({name, path, true, blockSide});
    }
    const std::string jpeg2000 = dataDir + "/jpeg2000-32768.ntf";
    if (Exists(jpeg2000) || WriteJpeg2000Image(jpeg2000, MakeGreyPicture(32768)))
        cases.push_back({"jpeg2000-32768", jpeg2000, false, 0});
    return cases;
}

bool WriteJpegImage(const std::string& path, int size, int blockSize)
{
    GDALDatasetH picture = MakePicture(size);
    std::vector<std::string> options = BlockOptions(blockSize);
    options.push_back("IC=C3");
    const bool written = WriteNitf(path, picture, options);
    GDALClose(picture);
    return written;
}

std::vector<BenchCase> PrepareCases(const std::string& dataDir, const std::string& corpusDir)
{
    ::mkdir(dataDir.c_str(), 0755);
    std::vector<BenchCase> cases;
    AddCorpusFrame(corpusDir, "cadrg", "rpf/cadrg/001zc013.on1", cases);
    AddCorpusFrame(corpusDir, "cib", "rpf/cib-ftdrum/rpf/n44w076/004crq26.i12", cases);
    AddCorpusFrame(corpusDir, "cadrg-masked", "jitc-nitf20/U_3058B.NTF", cases);
    AddCorpusFrame(corpusDir, "cib-masked", "rpf/cib-ftdrum/rpf/n44w076/004b1r16.i12", cases);
    AddUncompressed(dataDir, true, cases);
    AddUncompressed(dataDir, false, cases);
    const std::pair<const char*, int> jpegs[] = {{"jpeg-1block", kImageSize}, {"jpeg-16blocks", kBlockSize}};
    for (const auto& [name, blockSize] : jpegs) {
        const std::string path = dataDir + "/" + name + ".ntf";
        if (Exists(path) || WriteJpegImage(path, kImageSize, blockSize))
            cases.push_back({name, path, true});
    }
    // JPEG 2000 as GDAL writes it (OpenJPEG, tiles of 1024): GDAL decodes it with the same library.
    const std::string jpeg2000 = dataDir + "/jpeg2000-c8.ntf";
    if (Exists(jpeg2000) || WriteJpeg2000Image(jpeg2000, MakePicture(kImageSize)))
        cases.push_back({"jpeg2000-c8", jpeg2000, false});
    const std::string biLevel = dataDir + "/bilevel-c1.ntf";
    if (Exists(biLevel) || WriteBiLevel(biLevel))
        cases.push_back({"bilevel-c1", biLevel, false});
    return cases;
}
