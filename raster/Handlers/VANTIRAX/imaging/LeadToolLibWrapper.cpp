#include "imaging/LeadToolLibWrapper.h"

#include "base/ByteOrder.h"
#include "base/CheckedRead.h"
#include "base/Limits.h"
#include "imaging/JpegMarkers.h"
#include "imaging/NitfJpegDefaults.h"

#include <algorithm>
#include <cstring>
#include <iterator>
#include <memory>
#include <new>
#include <stdexcept>

const char* const kReinitialisedText =
    "CLeadToolLibWrapper::openJPEGBitmap. Non sunctioned re initialization of BITMAPHANDLE array!";
const char* const kDamagedImageText = "CLeadToolLibWrapper::openJPEGBitmap. Multi block image is damaged!";

namespace {

constexpr uint32_t kScanChunkSize = 32 * 1024; // one read per chunk: a stream costs few system calls
// A decoded block's own records, counted with its pixels: its list and index nodes.
constexpr uint64_t kDecodedRecordBytes = 128;
// What a row decoder holds besides its band. libjpeg: the rows of its
// MCU-row buffers (two MCU rows of 16 and the context rows of fancy
// upsampling); libtiff: the scanlines it reads ahead and its fax run arrays,
// 16 bytes a column; and the read chunk of either.
constexpr uint64_t kJpegDecoderRows = 48;
constexpr uint64_t kFaxDecoderRows = 18;
constexpr uint64_t kFaxRunBytesPerColumn = 16;
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

// The stream that starts at `start`, after any fill bytes, walked segment by
// segment; it must end with EOI before `end`.
template <typename Place>
bool LocateStream(CFileReader& reader, uint64_t start, uint64_t end, Place& place)
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
    place = Place {start + first, static_cast<uint32_t>(length)};
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
    uint32_t insertAt = 0;
};

// What a stream's marker segments before its first scan say.
struct StreamHead {
    bool framed = false;
    uint8_t frameCode = 0;
    uint8_t precision = 0;
    uint32_t height = 0;
    uint32_t width = 0;
    uint8_t components = 0;
    TablePlace tables;
};

constexpr unsigned kFrameFieldsSize = 6;     // P, Y, X, Nf
constexpr unsigned kGreyComponents = 1;
constexpr unsigned kColourComponents = 3;
constexpr uint8_t kDctPrecision = 8;
constexpr uint8_t kLeastLosslessPrecision = 2;

// Walks the stream at `start` up to its first scan; false when the marker
// segments break before it. The first frame header is read.
bool ReadHead(CFileReader& reader, uint64_t start, uint64_t end, StreamHead& head)
{
    if (start >= end)
        return false;
    FileStreamBytes bytes(reader, start, end - start);
    JpegMarkerWalk walk(bytes);
    JpegSegment segment;
    uint64_t first = 0;
    uint8_t fields[kFrameFieldsSize] = {};
    while (walk.Next(segment)) {
        if (segment.code == kStartOfImage)
            first = segment.marker;
        if (segment.code == kStartOfScan)
            return true;
        head.tables.hasDht = head.tables.hasDht || segment.code == kDefineHuffmanTables;
        head.tables.hasDqt = head.tables.hasDqt || segment.code == kDefineQuantisationTables;
        if (head.framed || !IsFrameMarker(segment.code) || segment.length < kFrameFieldsSize ||
            segment.marker - first > UINT32_MAX)
            continue;
        if (!CheckedRead(reader, end, start + segment.payload, fields, kFrameFieldsSize)) {
            ClearReadFailure(reader);
            return false;
        }
        head = StreamHead{true, segment.code, fields[0], BigEndian16(fields + 1), BigEndian16(fields + 3),
                          fields[5], TablePlace{head.tables.hasDht, head.tables.hasDqt,
                                                static_cast<uint32_t>(segment.marker - first)}};
    }
    return false;
}

