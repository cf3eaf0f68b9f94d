#include "imaging/LeadToolLibWrapper.h"

#include "base/ByteOrder.h"
#include "base/CheckedRead.h"
#include "base/Limits.h"
#include "imaging/JpegMarkers.h"
#include "imaging/NitfJpegDefaults.h"

#include <algorithm>
#include <cstring>
#include <memory>
#include <new>
#include <stdexcept>

const char* const kReinitialisedText =
    "CLeadToolLibWrapper::openJPEGBitmap. Non sunctioned re initialization of BITMAPHANDLE array!";
const char* const kDamagedImageText = "CLeadToolLibWrapper::openJPEGBitmap. Multi block image is damaged!";
const char* const kOutOfMemoryText = "CLeadToolLibWrapper::openJPEGBitmap. Not enough memory for image displaying!";

namespace {

constexpr uint32_t kScanChunkSize = 32 * 1024; // one read per chunk: a stream costs few system calls
// NITF blocks are at most 8192 pixels a side, unless the image is one block.
constexpr uint32_t kLargestNitfBlockSide = 8192;

constexpr unsigned kGreyBits = 8;
constexpr unsigned kColourBits = 24;
constexpr uint8_t kRgbStreamColour = 1;
constexpr uint8_t kWhitePixel = 255;
constexpr uint8_t kBlackPixel = 0;

bool IsUnservedDepth(uint32_t NBPP)
{
    return NBPP == 12 || NBPP == 16;
}

void ClearReadFailure(CFileReader& reader)
{
    reader.error = 0;
    reader.endOfFile = 0;
}

// A stretch of the file as the marker walk sees it, read a chunk at a time;
// the stretch lies within the file, so reads are checked against its end.
class FileStreamBytes : public JpegBytes {
public:
    FileStreamBytes(CFileReader& fileReader, uint64_t startOffset, uint64_t byteCount)
        : reader(fileReader), start(startOffset), size(byteCount)
    {
    }
    uint64_t Size() const override { return size; }
    const uint8_t* Window(uint64_t at, size_t& count) override
    {
        count = size_t(std::min<uint64_t>(kScanChunkSize, size - at));
        if (!CheckedRead(reader, start + size, start + at, chunk, count)) {
            ClearReadFailure(reader);
            return nullptr;
        }
        return chunk;
    }

private:
    CFileReader& reader;
    const uint64_t start;
    const uint64_t size;
    uint8_t chunk[kScanChunkSize] = {};
};

struct StreamPlace {
    uint64_t offset;    // of its SOI
    uint32_t length;    // to the end of its EOI
};

// The stream that starts at `start`, after any fill bytes, walked segment by
// segment; it must end with EOI before `end`.
bool LocateStream(CFileReader& reader, uint64_t start, uint64_t end, StreamPlace& place)
{
    if (start >= end)
        return false;
    FileStreamBytes bytes(reader, start, end - start);
    JpegMarkerWalk walk(bytes);
    JpegSegment segment;
    if (!walk.Next(segment))
        return false;
    const uint64_t first = segment.marker;
    while (walk.Next(segment)) {
    }
    const uint64_t length = segment.marker + 2 - first;
    if (!walk.Complete() || length > UINT32_MAX)
        return false;
    place = StreamPlace {start + first, static_cast<uint32_t>(length)};
    return true;
}

// A masked image's stream ends where the stored block next in offset order
// begins, or at the end of the image data.
uint64_t MaskedStreamEnd(const std::vector<uint32_t>& sortedOffsets, uint32_t offset, uint64_t dataOffset,
                         uint64_t dataEnd)
{
    auto following = std::upper_bound(sortedOffsets.begin(), sortedOffsets.end(), offset);
    return following == sortedOffsets.end() ? dataEnd : std::min(dataEnd, dataOffset + *following);
}

// The DQT and DHT segments a stream holds before its first scan, and where
// missing ones go: before the frame header.
struct TablePlace {
    bool hasDht = false;
    bool hasDqt = false;
    bool framed = false;
    size_t insertAt = 0;
};

TablePlace FindTables(const uint8_t* stream, size_t size)
{
    TablePlace tables;
    JpegMemoryBytes bytes(stream, size);
    JpegMarkerWalk walk(bytes);
    JpegSegment segment;
    while (walk.Next(segment) && segment.code != kStartOfScan) {
        tables.hasDht = tables.hasDht || segment.code == kDefineHuffmanTables;
        tables.hasDqt = tables.hasDqt || segment.code == kDefineQuantisationTables;
        if (!tables.framed && IsFrameMarker(segment.code)) {
            tables.framed = true;
            tables.insertAt = size_t(segment.marker);
        }
    }
    return tables;
}

void ToHostOrder16(uint8_t* field)
{
    uint16_t value = BigEndian16(field);
    std::memcpy(field, &value, sizeof value);
}

uint8_t ClampedByte(double value)
{
    return static_cast<uint8_t>((value > 255.0 ? 255.0 : value) + 0.5);
}

// The scaled colour conversion of three-byte pixels that the loader did not
// deliver as R,G,B.
void ConvertColours(uint8_t* pixels, int64_t byteCount)
{
    for (int64_t i = 0; i + 2 < byteCount; i += 3) {
        double p0 = pixels[i], p1 = pixels[i + 1], p2 = pixels[i + 2];
        pixels[i] = ClampedByte((0.299 * p0 + 0.587 * p1 + 0.114 * p2) * 1.3);
        pixels[i + 1] = ClampedByte((0.5 * p2 - (0.1687 * p0 + 0.3313 * p1) + 128) * 1.3);
        pixels[i + 2] = ClampedByte((0.5 * p0 - 0.4187 * p1 - 0.0813 * p2 + 128) * 1.3);
    }
}

FILEINFO FreshFileInfo()
{
    FILEINFO info {};
    info.structSize = sizeof info;
    return info;
}

uint64_t BitmapBytes(const BITMAPHANDLE* bitmap)
{
    return uint64_t(bitmap->bytesPerLine) * bitmap->height;
}

// The smallest whole number of times a frame side must be repeated to reach
// extent pixels (1 when it reaches them already).
uint32_t RepeatFactor(uint32_t frame, uint32_t extent)
{
    if (frame == 0)
        return UINT32_MAX;
    return extent <= frame ? 1 : (extent - 1) / frame + 1;
}

// The span's pixels, fetched from the frame to the start of `row`, spread
// over columns first to first + count - 1, each frame pixel repeated
// `factor` times. Worked from the end: no pixel is read after it is overwritten.
void RepeatPixels(uint8_t* row, uint32_t first, uint32_t count, uint32_t factor, uint32_t pixelBytes)
{
    const uint32_t origin = first / factor;
    for (uint32_t i = count; i-- > 0;) {
        const uint32_t source = (first + i) / factor - origin;
        std::memmove(row + size_t(i) * pixelBytes, row + size_t(source) * pixelBytes, pixelBytes);
    }
}

}  // namespace

