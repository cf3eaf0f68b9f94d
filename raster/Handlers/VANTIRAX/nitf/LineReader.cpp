// ReadLine: one row of the image, assembled block by block. Uncompressed rows
// are read from the file, only the bytes of the span in each band; compressed
// rows come from the decoder.
#include "nitf/NitfImage.h"

#include "base/CheckedRead.h"
#include "base/Limits.h"
#include "base/SampleBits.h"

#include <algorithm>
#include <cstring>

namespace {

constexpr unsigned kByteBits = 8;
constexpr uint32_t kNibbleBits = 4;
constexpr uint32_t kStripRows = 32; // rows of a block read at once: small enough to stay in the CPU caches

} // namespace

uint32_t CNitfImage::OutputPixelBytes() const
{
    if (compressionKind == kBiLevel)
        return 1;
    if (compressionKind == kUncompressed || compressionKind == kJpeg2000)
        return uint32_t(drawnBandCount);
    return uint32_t(NBPP) * uint32_t(NBANDS) / kByteBits;
}

bool CNitfImage::DrawsEveryBandInOrder() const
{
    for (int32_t drawn = 0; drawn < drawnBandCount; ++drawn)
        if (drawnBands[drawn] != drawn)
            return false;
    return drawnBandCount == NBANDS;
}

bool CNitfImage::ReadLine(CFileReader& reader, uint32_t row, int32_t firstColumn, int32_t lastColumn, uint8_t* out)
{
    if (!isPrepared || out == nullptr || row >= uint32_t(NROWS) || firstColumn < 0 || lastColumn < firstColumn ||
        lastColumn >= NCOLS)
        return false;
    if (compressionKind == kJpeg2000)
        return jpeg2000.GetRow(reader, row, uint32_t(firstColumn), uint32_t(lastColumn), out);
    const bool decoded = compressionKind != kUncompressed;
    if (decoded && compressionKind != kBiLevel && compressionKind != kJpeg && compressionKind != kLosslessJpeg &&
        compressionKind != kDownsampledJpeg)
        return false;
    const uint32_t blockWidth = uint32_t(NPPBH);
    const uint32_t first = uint32_t(firstColumn), last = uint32_t(lastColumn);
    const uint32_t blockRow = row / uint32_t(NPPBV), rowInBlock = row % uint32_t(NPPBV);
    const uint32_t firstBlock = blockRow * uint32_t(NBPR) + first / blockWidth;
    const uint32_t lastBlock = blockRow * uint32_t(NBPR) + last / blockWidth;
    const uint32_t pixelBytes = OutputPixelBytes();
    for (uint32_t b = firstBlock; b <= lastBlock; ++b) {
        const uint32_t c0 = b == firstBlock ? first % blockWidth : 0;
        const uint32_t c1 = b == lastBlock ? last % blockWidth : blockWidth - 1;
        const uint32_t n = c1 - c0 + 1;
        const bool ok = decoded ? ReadCompressedBlock(reader, b, rowInBlock, c0, c1, out)
                                : ReadUncompressedBlock(reader, b, rowInBlock, c0, n, out);
        if (!ok)
            return false;
        out += size_t(n) * pixelBytes;
    }
    return true;
}