// A frame this library decodes: 8-bit DCT samples, or lossless ones of 2
// to 8 bits; one or three components; a size within the limits.
bool DecodableFrame(const StreamHead& head, uint32_t widthLimit, uint32_t heightLimit)
{
    const bool lossless = head.frameCode == kLosslessFrame;
    const bool precision = lossless ? head.precision >= kLeastLosslessPrecision && head.precision <= kDctPrecision
                                    : head.precision == kDctPrecision;
    return head.framed && precision && (head.components == kGreyComponents || head.components == kColourComponents) &&
           head.width > 0 && head.height > 0 && head.width <= widthLimit && head.height <= heightLimit;
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

// The default tables a stream lacks, into insert (room for both); their
// size, 0 when it lacks none or lacks a DQT and quality 1 to 5 names none.
uint32_t DefaultTables(const TablePlace& tables, uint8_t quality, uint8_t* insert)
{
    if ((tables.hasDht && tables.hasDqt) || (!tables.hasDqt && (quality < 1 || quality > kDefaultQualities)))
        return 0;
    const uint32_t dqtSize = tables.hasDqt ? 0 : kDqtSegmentSize;
    if (dqtSize)
        std::memcpy(insert, kDefaultDqt[quality - 1], dqtSize);
    if (!tables.hasDht)
        std::memcpy(insert + dqtSize, kDefaultDht, kDhtSegmentSize);
    return dqtSize + (tables.hasDht ? 0 : kDhtSegmentSize);
}

uint64_t RowBytes(uint32_t width, uint32_t bits)
{
    return (uint64_t(width) * bits + 7) / 8;
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

bool CLeadToolLibWrapper::Open(CFileReader& reader, uint64_t dataOffset, uint32_t blocks, uint64_t LI,
                               uint32_t NBPP, uint32_t NBANDS, uint32_t NCOLS, uint32_t NROWS, bool oneDimensional,
                               uint32_t blockWidth, uint32_t blockHeight, bool downsampledFrames)
{
    if (kind == kNotPrepared || !CopyBinding(library))
        return false;
    if (opened)
        throw std::runtime_error(kReinitialisedText);
    blockCount = blocks;
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
    blocksAcross = blockWidth ? (NCOLS - 1) / blockWidth + 1 : 1;
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

// Only the first stream's header is read here: a stream that breaks before
// its first scan is damaged data; one whose frame cannot be decoded leaves
// the decoder unopened.
bool CLeadToolLibWrapper::openJPEGBitmap(CFileReader& reader, uint64_t dataOffset, uint64_t dataLength)
{
    if (opened)
        throw std::runtime_error(kReinitialisedText);
    // A block count that the data cannot hold at the smallest decodable
    // stream each is refused before anything is allocated.
    const uint64_t fileEnd = ReachableBytes(reader.FileSize());
    if (blockCount == 0 || dataOffset >= fileEnd || blockCount > (fileEnd - dataOffset) / kSmallestDecodableJpegBytes ||
        (!streamOffsets.empty() && streamOffsets.size() != blockCount))
        return false;
    dataStart = dataOffset;
    dataEnd = dataLength == 0 ? fileEnd : std::min(fileEnd, uint64_t(dataOffset) + dataLength);
    // Blocks sharing a stream are refused: each would walk and decode it
    // again, work out of proportion to the file.
    sortedOffsets = streamOffsets;
    std::sort(sortedOffsets.begin(), sortedOffsets.end());
    if (std::adjacent_find(sortedOffsets.begin(), sortedOffsets.end()) != sortedOffsets.end())
        return false;
    const bool placed = !streamOffsets.empty();
    const uint64_t first = placed ? dataOffset + uint64_t(streamOffsets[0]) : dataOffset;
    const uint64_t firstEnd = placed ? MaskedStreamEnd(sortedOffsets, streamOffsets[0], dataOffset, dataEnd) : dataEnd;
    StreamHead head;
    if (!ReadHead(reader, first, firstEnd, head))
        throw std::runtime_error(kDamagedImageText);
    opened = DecodableFrame(head, blockWidthLimit, blockHeightLimit);
    return opened;
}

// Every coded row takes at least one bit of the strip, which lies in the file.
bool CLeadToolLibWrapper::openBiLevelBitmap(CFileReader& reader, uint64_t dataOffset, uint64_t LI, uint32_t NCOLS,
                                            uint32_t NROWS, bool oneDimensional)
{
    if (opened)
        throw std::runtime_error(kReinitialisedText);
    blockCount = 1;
    if (LI == 0 || LI > UINT32_MAX - kBiLevelHeaderSize || !Readable(dataOffset, LI, reader.FileSize()) ||
        NCOLS == 0 || NROWS == 0 || NROWS / 8 > LI)
        return false;
    PutBigEndian32(tiffHeader + kTiffImageWidthValue, NCOLS);
    PutBigEndian32(tiffHeader + kTiffImageLengthValue, NROWS);
    PutBigEndian32(tiffHeader + kTiffRowsPerStripValue, NROWS);
    PutBigEndian32(tiffHeader + kTiffStripByteCountsValue, static_cast<uint32_t>(LI));
    PutBigEndian32(tiffHeader + kTiffT4OptionsValue, oneDimensional ? kT4OneDimensional : kT4TwoDimensional);
    dataStart = dataOffset;
    dataEnd = dataOffset + LI;
    fillWidth = NCOLS;
    fillHeight = NROWS;
    blocksAcross = 1;
    opened = true;
    return true;
}

void CLeadToolLibWrapper::FreeBitmaps()
{
    while (!recent.empty())
        Forget(std::prev(recent.end()));
    std::vector<StreamPlace>().swap(found);
    std::vector<uint32_t>().swap(sortedOffsets);
    walkBroken = false;
    opened = false;
}

void CLeadToolLibWrapper::Forget(Decoded::iterator entry)
{
    library.L_FreeBitmap(&entry->bitmap);
    if (entry->rows != nullptr)
        library.L_EndLoadRows(entry->rows);
    heldBytes -= entry->bytes;
    decodedIndex.erase(entry->block);
    recent.erase(entry);
}

// What one block may hold besides its records: an even share of the bound
// among the blocks of a block row, which a row draws together.
uint64_t CLeadToolLibWrapper::BlockShare() const
{
    const uint64_t share = cacheBound / blocksAcross;
    return share > kDecodedRecordBytes ? share - kDecodedRecordBytes : 0;
}

// Gives up the least recently drawn blocks until `bytes` more fit the
// bound; the block being decoded, the most recent, stays.
void CLeadToolLibWrapper::MakeRoom(uint64_t bytes)
{
    while (recent.size() > 1 && heldBytes + bytes > cacheBound)
        Forget(std::prev(recent.end()));
}

void CLeadToolLibWrapper::Count(DecodedBlock& entry, uint64_t bytes)
{
    entry.bytes += bytes;
    heldBytes += bytes;
}

// The block as decoded, decoding it first when it is not held; a block that
// failed is held too (its records alone), so that it is not tried at every row.
CLeadToolLibWrapper::DecodedBlock* CLeadToolLibWrapper::Decode(CFileReader& reader, uint32_t block)
{
    const auto held = decodedIndex.find(block);
    if (held != decodedIndex.end()) {
        recent.splice(recent.begin(), recent, held->second);
        return &*held->second;
    }
    recent.push_front(DecodedBlock{block, BITMAPHANDLE{}, nullptr, 0, 0, BlockFill{}, 0});
    DecodedBlock& entry = recent.front();
    decodedIndex[block] = recent.begin();
    Count(entry, kDecodedRecordBytes);
    MakeRoom(0);
    library.L_InitBitmap(&entry.bitmap, sizeof(BITMAPHANDLE), 0, 0, 0);
    if (kind == kBiLevelDecoder)
        DecodeBiLevel(reader, entry);
    else
        DecodeJpegBlock(reader, block, entry);
    return &entry;
}

// Masked: where the mask table puts the stream. Otherwise each stream
// follows the one before: those not yet found are walked, once.
bool CLeadToolLibWrapper::PlaceStream(CFileReader& reader, uint32_t block, StreamPlace& place)
{
    if (!streamOffsets.empty()) {
        const uint32_t offset = streamOffsets[block];
        return LocateStream(reader, dataStart + uint64_t(offset),
                            MaskedStreamEnd(sortedOffsets, offset, dataStart, dataEnd), place);
    }
    while (found.size() <= block && !walkBroken) {
        const uint64_t start = found.empty() ? dataStart : found.back().offset + found.back().length;
        StreamPlace next {};
        walkBroken = !LocateStream(reader, start, dataEnd, next);
        if (!walkBroken)
            found.push_back(next);
    }
    if (block >= found.size())
        return false;
    place = found[block];
    return true;
}

// A block whose frame fits its share of the bound is decoded whole; a
// larger one by a row decoder, into a band that fills its share.
void CLeadToolLibWrapper::DecodeJpegBlock(CFileReader& reader, uint32_t block, DecodedBlock& entry)
{
    StreamPlace stream {};
    StreamHead head;
    if (!PlaceStream(reader, block, stream) || !ReadHead(reader, stream.offset, stream.offset + stream.length, head) ||
        !DecodableFrame(head, blockWidthLimit, blockHeightLimit))
        return;
    uint8_t insert[kDqtSegmentSize + kDhtSegmentSize];
    const uint32_t insertSize = DefaultTables(head.tables, quality(), insert);
    const uint64_t share = BlockShare();
    const uint64_t rowBytes = RowBytes(head.width, kGreyBits * head.components);
    FILEINFO info = FreshFileInfo();
    if (rowBytes * head.height <= share) {
        MakeRoom(rowBytes * head.height);
        if (!LoadBlock(reader, stream, head.tables.insertAt, insert, insertSize, entry, info))
            return;
        Count(entry, BitmapBytes(&entry.bitmap));
    } else {
        // A lossless stream is decoded whole only.
        LOADSOURCE source {sizeof(LOADSOURCE), static_cast<int>(reader.handle), stream.offset, stream.length,
                           nullptr, 0, 0};
        const uint64_t decoderBytes = rowBytes * kJpegDecoderRows + kRowLoaderChunkBytes;
        if (head.frameCode == kLosslessFrame || decoderBytes >= share)
            return;
        if (!StartRowDecoder(source, LoadFlags(), share - decoderBytes, entry, info)) {
            source.insert = insert;
            source.insertSize = insertSize;
            source.insertAt = head.tables.insertAt;
            if (insertSize == 0 || !StartRowDecoder(source, LoadFlags(), share - decoderBytes, entry, info))
                return;
        }
        Count(entry, decoderBytes);
        info.decodedRows = info.height;
    }
    loaderConverted = info.colorConverted != 0 ? 1 : 0;
    entry.fill = FillOf(info);
}

// A row decoder on the source and a band of as many of its rows as
// bandShare holds (one at least, none past the frame).
bool CLeadToolLibWrapper::StartRowDecoder(const LOADSOURCE& source, uint32_t flags, uint64_t bandShare,
                                          DecodedBlock& entry, FILEINFO& info)
{
    LOADFILEOPTION options {};
    library.L_GetDefaultLoadFileOption(&options, sizeof options);
    options.maxWidth = kind == kBiLevelDecoder ? fillWidth : blockWidthLimit;
    options.maxHeight = kind == kBiLevelDecoder ? fillHeight : blockHeightLimit;
    options.maxBytes = bandShare;
    info = FreshFileInfo();
    ROWLOADER* rows = library.L_StartLoadRows(&source, flags, &options, &info);
    if (rows == nullptr)
        return false;
    const uint64_t rowBytes = RowBytes(info.width, info.bitsPerPixel);
    const uint64_t bandRows = std::min<uint64_t>(info.height, std::max<uint64_t>(1, bandShare / rowBytes));
    MakeRoom(bandRows * rowBytes);
    library.L_InitBitmap(&entry.bitmap, sizeof(BITMAPHANDLE), info.width, uint32_t(bandRows), info.bitsPerPixel);
    if (library.L_AllocateBitmap(&entry.bitmap, 0) != kLoadSucceeded) {
        library.L_EndLoadRows(rows);
        return false;
    }
    entry.rows = rows;
    Count(entry, BitmapBytes(&entry.bitmap));
    return true;
}

uint32_t CLeadToolLibWrapper::LoadFlags() const
{
    return streamColor() == kRgbStreamColour ? kLoadFlagsJpeg | kLoadFlagRgbStream : kLoadFlagsJpeg;
}

// One block's stream, loaded as it stands in the file; a stream the loader
// refuses is tried again with the default tables that it lacks.
bool CLeadToolLibWrapper::LoadBlock(CFileReader& reader, const StreamPlace& stream, uint32_t insertAt,
                                    const uint8_t* insert, uint32_t insertSize, DecodedBlock& entry, FILEINFO& info)
{
    LOADFILEOPTION options {};
    library.L_GetDefaultLoadFileOption(&options, sizeof options);
    options.maxWidth = blockWidthLimit;
    options.maxHeight = blockHeightLimit;
    options.maxBytes = BlockShare();
    const int handle = static_cast<int>(reader.handle);
    if (library.L_LoadFileOffset(handle, stream.offset, stream.length, &entry.bitmap, sizeof(BITMAPHANDLE),
                                 kBitsAsStored, kOrderRgb, LoadFlags(), nullptr, nullptr, &options,
                                 &info) == kLoadSucceeded)
        return true;
    const uint64_t room = uint64_t(stream.length) + insertSize;
    if (insertSize == 0 || room > UINT32_MAX)
        return false;
    std::unique_ptr<uint8_t[]> spliced(new (std::nothrow) uint8_t[room]);
    if (!spliced || !CheckedRead(reader, reader.FileSize(), stream.offset, spliced.get(), stream.length)) {
        ClearReadFailure(reader);
        return false;
    }
    uint8_t* insertion = spliced.get() + insertAt;
    std::memmove(insertion + insertSize, insertion, stream.length - insertAt);
    std::memcpy(insertion, insert, insertSize);
    info = FreshFileInfo();
    return library.L_LoadMemory(spliced.get(), &entry.bitmap, sizeof(BITMAPHANDLE), kBitsAsStored, kOrderRgb,
                                LoadFlags(), nullptr, nullptr, uint32_t(room), &options, &info) == kLoadSucceeded;
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

// The strip decoded whole when its bitmap fits the bound (read whole behind
// its TIFF header), else by a row decoder reading it from the file.
void CLeadToolLibWrapper::DecodeBiLevel(CFileReader& reader, DecodedBlock& entry)
{
    const auto LI = static_cast<uint32_t>(dataEnd - dataStart);
    const uint64_t rowBytes = RowBytes(fillWidth, 1);
    const uint64_t share = BlockShare();
    FILEINFO info = FreshFileInfo();
    if (rowBytes * fillHeight <= share) {
        MakeRoom(rowBytes * fillHeight);
        const uint32_t total = LI + kBiLevelHeaderSize;
        std::unique_ptr<uint8_t[]> file(new (std::nothrow) uint8_t[total]);
        if (!file || !CheckedRead(reader, reader.FileSize(), dataStart, file.get() + kBiLevelHeaderSize, LI)) {
            ClearReadFailure(reader);
            return;
        }
        std::memcpy(file.get(), tiffHeader, kBiLevelHeaderSize);
        LOADFILEOPTION options {};
        library.L_GetDefaultLoadFileOption(&options, sizeof options);
        options.maxWidth = fillWidth;
        options.maxHeight = fillHeight;
        options.maxBytes = share;
        if (library.L_LoadMemory(file.get(), &entry.bitmap, sizeof(BITMAPHANDLE), kBitsAsStored, kOrderAsStored,
                                 kLoadFlagsBiLevel, nullptr, nullptr, total, &options, &info) != kLoadSucceeded)
            return;
        Count(entry, BitmapBytes(&entry.bitmap));
    } else {
        const uint64_t decoderBytes =
            uint64_t(fillWidth) * kFaxRunBytesPerColumn + rowBytes * kFaxDecoderRows + kRowLoaderChunkBytes;
        const LOADSOURCE source {sizeof(LOADSOURCE), static_cast<int>(reader.handle), dataStart, LI, tiffHeader,
                                 kBiLevelHeaderSize, 0};
        if (decoderBytes >= share || !StartRowDecoder(source, kLoadFlagsBiLevel, share - decoderBytes, entry, info))
            return;
        Count(entry, decoderBytes);
        info.decodedRows = info.height;
    }
    entry.fill = BlockFill{info.decodedRows, 1, 1};
}

// The bitmap holding a frame row, and the row's place in it: a block decoded
// whole holds them all; a band is loaded again when it does not hold the row.
BITMAPHANDLE* CLeadToolLibWrapper::RowBitmap(CFileReader& reader, DecodedBlock& entry, uint32_t frameRow,
                                             uint32_t& bitmapRow)
{
    if (entry.rows != nullptr && (frameRow < entry.bandFirst || frameRow - entry.bandFirst >= entry.bandRows)) {
        // Drawn upwards, the band ends at the row: the rows above it come from the same load.
        const uint32_t above = frameRow < entry.bandFirst ? std::min(frameRow, entry.bitmap.height - 1) : 0;
        entry.bandFirst = frameRow - above;
        entry.bandRows = library.L_LoadRows(entry.rows, static_cast<int>(reader.handle), entry.bandFirst,
                                            &entry.bitmap);
        if (above >= entry.bandRows)
            return nullptr;
    }
    bitmapRow = frameRow - entry.bandFirst;
    return &entry.bitmap;
}

bool CLeadToolLibWrapper::GetRow(CFileReader& reader, uint32_t block, uint32_t row, uint32_t firstColumn,
                                 uint32_t lastColumn, uint32_t byteCount, uint8_t* destination)
{
    if (!opened || block >= blockCount || destination == nullptr || lastColumn < firstColumn)
        return false;
    DecodedBlock* entry = Decode(reader, block);
    if (row >= entry->fill.rows)
        return false;
    if (kind == kJpegDecoder)
        return GetJpegRow(reader, *entry, row, firstColumn, lastColumn, byteCount, destination);
    uint32_t bitmapRow = 0;
    BITMAPHANDLE* bitmap = RowBitmap(reader, *entry, row, bitmapRow);
    return bitmap != nullptr && GetBiLevelRow(bitmap, bitmapRow, firstColumn, lastColumn, byteCount, destination);
}

bool CLeadToolLibWrapper::GetBiLevelRow(BITMAPHANDLE* bitmap, uint32_t bitmapRow, uint32_t firstColumn,
                                        uint32_t lastColumn, uint32_t byteCount, uint8_t* destination)
{
    if (bitmap->bitsPerPixel != 1 || lastColumn >= bitmap->width)
        return false;
    uint32_t scratchSize = std::min(byteCount, bitmap->bytesPerLine);
    std::unique_ptr<uint8_t[]> packed(new uint8_t[scratchSize + 1]);
    library.L_AccessBitmap(bitmap);
    int64_t fetched = library.L_GetBitmapRowCol(bitmap, packed.get(), bitmapRow, firstColumn, scratchSize);
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
bool CLeadToolLibWrapper::GetJpegRow(CFileReader& reader, DecodedBlock& entry, uint32_t row, uint32_t firstColumn,
                                     uint32_t lastColumn, uint32_t byteCount, uint8_t* destination)
{
    const BlockFill fill = entry.fill;
    const uint32_t pixelBytes = bitsPerPixel * bandCount / 8;   // 1 or 3 where a frame fills the block
    const uint64_t count = uint64_t(lastColumn) - firstColumn + 1;
    if (count * pixelBytes > byteCount)
        return false;
    const uint32_t frameColumn = firstColumn / fill.across;
    const uint32_t frameBytes = (lastColumn / fill.across - frameColumn + 1) * pixelBytes;
    uint32_t bitmapRow = 0;
    BITMAPHANDLE* bitmap = RowBitmap(reader, entry, row / fill.down, bitmapRow);
    if (bitmap == nullptr)
        return false;
    library.L_AccessBitmap(bitmap);
    int64_t fetched = library.L_GetBitmapRowCol(bitmap, destination, bitmapRow, frameColumn, frameBytes);
    library.L_ReleaseBitmap(bitmap);
    if (fetched != int64_t(frameBytes))
        return false;
    if (fill.across > 1)
        RepeatPixels(destination, firstColumn, uint32_t(count), fill.across, pixelBytes);
    if (bitsPerPixel * bandCount == kColourBits && streamColor() == kRgbStreamColour && !loaderConverted)
        ConvertColours(destination, int64_t(count) * pixelBytes);
    return true;
}