CLeadToolLibWrapper::CLeadToolLibWrapper()
{
    std::memcpy(tiffHeader, kBiLevelTiffTemplate.data(), kBiLevelHeaderSize);
}

CLeadToolLibWrapper::~CLeadToolLibWrapper()
{
    FreeBitmaps();
}

bool CLeadToolLibWrapper::PrepareBiLevel()
{
    if (!EnsureLibrary())
        return false;
    kind = kBiLevelDecoder;
    return true;
}

bool CLeadToolLibWrapper::PrepareJpeg(CFileReader& reader, uint64_t dataOffset, uint64_t /*LI*/, uint32_t NBPP)
{
    if (!EnsureLibrary() || IsUnservedDepth(NBPP))
        return false;
    if (!ReadNitfApp6(reader, dataOffset) || std::memcmp(app6 + 4, "NITF", 4) != 0)
        return false;
    kind = kJpegDecoder;
    return true;
}

bool CLeadToolLibWrapper::Open(CFileReader& reader, uint64_t dataOffset, uint32_t blockCount, uint64_t LI,
                               uint32_t NBPP, uint32_t NBANDS, uint32_t NCOLS, uint32_t NROWS, bool oneDimensional,
                               uint32_t blockWidth, uint32_t blockHeight, bool downsampledFrames)
{
    if (kind == kNotPrepared || !EnsureLibrary())
        return false;
    // Checked before the counts change: FreeBitmaps walks bitmapCount records.
    if (bitmaps != nullptr)
        throw std::runtime_error(kReinitialisedText);
    bitmapCount = blockCount;
    bitsPerPixel = NBPP;
    bandCount = NBANDS;
    if (kind == kBiLevelDecoder)
        return openBiLevelBitmap(reader, dataOffset, LI, NCOLS, NROWS, oneDimensional);
    if (IsUnservedDepth(NBPP))
        return false;
    blockWidthLimit = blockWidth ? blockWidth : (NCOLS > kLargestNitfBlockSide ? NCOLS : kLargestNitfBlockSide);
    blockHeightLimit = blockHeight ? blockHeight : (NROWS > kLargestNitfBlockSide ? NROWS : kLargestNitfBlockSide);
    // Rows and columns of a block past the image are never asked for.
    fillWidth = std::min(blockWidth, NCOLS);
    fillHeight = std::min(blockHeight, NROWS);
    downsampled = downsampledFrames;
    return openJPEGBitmap(reader, dataOffset, LI);
}