// Where a block (one band's block in IMODE "S") starts in the image data:
// from the mask table, or counted from the block number.
bool CNitfImage::ReadUncompressedBlock(CFileReader& reader, uint32_t block, uint32_t rowInBlock, uint32_t c0,
                                       uint32_t n, uint8_t* out)
{
    const uint64_t blocks = uint64_t(NBPR) * uint64_t(NBPC);
    const bool bandsApart = IMODE() == 'S';
    if (IMODE() == 'P' && !IsPacked()) {
        // All bands of a pixel stand together: one read for the span.
        if (isMasked && blockOffsets[block] == kBlockNotStored) {
            std::memset(out, 0, size_t(n) * size_t(drawnBandCount));
            return true;
        }
        const uint64_t blockStart = isMasked ? blockOffsets[block] : block * BandBlockBytes() * uint64_t(NBANDS);
        const uint32_t pixelStride = uint32_t(NBANDS) * uint32_t(bytesPerPixel);
        const BlockPlace place = StripPlace(dataOffset + blockStart, pixelStride, rowInBlock, block % uint32_t(NBPR));
        const uint64_t position = dataOffset + blockStart + (uint64_t(NPPBH) * rowInBlock + c0) * pixelStride;
        const uint8_t* data = nullptr;
        if (!ReadSpan(reader, place, position, uint64_t(n) * pixelStride, data))
            return false;
        if (bytesPerPixel == 1 && DrawsEveryBandInOrder()) {
            // 8-bit pixels stored as they are delivered: band after band.
            std::memcpy(out, data, size_t(n) * pixelStride);
            return true;
        }
        for (int32_t drawn = 0; drawn < drawnBandCount; ++drawn)
            ScatterBand(data + size_t(drawnBands[drawn]) * size_t(bytesPerPixel), pixelStride, n, drawn, out);
        return true;
    }
    // 8-bit RGB bands read from the cache are interleaved in one pass at the end.
    const uint8_t* held[kRgbBands] = {};
    const bool interleave = drawnBandCount == int32_t(kRgbBands) && bytesPerPixel == 1;
    for (int32_t drawn = 0; drawn < drawnBandCount; ++drawn) {
        const int32_t band = drawnBands[drawn];
        uint64_t blockStart = 0;
        if (isMasked) {
            const uint32_t record = blockOffsets[bandsApart ? band * blocks + block : block];
            if (record == kBlockNotStored) {
                ScatterBand(nullptr, 0, n, drawn, out);
                continue;
            }
            blockStart = record;
        } else {
            // In IMODE "S" each band's blocks follow all blocks of the band before.
            blockStart = bandsApart ? (uint64_t(band) * blocks + block) * BandBlockBytes()
                                    : uint64_t(block) * BandBlockBytes() * uint64_t(NBANDS);
        }
        if (!ReadBandSpan(reader, blockStart, block % uint32_t(NBPR), drawn, rowInBlock, c0, n, out,
                          interleave ? &held[drawn] : nullptr)) {
            ScatterHeld(held, n, out);
            return false;
        }
    }
    ScatterHeld(held, n, out);
    return true;
}

// Writes the RGB bands whose scatter ReadBandSpan left for later: all three
// in one pass, or each alone when some came another way.
void CNitfImage::ScatterHeld(const uint8_t* const held[], uint32_t n, uint8_t* out) const
{
    if (held[0] != nullptr && held[1] != nullptr && held[2] != nullptr) {
        // The band pointers in locals: stores to out cannot change them.
        const uint8_t *red = held[0], *green = held[1], *blue = held[2];
        for (size_t i = 0; i < n; ++i) {
            out[i * kRgbBands] = red[i];
            out[i * kRgbBands + 1] = green[i];
            out[i * kRgbBands + 2] = blue[i];
        }
        return;
    }
    for (size_t band = 0; band < kRgbBands; ++band)
        if (held[band] != nullptr)
            ScatterBand(held[band], 1, n, int32_t(band), out);
}

// Drawn band `drawn` of the span in a block stored by block ("B"), by row
// ("R") or band-sequentially ("S", where blockStart is already that band's
// block); packed pixels of one band in any IMODE.
bool CNitfImage::ReadBandSpan(CFileReader& reader, uint64_t blockStart, uint32_t column, int32_t drawn,
                              uint32_t rowInBlock, uint32_t c0, uint32_t n, uint8_t* out, const uint8_t** deferred)
{
    const int32_t band = drawnBands[drawn];
    const uint64_t pixelBytes = uint64_t(bytesPerPixel);
    const uint64_t blockPosition = dataOffset + blockStart;
    if (IsPacked())
        return ReadPackedSpan(reader, blockPosition + (IMODE() == 'B' ? uint64_t(band) * BandBlockBytes() : 0),
                              rowInBlock, c0, n, drawn, out);
    uint64_t pixelIndex = uint64_t(NPPBH) * rowInBlock + c0;
    // The strip holding the span: of the band's plane in IMODE "B" and "S",
    // of the rows of every band in IMODE "R".
    const uint32_t bandSlot = uint32_t(drawn) * uint32_t(NBPR) + column;
    BlockPlace place = StripPlace(blockPosition, uint32_t(pixelBytes), rowInBlock, bandSlot);
    if (IMODE() == 'B') {
        pixelIndex += uint64_t(band) * uint64_t(NPPBH) * uint64_t(NPPBV);
        place = StripPlace(blockPosition + uint64_t(band) * BandBlockBytes(), uint32_t(pixelBytes), rowInBlock,
                           bandSlot);
    } else if (IMODE() == 'R') {
        pixelIndex += uint64_t(NPPBH) * (uint64_t(rowInBlock) * uint64_t(NBANDS - 1) + uint64_t(band));
        place = StripPlace(blockPosition, uint32_t(pixelBytes) * uint32_t(NBANDS), rowInBlock, column);
    }
    const uint8_t* data = nullptr;
    if (!ReadSpan(reader, place, blockPosition + pixelIndex * pixelBytes, n * pixelBytes, data))
        return false;
    // Bytes in the strip cache stay put until the row is done; the line
    // buffer is overwritten by the next band's read.
    if (deferred != nullptr && data != lineBuffer.data()) {
        *deferred = data;
        return true;
    }
    ScatterBand(data, uint32_t(pixelBytes), n, drawn, out);
    return true;
}

