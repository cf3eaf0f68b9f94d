#include "imaging/Jpeg2000Image.h"

#include "base/ByteOrder.h"
#include "base/CheckedMath.h"
#include "base/CheckedRead.h"
#include "base/Limits.h"
#include "base/SampleBits.h"

#include <openjpeg.h>

#include <algorithm>
#include <cstring>

namespace {

constexpr uint8_t kCodestreamStart[] = {0xFF, 0x4F, 0xFF, 0x51}; // SOC, then SIZ
constexpr uint8_t kJp2Signature[] = {0, 0, 0, 12, 'j', 'P', ' ', ' ', 0x0D, 0x0A, 0x87, 0x0A};
constexpr uint32_t kCodestreamBox = 0x6A703263; // "jp2c"
constexpr unsigned kBoxHeaderBytes = 8;          // LBox, TBox
constexpr unsigned kLongBoxHeaderBytes = 16;     // LBox 1, TBox, XLBox
constexpr unsigned kSizFrontBytes = 42;          // SOC, SIZ, Lsiz .. Csiz
constexpr unsigned kSizBytesBeforeComponents = 38; // Lsiz counts itself and these fields
constexpr unsigned kComponentBytes = 3;          // Ssiz, XRsiz, YRsiz
constexpr uint8_t kSignedSamples = 0x80;         // in Ssiz
constexpr uint32_t kLargestPrecision = 16;
constexpr uint64_t kSmallestTileBytes = 14;      // an SOT marker segment and SOD
constexpr uint64_t kOpenJpegBytesPerSample = 8;
constexpr OPJ_SIZE_T kStreamChunkBytes = 64 * 1024;
constexpr uint32_t kLargestSample = 0xFFFF;

// The codestream as OpenJPEG reads it: a stretch of the file, read through
// CheckedRead and never past its end.
struct Source {
    CFileReader& reader;
    uint64_t start, size, position;
};

OPJ_SIZE_T ReadSource(void* buffer, OPJ_SIZE_T count, void* data)
{
    Source& source = *static_cast<Source*>(data);
    const uint64_t n = std::min<uint64_t>(count, source.size - source.position);
    if (n == 0)
        return OPJ_SIZE_T(-1);
    if (!CheckedRead(source.reader, source.start + source.size, source.start + source.position, buffer, n)) {
        source.reader.ResetState(); // the next tile reads afresh
        return OPJ_SIZE_T(-1);
    }
    source.position += n;
    return OPJ_SIZE_T(n);
}

OPJ_BOOL SeekSource(OPJ_OFF_T to, void* data)
{
    Source& source = *static_cast<Source*>(data);
    if (to < 0 || uint64_t(to) > source.size)
        return OPJ_FALSE;
    source.position = uint64_t(to);
    return OPJ_TRUE;
}

OPJ_OFF_T SkipSource(OPJ_OFF_T count, void* data)
{
    Source& source = *static_cast<Source*>(data);
    if (count < 0) {
        const uint64_t back = uint64_t(-(count + 1)) + 1;
        if (back > source.position)
            return -1;
        source.position -= back;
        return count;
    }
    if (uint64_t(count) > source.size - source.position)
        return -1;
    source.position += uint64_t(count);
    return count;
}

// One decoder over the codestream, with the image its header describes.
class Session {
public:
    Session(CFileReader& reader, uint64_t start, uint64_t size) : source{reader, start, size, 0}
    {
        codec = opj_create_decompress(OPJ_CODEC_J2K);
        stream = opj_stream_create(kStreamChunkBytes, OPJ_TRUE);
        if (stream == nullptr)
            return;
        opj_stream_set_user_data(stream, &source, nullptr);
        opj_stream_set_user_data_length(stream, size);
        opj_stream_set_read_function(stream, ReadSource);
        opj_stream_set_seek_function(stream, SeekSource);
        opj_stream_set_skip_function(stream, SkipSource);
    }
    ~Session()
    {
        if (image != nullptr)
            opj_image_destroy(image);
        if (stream != nullptr)
            opj_stream_destroy(stream);
        if (codec != nullptr)
            opj_destroy_codec(codec);
    }
    Session(const Session&) = delete;
    Session& operator=(const Session&) = delete;