// The first segment after the first stream's SOI must be the NITF APP6 segment.
bool CLeadToolLibWrapper::ReadNitfApp6(CFileReader& reader, uint64_t dataOffset)
{
    const uint64_t fileEnd = ReachableBytes(reader.FileSize());
    if (dataOffset >= fileEnd)
        return false;
    FileStreamBytes bytes(reader, dataOffset, fileEnd - dataOffset);
    JpegMarkerWalk walk(bytes);
    JpegSegment segment;
    const bool found =
        walk.Next(segment) && walk.Next(segment) && segment.code == kApplication6 && segment.length + 4 >= kApp6Size;
    if (!found || !CheckedRead(reader, fileEnd, uint64_t(dataOffset) + segment.marker, app6, kApp6Size)) {
        ClearReadFailure(reader);
        return false;
    }
    for (unsigned field : {0u, 2u, 12u, 14u})
        ToHostOrder16(app6 + field);
    return true;
}

void CLeadToolLibWrapper::AllocateBitmaps(const ImagingBinding& library)
{
    bitmaps = new BITMAPHANDLE*[bitmapCount]();
    fills.assign(bitmapCount, BlockFill{});
    freeBitmap = library.L_FreeBitmap;
    for (uint32_t i = 0; i < bitmapCount; ++i) {
        bitmaps[i] = new BITMAPHANDLE();
        library.L_InitBitmap(bitmaps[i], sizeof(BITMAPHANDLE), 0, 0, 0);
        library.L_AllocateBitmap(bitmaps[i], 0);
    }
}

