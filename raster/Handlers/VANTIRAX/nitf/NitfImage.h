// CNitfImage: the first image segment of a plain NITF file. It parses the
// image subheader (both the NITF 2.0 and 2.1 layouts), decides whether the
// image is one this library serves, describes its colours and delivers rows:
// uncompressed images block by block from the file in any IMODE, compressed
// ones from the embedded decoder, which decodes a block when a row needs it.
#pragma once

#include "base/FileReader.h"
#include "base/Refusal.h"
#include "base/SlotCache.h"
#include "imaging/Jpeg2000Image.h"
#include "imaging/LeadToolLibWrapper.h"
#include "nitf/NitfBand.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <vector>

class CNitfFileHeader;
class FileCursor;

template <typename T>
void FreeVector(std::vector<T>& values)
{
    std::vector<T>().swap(values);
}

// compressionKind values, from the digit of IC ("I1" is 7).
enum NitfCompressionKind : int32_t {
    kUncompressed = 0,
    kBiLevel = 1,
    kArithmeticDpcm = 2,
    kJpeg = 3,
    kVectorQuantized = 4,
    kLosslessJpeg = 5,
    kDownsampledJpeg = 7,
    kJpeg2000 = 8,
};

constexpr uint32_t kBlockNotStored = 0xFFFFFFFF; // block record of a block the file leaves out
constexpr unsigned kSubheaderFrontSize = 372;   // IM to ICORDS, NITF 2.1 positions
constexpr unsigned kBlockingTextSize = 40;      // ISYNC to IMAG
constexpr unsigned kIgeoloSize = 60;
constexpr unsigned kCommentSize = 80;
constexpr size_t kRgbBands = 3;

class CNitfImage {
public:
    uint64_t dataOffset = 0;        // first byte of (blocked) image data
    int32_t NBPR = 0, NBPC = 0;
    int32_t NPPBH = 0, NPPBV = 0;
    int32_t NBPP = 0;
    int32_t ABPP = 0;
    int32_t bytesPerPixel = 0;      // NBPP / 8, rounded up: the bytes that hold one packed pixel's bits
    std::vector<uint8_t> lineBuffer;
    uint8_t isMono = 0;
    uint8_t isRgb = 0;              // also set for "RGB/LUT"
    uint8_t isMulti = 0;
    // The bands uncompressed rows show, in their order: R, G, B or one band.
    int32_t drawnBands[kRgbBands] = {};
    int32_t drawnBandCount = 0;
    int32_t compressionKind = kUncompressed;
    uint8_t isMasked = 0;
    std::vector<uint32_t> blockOffsets; // per block (per band and block in IMODE S), relative to dataOffset
    uint16_t version21 = 0;         // 1 in NITF 2.1 (from the file header), set before parsing
    uint32_t subheaderLength = 0;   // LISH of the segment, set before parsing; 0 when not known
    CLeadToolLibWrapper decoder;
    CJpeg2000Image jpeg2000;        // IC "C8": decodes tiles as rows need them
    char subheaderText[kSubheaderFrontSize] = {};
    std::unique_ptr<char[]> IGEOLO; // 60 characters and a NUL, or null without corners
    int32_t NICOM = 0;
    std::vector<char> comments;     // NICOM x 80 characters, not terminated
    char IC[2] = {};
    char COMRAT[4] = {};
    double comrat = 0;
    int32_t NBANDS = 0;
    std::vector<NitfBand> bands;
    char blockingText[kBlockingTextSize] = {};
    int32_t UDIDL = 0, UDOFL = 0;
    std::vector<uint8_t> UDID;
    int32_t IXSHDL = 0, IXSOFL = 0;
    std::vector<uint8_t> IXSHD;
    int32_t NCOLS = 0, NROWS = 0;
    Refusal refusal = Refusal::kNone; // why ReadSubheader or PrepareData failed

    CNitfImage() = default;
    CNitfImage(const CNitfImage&) = delete;
    CNitfImage& operator=(const CNitfImage&) = delete;

    // Parses the image subheader at offset. Image data is taken to start at
    // offset + subheaderLength when that is known. False on any failure.
    bool ReadSubheader(CFileReader& reader, uint32_t offset);
    // Parses the subheader of the file's first image segment: at HL, LISH
    // bytes long, in the header's NITF version.
    bool ReadSubheader(CFileReader& reader, const CNitfFileHeader& header);
    void Release();