    bool ReadHeader()
    {
        opj_dparameters_t parameters;
        opj_set_default_decoder_parameters(&parameters);
        return codec != nullptr && stream != nullptr && opj_setup_decoder(codec, &parameters) &&
               opj_read_header(stream, codec, &image) && image != nullptr;
    }

    opj_codec_t* codec = nullptr;
    opj_stream_t* stream = nullptr;
    opj_image_t* image = nullptr;

private:
    Source source;
};

uint64_t DivideUp(uint64_t value, uint64_t divisor)
{
    return value / divisor + (value % divisor != 0);
}

} // namespace

bool CJpeg2000Image::Open(CFileReader& reader, uint64_t offset, uint64_t length, const Jpeg2000Expectation& expected)
{
    Release();
    if (!Readable(offset, length, reader.FileSize()) || expected.drawn.empty() ||
        !FindCodestream(reader, offset, length) || !ReadSiz(reader, expected))
        return false;
    drawn = expected.drawn;
    significantBits = expected.significantBits;
    opened = HeaderDecodes(reader);
    return opened;
}

// A codestream from its SOC on, or the content of a JP2 file's "jp2c" box;
// every box before it must lie within the data.
bool CJpeg2000Image::FindCodestream(CFileReader& reader, uint64_t offset, uint64_t length)
{
    const uint64_t end = offset + length;
    uint8_t head[kLongBoxHeaderBytes];
    if (length < sizeof kJp2Signature || !CheckedRead(reader, end, offset, head, sizeof kJp2Signature))
        return false;
    if (std::memcmp(head, kCodestreamStart, sizeof kCodestreamStart) == 0) {
        codestreamOffset = offset;
        codestreamLength = length;
        return true;
    }
    if (std::memcmp(head, kJp2Signature, sizeof kJp2Signature) != 0)
        return false;
    for (uint64_t at = sizeof kJp2Signature; at < length;) {
        const uint64_t left = length - at;
        if (left < kBoxHeaderBytes || !CheckedRead(reader, end, offset + at, head, kBoxHeaderBytes))
            return false;
        uint64_t boxLength = BigEndian32(head), headerLength = kBoxHeaderBytes;
        if (boxLength == 1) { // the length follows in 8 bytes
            if (left < kLongBoxHeaderBytes || !CheckedRead(reader, end, offset + at + 8, head + 8, 8))
                return false;
            boxLength = uint64_t(BigEndian32(head + 8)) << 32 | BigEndian32(head + 12);
            headerLength = kLongBoxHeaderBytes;
        } else if (boxLength == 0) { // the last box: to the end
            boxLength = left;
        }
        if (boxLength < headerLength || boxLength > left)
            return false;
        if (BigEndian32(head + 4) == kCodestreamBox) {
            codestreamOffset = offset + at + headerLength;
            codestreamLength = boxLength - headerLength;
            return true;
        }
        at += boxLength;
    }
    return false;
}