bool CLeadToolLibWrapper::openJPEGBitmap(CFileReader& reader, uint64_t dataOffset, uint64_t dataLength)
{
    ImagingBinding library {};
    LOADFILEOPTION options {};
    if (!CopyBinding(library))
        return false;
    library.L_GetDefaultLoadFileOption(&options, sizeof options);
    if (bitmaps != nullptr)
        throw std::runtime_error(kReinitialisedText);
    // A block count that the data cannot hold at the smallest decodable
    // stream each is refused before anything is allocated.
    const uint64_t fileEnd = ReachableBytes(reader.FileSize());
    if (bitmapCount == 0 || dataOffset >= fileEnd ||
        bitmapCount > (fileEnd - dataOffset) / kSmallestDecodableJpegBytes ||
        (!streamOffsets.empty() && streamOffsets.size() != bitmapCount))
        return false;
    const uint64_t dataEnd = dataLength == 0 ? fileEnd : std::min(fileEnd, uint64_t(dataOffset) + dataLength);
    // Blocks sharing a stream are refused: each would walk and decode it
    // again, work out of proportion to the file.
    std::vector<uint32_t> sortedOffsets(streamOffsets);
    std::sort(sortedOffsets.begin(), sortedOffsets.end());
    if (std::adjacent_find(sortedOffsets.begin(), sortedOffsets.end()) != sortedOffsets.end())
        return false;
    AllocateBitmaps(library);
    options.maxWidth = blockWidthLimit;
    options.maxHeight = blockHeightLimit;
    uint64_t imageBytes = 0;
    const bool placed = !streamOffsets.empty();
    uint64_t next = dataOffset;   // without offsets each stream follows the one before
    for (uint32_t block = 0; block < bitmapCount; ++block) {
        const uint64_t start = placed ? dataOffset + uint64_t(streamOffsets[block]) : next;
        const uint64_t end =
            placed ? MaskedStreamEnd(sortedOffsets, streamOffsets[block], dataOffset, dataEnd) : dataEnd;
        StreamPlace stream {};
        if (!LocateStream(reader, start, end, stream))
            throw std::runtime_error(kDamagedImageText);
        options.maxBytes = kMaxDecodedImageBytes - imageBytes;
        if (!LoadBlock(reader, library, block, stream.offset, stream.length, options))
            return false;
        imageBytes += BitmapBytes(bitmaps[block]);
        next = stream.offset + stream.length;
    }
    return true;
}

uint32_t CLeadToolLibWrapper::LoadFlags() const
{
    return streamColor() == kRgbStreamColour ? kLoadFlagsJpeg | kLoadFlagRgbStream : kLoadFlagsJpeg;
}

// One block's stream, loaded as it stands in the file; a stream the loader
// refuses is tried again with the default tables that it lacks.
bool CLeadToolLibWrapper::LoadBlock(CFileReader& reader, const ImagingBinding& library, uint32_t block,
                                    uint64_t offset, uint32_t length, LOADFILEOPTION& options)
{
    FILEINFO info = FreshFileInfo();
    int loaded = library.L_LoadFileOffset(static_cast<int>(reader.handle), offset, length, bitmaps[block],
                                          sizeof(BITMAPHANDLE), kBitsAsStored, kOrderRgb, LoadFlags(), nullptr,
                                          nullptr, &options, &info);
    if (loaded != kLoadSucceeded && !LoadWithDefaultTables(reader, library, block, offset, length, options, info))
        return false;
    loaderConverted = info.colorConverted != 0 ? 1 : 0;
    fills[block] = FillOf(info);
    return true;
}

// A frame fills its block when it has the image's depth (grey or colour
// bytes, as rows are delivered) and covers the part of the block the image's
// rows reach; an "I1" frame when it does so with each pixel repeated a whole
// number of times across and down (each direction on its own), at most
// kLargestDownsampling. Rows past those decoded from the stream stay unfilled.
CLeadToolLibWrapper::BlockFill CLeadToolLibWrapper::FillOf(const FILEINFO& info) const
{
    const uint32_t largest = downsampled ? kLargestDownsampling : 1;
    const uint32_t across = RepeatFactor(info.width, fillWidth);
    const uint32_t down = RepeatFactor(info.height, fillHeight);
    const bool byteDepth = info.bitsPerPixel == kGreyBits || info.bitsPerPixel == kColourBits;
    if (!byteDepth || info.bitsPerPixel != bitsPerPixel * bandCount || across > largest || down > largest)
        return BlockFill{};
    return BlockFill{info.decodedRows * down, across, down};
}