// A span of packed pixels, read alone into the line buffer. Each pixel's
// bits follow the last pixel's, most significant first: 1-bit pixels are
// palette indices; a 12-bit pixel's three nibbles are its low byte, then its
// high nibble, and its value is reduced as wider pixels are.
bool CNitfImage::ReadPackedSpan(CFileReader& reader, uint64_t planeStart, uint32_t rowInBlock, uint32_t c0,
                                uint32_t n, int32_t drawn, uint8_t* out)
{
    const uint64_t pixelBits = uint64_t(NBPP);
    const uint64_t firstBit = (uint64_t(NPPBH) * rowInBlock + c0) * pixelBits;
    const uint64_t firstByte = firstBit / kByteBits;
    const uint64_t count = (firstBit + n * pixelBits + kByteBits - 1) / kByteBits - firstByte;
    if (count > lineBuffer.size() || !CheckedRead(reader, readLimit, planeStart + firstByte, lineBuffer.data(), count))
        return false;
    const int32_t significant = SignificantBits();
    uint64_t bit = firstBit % kByteBits;
    for (uint32_t i = 0; i < n; ++i) {
        uint64_t value = 0;
        for (const uint64_t end = bit + pixelBits; bit < end; ++bit)
            value = value << 1 | ((lineBuffer[bit / kByteBits] >> (kByteBits - 1 - bit % kByteBits)) & 1);
        if (!OneBitIndices())
            value = TopByte((value & 0xF) << kByteBits | value >> kNibbleBits, significant);
        out[size_t(i) * size_t(drawnBandCount) + size_t(drawn)] = uint8_t(value);
    }
    return true;
}

void CNitfImage::ReleaseBlockCache()
{
    blockCache.Release();
    jpeg2000.ReleaseTiles();
}

// The strip of rows rowInBlock belongs to, in a plane of pixelBytes-byte
// pixels (one band, or every band of a pixel or of a row) starting at
// planeStart, cached in slot.
CNitfImage::BlockPlace CNitfImage::StripPlace(uint64_t planeStart, uint32_t pixelBytes, uint32_t rowInBlock,
                                              uint32_t slot) const
{
    const uint32_t first = rowInBlock - rowInBlock % kStripRows;
    const uint64_t rows = std::min<uint64_t>(kStripRows, uint64_t(NPPBV) - first);
    const uint64_t rowBytes = uint64_t(NPPBH) * pixelBytes;
    return {planeStart + first * rowBytes, rows * rowBytes, slot};
}

// The span's bytes from the strip cache, reading the whole strip into its
// slot when the slot holds another. Null when the cache would be too large or
// the strip does not lie whole in the file: the caller reads the span alone.
const uint8_t* CNitfImage::CachedSpan(CFileReader& reader, const BlockPlace& place, uint64_t position, uint64_t count)
{
    // P and R strips hold every band; B and S strips one band each.
    const bool bandsTogether = IMODE() == 'P' || IMODE() == 'R';
    const uint64_t slots = uint64_t(NBPR) * uint64_t(bandsTogether ? 1 : drawnBandCount);
    const uint64_t slotBytes = std::min<uint64_t>(kStripRows, uint64_t(NPPBV)) * uint64_t(NPPBH) *
                               uint64_t(bytesPerPixel) * uint64_t(bandsTogether ? NBANDS : 1);
    uint64_t cacheBytes = slots;
    if (!MultiplyWithin(cacheBytes, slotBytes, kMaxBlockCacheBytes) || position < place.start ||
        !SpanWithin(position - place.start, count, place.bytes))
        return nullptr;
    blockCache.Shape(slots, slotBytes);
    const uint8_t* strip = blockCache.Fetch(reader, readLimit, place.slot, place.start, place.bytes);
    return strip == nullptr ? nullptr : strip + (position - place.start);
}