// SIZ, read before OpenJPEG sees the header, which it sizes its state by.
bool CJpeg2000Image::ReadSiz(CFileReader& reader, const Jpeg2000Expectation& expected)
{
    uint8_t siz[kSizFrontBytes];
    const uint64_t end = codestreamOffset + codestreamLength;
    if (codestreamLength < kSizFrontBytes || !CheckedRead(reader, end, codestreamOffset, siz, sizeof siz) ||
        std::memcmp(siz, kCodestreamStart, sizeof kCodestreamStart) != 0)
        return false;
    const uint32_t components = BigEndian16(siz + 40);
    if (components != expected.components || BigEndian16(siz + 4) != kSizBytesBeforeComponents +
                                                                         kComponentBytes * components)
        return false;
    Grid g;
    g.imageX1 = BigEndian32(siz + 8);
    g.imageY1 = BigEndian32(siz + 12);
    g.imageX0 = BigEndian32(siz + 16);
    g.imageY0 = BigEndian32(siz + 20);
    g.tileWidth = BigEndian32(siz + 24);
    g.tileHeight = BigEndian32(siz + 28);
    g.tileX0 = BigEndian32(siz + 32);
    g.tileY0 = BigEndian32(siz + 36);
    if (g.imageX1 <= g.imageX0 || g.imageY1 <= g.imageY0 || g.imageX1 - g.imageX0 != expected.columns ||
        g.imageY1 - g.imageY0 != expected.rows || g.tileWidth == 0 || g.tileHeight == 0 || g.tileX0 > g.imageX0 ||
        g.tileY0 > g.imageY0 || g.tileX0 + g.tileWidth <= g.imageX0 || g.tileY0 + g.tileHeight <= g.imageY0)
        return false;
    g.tilesAcross = DivideUp(g.imageX1 - g.tileX0, g.tileWidth);
    g.tilesDown = DivideUp(g.imageY1 - g.tileY0, g.tileHeight);
    uint64_t tileCount = g.tilesAcross, tileComponents = components;
    if (!MultiplyWithin(tileCount, g.tilesDown, std::min(kMaxJpeg2000Tiles, codestreamLength / kSmallestTileBytes)) ||
        !MultiplyWithin(tileComponents, tileCount, kMaxJpeg2000TileComponents))
        return false;
    std::vector<uint8_t> sampleSizes(size_t(components) * kComponentBytes);
    if (!CheckedRead(reader, end, codestreamOffset + kSizFrontBytes, sampleSizes.data(), sampleSizes.size()))
        return false;
    const uint32_t largest = std::min(kLargestPrecision, expected.largestPrecision);
    for (size_t c = 0; c < components; ++c) {
        const uint8_t* component = sampleSizes.data() + c * kComponentBytes;
        const uint32_t bits = (component[0] & ~kSignedSamples) + 1u;
        if ((component[0] & kSignedSamples) != 0 || bits > largest || component[1] != 1 || component[2] != 1)
            return false;
    }
    for (uint32_t component : expected.drawn)
        if (component >= components)
            return false;
    g.components = components;
    grid = g;
    return true;
}

// The rest of the main header, as OpenJPEG reads it before any tile.
bool CJpeg2000Image::HeaderDecodes(CFileReader& reader)
{
    Session session(reader, codestreamOffset, codestreamLength);
    return session.ReadHeader() && session.image->numcomps == grid.components;
}

CJpeg2000Image::Area CJpeg2000Image::AreaOf(uint64_t tileColumn, uint64_t tileRow) const
{
    const uint64_t x0 = grid.tileX0 + tileColumn * grid.tileWidth, y0 = grid.tileY0 + tileRow * grid.tileHeight;
    return {std::max(x0, grid.imageX0), std::max(y0, grid.imageY0), std::min(x0 + grid.tileWidth, grid.imageX1),
            std::min(y0 + grid.tileHeight, grid.imageY1)};
}

bool CJpeg2000Image::GetRow(CFileReader& reader, uint32_t row, uint32_t first, uint32_t last, uint8_t* out)
{
    if (!opened || last < first || last >= grid.imageX1 - grid.imageX0 || row >= grid.imageY1 - grid.imageY0)
        return false;
    const uint64_t y = grid.imageY0 + row, tileRow = (y - grid.tileY0) / grid.tileHeight;
    const size_t pixelBytes = drawn.size();
    for (uint64_t x = grid.imageX0 + first, end = grid.imageX0 + last + 1; x < end;) {
        const uint64_t tileColumn = (x - grid.tileX0) / grid.tileWidth;
        const Tile* tile = FetchTile(reader, tileColumn, tileRow);
        if (tile == nullptr)
            return false;
        const Area area = AreaOf(tileColumn, tileRow);
        const uint64_t stop = std::min(end, area.x1);
        const size_t at = size_t((y - area.y0) * (area.x1 - area.x0) + (x - area.x0)) * pixelBytes;
        std::memcpy(out, tile->samples.data() + at, size_t(stop - x) * pixelBytes);
        out += size_t(stop - x) * pixelBytes;
        x = stop;
    }
    return true;
}