bool CLeadToolLibWrapper::LoadWithDefaultTables(CFileReader& reader, const ImagingBinding& library, uint32_t block,
                                                uint64_t offset, uint32_t length, LOADFILEOPTION& options,
                                                FILEINFO& info)
{
    const uint64_t room = uint64_t(length) + kDqtSegmentSize + kDhtSegmentSize;
    if (room > UINT32_MAX)
        return false;
    std::unique_ptr<uint8_t[]> stream(new (std::nothrow) uint8_t[room]);
    if (!stream)
        throw std::runtime_error(kOutOfMemoryText);
    if (!CheckedRead(reader, reader.FileSize(), offset, stream.get(), length)) {
        ClearReadFailure(reader);
        return false;
    }
    const TablePlace tables = FindTables(stream.get(), length);
    // Quality 1 to 5 selects a default DQT; other values have none.
    const uint8_t q = quality();
    if (!tables.framed || (tables.hasDht && tables.hasDqt) || (!tables.hasDqt && (q < 1 || q > kDefaultQualities)))
        return false;
    const uint32_t dqtSize = tables.hasDqt ? 0 : kDqtSegmentSize;
    const uint32_t dhtSize = tables.hasDht ? 0 : kDhtSegmentSize;
    uint8_t* insertion = stream.get() + tables.insertAt;
    std::memmove(insertion + dqtSize + dhtSize, insertion, length - tables.insertAt);
    if (dqtSize)
        std::memcpy(insertion, kDefaultDqt[q - 1], dqtSize);
    if (dhtSize)
        std::memcpy(insertion + dqtSize, kDefaultDht, dhtSize);
    info = FreshFileInfo();
    return library.L_LoadMemory(stream.get(), bitmaps[block], sizeof(BITMAPHANDLE), kBitsAsStored, kOrderRgb,
                                LoadFlags(), nullptr, nullptr, length + dqtSize + dhtSize, &options,
                                &info) == kLoadSucceeded;
}

bool CLeadToolLibWrapper::openBiLevelBitmap(CFileReader& reader, uint64_t dataOffset, uint64_t LI, uint32_t NCOLS,
                                            uint32_t NROWS, bool oneDimensional)
{
    ImagingBinding library {};
    if (!CopyBinding(library))
        return false;
    if (bitmaps != nullptr)
        throw std::runtime_error(kReinitialisedText);
    bitmapCount = 1;
    // Every coded row takes at least one bit of the strip, which is held whole
    // behind its TIFF header in one buffer of a 32-bit size.
    const uint64_t fileSize = reader.FileSize();
    if (LI == 0 || LI > UINT32_MAX - kBiLevelHeaderSize || !Readable(dataOffset, LI, fileSize) || NCOLS == 0 ||
        NROWS == 0 || NROWS / 8 > LI)
        return false;
    AllocateBitmaps(library);
    const uint32_t total = static_cast<uint32_t>(LI) + kBiLevelHeaderSize;
    std::unique_ptr<uint8_t[]> file(new (std::nothrow) uint8_t[total]);
    if (!file)
        throw std::runtime_error(kOutOfMemoryText);
    PutBigEndian32(tiffHeader + kTiffImageWidthValue, NCOLS);
    PutBigEndian32(tiffHeader + kTiffImageLengthValue, NROWS);
    PutBigEndian32(tiffHeader + kTiffRowsPerStripValue, NROWS);
    PutBigEndian32(tiffHeader + kTiffStripByteCountsValue, static_cast<uint32_t>(LI));
    PutBigEndian32(tiffHeader + kTiffT4OptionsValue, oneDimensional ? kT4OneDimensional : kT4TwoDimensional);
    std::memcpy(file.get(), tiffHeader, kBiLevelHeaderSize);
    if (!CheckedRead(reader, fileSize, dataOffset, file.get() + kBiLevelHeaderSize, LI))
        return false;
    LOADFILEOPTION options {};
    library.L_GetDefaultLoadFileOption(&options, sizeof options);
    options.maxWidth = NCOLS;
    options.maxHeight = NROWS;
    options.maxBytes = kMaxDecodedImageBytes;
    FILEINFO info = FreshFileInfo();
    return library.L_LoadMemory(file.get(), bitmaps[0], sizeof(BITMAPHANDLE), kBitsAsStored, kOrderAsStored,
                                kLoadFlagsBiLevel, nullptr, nullptr, total, &options, &info) == kLoadSucceeded;
}