// The span's bytes, from the block cache or with one read into the line
// buffer; false when the bytes are not all in the file (a short final block)
// or do not fit the buffer.
bool CNitfImage::ReadSpan(CFileReader& reader, const BlockPlace& place, uint64_t position, uint64_t count,
                          const uint8_t*& data)
{
    if (count > lineBuffer.size())
        return false;
    data = CachedSpan(reader, place, position, count);
    if (data != nullptr)
        return true;
    data = lineBuffer.data();
    return CheckedRead(reader, readLimit, position, lineBuffer.data(), count);
}

// Writes byte `drawn` of n output pixels from source pixels sourceStride
// bytes apart; a null source writes zeros (a block the file does not store).
void CNitfImage::ScatterBand(const uint8_t* source, uint32_t sourceStride, uint32_t n, int32_t drawn,
                             uint8_t* out) const
{
    const size_t outStride = size_t(drawnBandCount);
    if (source != nullptr && bytesPerPixel == 1) {
        // 8-bit samples are copied as they stand.
        if (outStride == 1 && sourceStride == 1) {
            std::memcpy(out, source, n);
            return;
        }
        if (outStride == kRgbBands && sourceStride == 1) {
            // One band of an RGB row: a constant stride the compiler can unroll.
            uint8_t* target = out + drawn;
            for (uint32_t i = 0; i < n; ++i)
                target[size_t(i) * kRgbBands] = source[i];
            return;
        }
        for (uint32_t i = 0; i < n; ++i)
            out[i * outStride + size_t(drawn)] = source[size_t(i) * sourceStride];
        return;
    }
    if (source != nullptr && bytesPerPixel == 2) {
        // 16-bit samples: the shift is worked out once for the span, and the
        // loop is one the compiler vectorises (size_t indices, no calls).
        const int32_t significant = SignificantBits();
        const unsigned right = significant >= int32_t(kByteBits) ? unsigned(significant) - kByteBits : 0;
        const unsigned left = significant >= int32_t(kByteBits) ? 0 : kByteBits - unsigned(significant);
        const auto reduce = [right, left](const uint8_t* pixel) {
            return uint8_t(((unsigned(pixel[0]) << kByteBits | pixel[1]) >> right) << left);
        };
        if (outStride == 1 && sourceStride == 2) { // one band stored apart: constant strides
            for (size_t i = 0; i < n; ++i)
                out[i] = reduce(source + 2 * i);
            return;
        }
        for (size_t i = 0; i < n; ++i)
            out[i * outStride + size_t(drawn)] = reduce(source + i * sourceStride);
        return;
    }
    for (uint32_t i = 0; i < n; ++i)
        out[i * outStride + size_t(drawn)] = source == nullptr ? 0 : ConvertPixel(source + size_t(i) * sourceStride);
}

// A pixel wider than 8 bits (most significant byte first) becomes the 8 most
// significant of its ABPP significant bits. Right-justified pixels (PJUST
// "R") hold them in the low bits; left-justified ones in the high bits.
uint8_t CNitfImage::ConvertPixel(const uint8_t* pixel) const
{
    if (bytesPerPixel < 2)
        return pixel[0];
    uint64_t value = 0;
    for (int32_t i = 0; i < bytesPerPixel; ++i)
        value = (value << kByteBits) | pixel[i];
    return TopByte(value, SignificantBits());
}

int32_t CNitfImage::SignificantBits() const
{
    return ABPP >= 1 && ABPP <= NBPP && PJUST() != 'L' ? ABPP : NBPP;
}

// A compressed block's span, from the decoder: one stream per stored block
// (a masked block that is not stored gives zeros).
bool CNitfImage::ReadCompressedBlock(CFileReader& reader, uint32_t block, uint32_t rowInBlock, uint32_t c0, uint32_t c1, uint8_t* out)
{
    const uint32_t n = c1 - c0 + 1;
    uint32_t stream = block;
    if (!streamIndex.empty()) {
        stream = streamIndex[block];
        if (stream == kBlockNotStored) {
            std::memset(out, 0, size_t(n) * OutputPixelBytes());
            return true;
        }
    }
    const uint32_t byteCount = compressionKind == kBiLevel ? (n + kByteBits - 1) / kByteBits : n * OutputPixelBytes();
    return decoder.GetRow(reader, stream, rowInBlock, c0, c1, byteCount, out);
}