// The tile from the cache, or decoded into it; null when it does not decode
// (which the cache also remembers, so its rows fail without another try).
const CJpeg2000Image::Tile* CJpeg2000Image::FetchTile(CFileReader& reader, uint64_t tileColumn, uint64_t tileRow)
{
    const auto index = uint32_t(tileRow * grid.tilesAcross + tileColumn);
    auto held = std::find_if(tiles.begin(), tiles.end(), [index](const Tile& tile) { return tile.index == index; });
    if (held == tiles.end()) {
        Tile tile{index, 0, false, {}};
        tile.failed = !DecodeTile(reader, index, AreaOf(tileColumn, tileRow), tile.samples);
        if (tile.failed)
            std::vector<uint8_t>().swap(tile.samples);
        MakeRoom(tile.samples.size());
        heldBytes += tile.samples.size();
        tiles.push_back(std::move(tile));
        held = tiles.end() - 1;
    }
    held->lastUse = ++useCount;
    return held->failed ? nullptr : &*held;
}

// Drops the least recently used tiles until `bytes` more fit the cache.
void CJpeg2000Image::MakeRoom(uint64_t bytes)
{
    while (!tiles.empty() && heldBytes + bytes > kMaxJpeg2000TileCacheBytes) {
        const auto oldest = std::min_element(tiles.begin(), tiles.end(), [](const Tile& a, const Tile& b) {
            return a.lastUse < b.lastUse;
        });
        heldBytes -= oldest->samples.size();
        tiles.erase(oldest);
    }
}

// Decodes one tile, every component (OpenJPEG applies the inverse
// component transform wrongly to a chosen set), and keeps the drawn ones:
// only when its buffers stay within kMaxJpeg2000TileDecodeBytes, which the
// header alone sizes.
bool CJpeg2000Image::DecodeTile(CFileReader& reader, uint32_t index, const Area& area,
                                std::vector<uint8_t>& samples) const
{
    const uint64_t width = area.x1 - area.x0, height = area.y1 - area.y0;
    uint64_t working = width;
    if (!MultiplyWithin(working, height, kMaxJpeg2000TileDecodeBytes) ||
        !MultiplyWithin(working, grid.components * kOpenJpegBytesPerSample, kMaxJpeg2000TileDecodeBytes))
        return false;
    Session session(reader, codestreamOffset, codestreamLength);
    if (!session.ReadHeader() || !opj_get_decoded_tile(session.codec, session.stream, session.image, index))
        return false;
    const opj_image_t& image = *session.image;
    if (image.numcomps != grid.components)
        return false;
    for (OPJ_UINT32 c = 0; c < image.numcomps; ++c)
        if (image.comps[c].w != width || image.comps[c].h != height || image.comps[c].data == nullptr)
            return false;
    const size_t pixels = size_t(width * height), pixelBytes = drawn.size();
    samples.resize(pixels * pixelBytes);
    for (size_t k = 0; k < pixelBytes; ++k) {
        const OPJ_INT32* data = image.comps[drawn[k]].data;
        for (size_t i = 0; i < pixels; ++i) {
            const uint32_t value = uint32_t(std::clamp<OPJ_INT32>(data[i], 0, kLargestSample));
            samples[i * pixelBytes + k] = significantBits > 0 ? TopByte(value, significantBits) : uint8_t(value);
        }
    }
    return true;
}

void CJpeg2000Image::ReleaseTiles()
{
    std::vector<Tile>().swap(tiles);
    heldBytes = 0;
}

void CJpeg2000Image::Release()
{
    ReleaseTiles();
    opened = false;
    grid = Grid();
    codestreamOffset = codestreamLength = 0;
    std::vector<uint32_t>().swap(drawn);
}