bool CLeadToolLibWrapper::GetRow(uint32_t block, uint32_t row, uint32_t firstColumn, uint32_t lastColumn,
                                 uint32_t byteCount, uint8_t* destination)
{
    ImagingBinding library {};
    if (!CopyBinding(library) || bitmaps == nullptr || block >= bitmapCount || destination == nullptr ||
        lastColumn < firstColumn)
        return false;
    if (kind == kBiLevelDecoder)
        return block == 0 && GetBiLevelRow(library, row, firstColumn, lastColumn, byteCount, destination);
    return GetJpegRow(library, block, row, firstColumn, lastColumn, byteCount, destination);
}

bool CLeadToolLibWrapper::GetBiLevelRow(const ImagingBinding& library, uint32_t row, uint32_t firstColumn,
                                        uint32_t lastColumn, uint32_t byteCount, uint8_t* destination)
{
    BITMAPHANDLE* bitmap = bitmaps[0];
    if (bitmap->bitsPerPixel != 1 || lastColumn >= bitmap->width)
        return false;
    uint32_t scratchSize = std::min(byteCount, bitmap->bytesPerLine);
    std::unique_ptr<uint8_t[]> packed(new uint8_t[scratchSize + 1]);
    library.L_AccessBitmap(bitmap);
    int64_t fetched = library.L_GetBitmapRowCol(bitmap, packed.get(), row, firstColumn, scratchSize);
    library.L_ReleaseBitmap(bitmap);
    uint64_t pixels = uint64_t(lastColumn) - firstColumn + 1;
    if (fetched < 1 || pixels > uint64_t(fetched) * 8)
        return false;
    for (uint64_t i = 0; i < pixels; ++i)
        destination[i] = (packed[i / 8] & (0x80 >> (i % 8))) ? kBlackPixel : kWhitePixel;
    return true;
}

// The frame's pixels under the span are fetched, then repeated over it when
// the frame was downsampled.
bool CLeadToolLibWrapper::GetJpegRow(const ImagingBinding& library, uint32_t block, uint32_t row,
                                     uint32_t firstColumn, uint32_t lastColumn, uint32_t byteCount,
                                     uint8_t* destination)
{
    if (block >= fills.size() || row >= fills[block].rows)
        return false;
    const BlockFill fill = fills[block];
    const uint32_t pixelBytes = bitsPerPixel * bandCount / 8;   // 1 or 3 where a frame fills the block
    const uint64_t count = uint64_t(lastColumn) - firstColumn + 1;
    if (count * pixelBytes > byteCount)
        return false;
    const uint32_t frameColumn = firstColumn / fill.across;
    const uint32_t frameBytes = (lastColumn / fill.across - frameColumn + 1) * pixelBytes;
    BITMAPHANDLE* bitmap = bitmaps[block];
    library.L_AccessBitmap(bitmap);
    int64_t fetched = library.L_GetBitmapRowCol(bitmap, destination, row / fill.down, frameColumn, frameBytes);
    library.L_ReleaseBitmap(bitmap);
    if (fetched != int64_t(frameBytes))
        return false;
    if (fill.across > 1)
        RepeatPixels(destination, firstColumn, uint32_t(count), fill.across, pixelBytes);
    if (bitsPerPixel * bandCount == kColourBits && streamColor() == kRgbStreamColour && !loaderConverted)
        ConvertColours(destination, int64_t(count) * pixelBytes);
    return true;
}

void CLeadToolLibWrapper::FreeBitmaps()
{
    if (bitmaps == nullptr)
        return;
    for (uint32_t i = 0; i < bitmapCount; ++i) {
        if (bitmaps[i] != nullptr && freeBitmap != nullptr)
            freeBitmap(bitmaps[i]);
        delete bitmaps[i];
    }
    delete[] bitmaps;
    bitmaps = nullptr;
    fills.clear();
}