    // Whether the image is served; sets up the decoder for compressed kinds.
    bool PrepareData(CFileReader& reader, uint64_t dataLength);
    bool IsPaletted() const;
    // Whether the palette holds colours (RGB/LUT tables), not grey values.
    bool ColourPalette() const;
    // Bytes per pixel of the rows the host expects: one palette index, or R,G,B.
    uint32_t HostPixelBytes() const;
    int32_t GetPaletteSize() const;
    bool GetPaletteEntry(int32_t index, uint8_t& red, uint8_t& green, uint8_t& blue) const;
    void AllocLineBuffer();
    // Readies the decoder of a compressed image, which decodes blocks as rows
    // need them; the decoder's error texts pass through as exceptions.
    bool OpenCompressed(CFileReader& reader, uint64_t dataLength);
    // One row, columns firstColumn..lastColumn inclusive, into out: one byte
    // per pixel for one band, three for three bands.
    bool ReadLine(CFileReader& reader, uint32_t row, int32_t firstColumn, int32_t lastColumn, uint8_t* out);
    void ReleaseDecoder();
    // Empties the block cache; every draw starts and ends with an empty one.
    void ReleaseBlockCache();

    char ICORDS() const { return subheaderText[kIcordsPosition]; }
    char IMODE() const { return blockingText[kImodePosition]; }
    const char* IREP() const { return subheaderText + kIrepPosition; }
    char PJUST() const { return subheaderText[kPjustPosition]; }

private:
    static constexpr unsigned kIcordsPosition = 371;
    static constexpr unsigned kImodePosition = 1;
    static constexpr unsigned kIrepPosition = 352;
    static constexpr unsigned kPjustPosition = 370;

    uint8_t isPrepared = 0;          // PrepareData accepted the image
    uint64_t readLimit = 0;          // bytes of the file that reads may reach
    uint32_t maskTableLength = 0;    // IMDATOFF: bytes of LI before the blocked data
    uint32_t storedBlockCount = 0;   // JPEG: streams the decoder decodes
    std::vector<uint32_t> streamIndex; // masked JPEG: the decoder's stream of each block
    // Strips of rows of the uncompressed blocks being read, one slot per block
    // column (per band and block column in IMODE "B" and "S"), so that a strip
    // costs one file read rather than one per row. Empty when they would take
    // more than kMaxBlockCacheBytes.
    SlotCache blockCache;

    // Where one strip of a block (of every band, or of one band) lies.
    struct BlockPlace {
        uint64_t start;  // file offset
        uint64_t bytes;
        uint32_t slot;   // its slot in the block cache
    };

    // Subheader steps.
    bool ReadFront(FileCursor& cursor, uint32_t offset);
    bool ReadCorners(FileCursor& cursor);
    bool ReadCompression(FileCursor& cursor);
    bool ReadBands(FileCursor& cursor);
    void ChooseDrawnBands();
    bool ReadBlocking(FileCursor& cursor);
    bool ReadExtensions(FileCursor& cursor);
    bool PlaceData(FileCursor& cursor, uint32_t offset);
    bool ReadMaskTable(FileCursor& cursor);
    void ClearParsed();

    // Data steps.
    bool ValidGeometry();
    Refusal UncompressedRefusal() const;
    bool IsRgbLut() const;
    bool IsPacked() const;
    bool OneBitIndices() const;
    bool DataFitsFile() const;
    bool PrepareJpegData(CFileReader& reader, uint64_t dataLength);
    bool PrepareJpeg2000Data(CFileReader& reader, uint64_t dataLength);
    bool IndexMaskedStreams();
    uint64_t BandBlockBytes() const;

    // Line steps.
    uint32_t OutputPixelBytes() const;
    bool DrawsEveryBandInOrder() const;
    bool ReadUncompressedBlock(CFileReader& reader, uint32_t block, uint32_t rowInBlock, uint32_t c0, uint32_t n,
                               uint8_t* out);
    // Scatters the band's span into out, or leaves its address in *deferred
    // when that is given and the bytes stay in the strip cache.
    bool ReadBandSpan(CFileReader& reader, uint64_t blockStart, uint32_t column, int32_t band, uint32_t rowInBlock,
                      uint32_t c0, uint32_t n, uint8_t* out, const uint8_t** deferred);
    void ScatterHeld(const uint8_t* const held[], uint32_t n, uint8_t* out) const;
    bool ReadPackedSpan(CFileReader& reader, uint64_t planeStart, uint32_t rowInBlock, uint32_t c0, uint32_t n,
                        int32_t drawn, uint8_t* out);
    BlockPlace StripPlace(uint64_t planeStart, uint32_t pixelBytes, uint32_t rowInBlock, uint32_t slot) const;
    bool ReadSpan(CFileReader& reader, const BlockPlace& place, uint64_t position, uint64_t count,
                  const uint8_t*& data);
    const uint8_t* CachedSpan(CFileReader& reader, const BlockPlace& place, uint64_t position, uint64_t count);
    void ScatterBand(const uint8_t* source, uint32_t sourceStride, uint32_t n, int32_t band, uint8_t* out) const;
    uint8_t ConvertPixel(const uint8_t* pixel) const;
    int32_t SignificantBits() const;
    bool ReadCompressedBlock(CFileReader& reader, uint32_t block, uint32_t rowInBlock, uint32_t c0, uint32_t c1,
                             uint8_t* out);
};
