// CLeadToolLibWrapper: decodes the compressed image data of one NITF image
// segment when its rows are asked for, and hands out row spans of it.
//  - JPEG (IC "C3", "C5", "I1"): one JPEG stream per block, in block order,
//    led by the NITF APP6 segment; masked JPEG ("M3", "M5"): one stream per
//    stored block, wherever the mask table places it. Streams are found by
//    walking their marker segments, each the first time a row needs it (and
//    without a mask table every stream before it). A stream that leaves out
//    its DQT or DHT gets the NITF defaults, chosen by the APP6 quality byte.
//    A block's rows come only from a frame of the image's depth that fills
//    the block; an "I1" frame was downsampled and fills it with each pixel
//    repeated.
//  - Bi-level (IC "C1"): one CCITT T.4 strip for the whole image, decoded
//    after wrapping it in a fixed TIFF header.
// Open reads only the first stream's header. Decoded blocks are held up to
// cacheBound bytes, the least recently drawn given up first; a block too
// large to share the bound with the rest of its block row is decoded by a
// row decoder kept open at its next row, into a band of rows (lossless JPEG
// blocks, which have none, then fail). A block that cannot be found or
// decoded fails its own rows.
// kReinitialisedText and kDamagedImageText are thrown as std::runtime_error
// by Open; every other failure is a false result.
#pragma once

#include "base/FileReader.h"
#include "imaging/ImagingLibrary.h"
#include "imaging/NitfJpegDefaults.h"

#include "base/Limits.h"

#include <cstdint>
#include <list>
#include <unordered_map>
#include <vector>

constexpr unsigned kApp6Size = 27;          // the NITF APP6 segment from its marker on

enum DecoderKind : int32_t { kNotPrepared = -1, kJpegDecoder = 0, kBiLevelDecoder = 1 };

extern const char* const kReinitialisedText;
extern const char* const kDamagedImageText;

class CLeadToolLibWrapper {
public:
    int32_t kind = kNotPrepared;
    uint32_t blockCount = 0;            // JPEG streams (stored blocks); 1 for a bi-level strip
    uint32_t bitsPerPixel = 0;          // NBPP
    uint32_t bandCount = 0;             // NBANDS
    uint8_t loaderConverted = 0;        // the loader delivered the last block's colours as R,G,B
    uint8_t app6[kApp6Size] = {};       // 2-byte fields at 0, 2, 12, 14 in host order
    uint8_t tiffHeader[kBiLevelHeaderSize]; // the bi-level TIFF wrapper; the strip follows it
    // Masked JPEG: where each stored block's stream starts, counted from the
    // data offset that Open is given. Empty: the streams follow one another from there.
    std::vector<uint32_t> streamOffsets;
    // The bytes decoded blocks and row decoders hold together.
    uint64_t cacheBound = kMaxDecodedCacheBytes;

    CLeadToolLibWrapper();
    ~CLeadToolLibWrapper();
    CLeadToolLibWrapper(const CLeadToolLibWrapper&) = delete;
    CLeadToolLibWrapper& operator=(const CLeadToolLibWrapper&) = delete;

    // Binds the imaging library; when bound the decoder becomes a bi-level decoder.
    bool PrepareBiLevel();
    // The data must begin with SOI (fill bytes may lead it) and the NITF APP6
    // segment; NBPP 12 and 16 are refused.
    bool PrepareJpeg(CFileReader& reader, uint64_t dataOffset, uint64_t LI, uint32_t NBPP);
    // Readies the blocks for decoding. JPEG streams lie within the LI bytes
    // from dataOffset (LI 0: up to the end of the file); the first one's
    // frame header must declare a size, component count and precision that
    // can be decoded. blockWidth and blockHeight (NPPBH, NPPBV) bound the
    // size a block's stream may declare; 0 means not known, and the bound is
    // then the largest block NITF allows for an image of NCOLS x NROWS, and
    // any frame fills its block. downsampled: the image is "I1".
    bool Open(CFileReader& reader, uint64_t dataOffset, uint32_t blockCount, uint64_t LI, uint32_t NBPP,
              uint32_t NBANDS, uint32_t NCOLS, uint32_t NROWS, bool oneDimensional,
              uint32_t blockWidth = 0, uint32_t blockHeight = 0, bool downsampled = false);
    // Row `row` of block `block`, columns firstColumn to lastColumn, into
    // destination, which holds byteCount bytes; the block is read through
    // reader. JPEG rows come out one byte per band and pixel, and fail unless
    // byteCount holds them and every one comes from the block's frame.
    // Bi-level rows come out one byte per pixel (black 0, white 255);
    // byteCount bounds the packed bytes read for them.
    bool GetRow(CFileReader& reader, uint32_t block, uint32_t row, uint32_t firstColumn, uint32_t lastColumn,
                uint32_t byteCount, uint8_t* destination);
    // Releases every decoded block and row decoder, and what Open found.
    void FreeBitmaps();
    // The bytes decoded blocks and row decoders hold now, as counted against cacheBound.
    uint64_t HeldBytes() const { return heldBytes; }

    bool ReadNitfApp6(CFileReader& reader, uint64_t dataOffset);
    bool openJPEGBitmap(CFileReader& reader, uint64_t dataOffset, uint64_t dataLength);
    bool openBiLevelBitmap(CFileReader& reader, uint64_t dataOffset, uint64_t LI, uint32_t NCOLS, uint32_t NROWS,
                           bool oneDimensional);

    uint8_t quality() const { return app6[kApp6QualityOffset]; }
    uint8_t streamColor() const { return app6[kApp6StreamColorOffset]; }

private:
    // How a block's bitmap gives the block's rows: each pixel repeated
    // `across` and `down` times (1, or an "I1" image's downsampling factors),
    // for the block's first `rows` rows. rows 0: none, every row fails.
    struct BlockFill {
        uint32_t rows;
        uint32_t across;
        uint32_t down;
    };
    struct StreamPlace {
        uint64_t offset;    // of its SOI
        uint32_t length;    // to the end of its EOI
    };
    // A block decoded whole into `bitmap`, or by `rows` into the band of rows
    // `bitmap` holds; one that failed holds neither.
    struct DecodedBlock {
        uint32_t block;
        BITMAPHANDLE bitmap;
        ROWLOADER* rows;
        uint32_t bandFirst;     // the frame row the band starts at
        uint32_t bandRows;      // rows of the band decoded
        BlockFill fill;
        uint64_t bytes;         // counted in heldBytes
    };
    using Decoded = std::list<DecodedBlock>;

    static constexpr unsigned kApp6QualityOffset = 20;
    static constexpr unsigned kApp6StreamColorOffset = 21;
    ImagingBinding library {};              // as bound at Open
    bool opened = false;
    uint32_t blockWidthLimit = 0;           // the largest frame a block's stream may declare
    uint32_t blockHeightLimit = 0;
    uint32_t fillWidth = 0;                 // the part of a block the image's rows reach; 0: not known
    uint32_t fillHeight = 0;
    uint32_t blocksAcross = 1;              // blocks a row of the image crosses
    bool downsampled = false;               // "I1"
    uint64_t dataStart = 0;                 // the image data (JPEG) or strip (bi-level)
    uint64_t dataEnd = 0;
    std::vector<StreamPlace> found;         // unmasked JPEG: the streams walked so far, in block order
    bool walkBroken = false;                // the stream after the last one found cannot be walked
    std::vector<uint32_t> sortedOffsets;    // masked JPEG: streamOffsets in order
    Decoded recent;                         // most recently drawn first
    std::unordered_map<uint32_t, Decoded::iterator> decodedIndex;
    uint64_t heldBytes = 0;

    BlockFill FillOf(const FILEINFO& info) const;
    DecodedBlock* Decode(CFileReader& reader, uint32_t block);
    uint64_t BlockShare() const;
    void MakeRoom(uint64_t bytes);
    void Count(DecodedBlock& entry, uint64_t bytes);
    void Forget(Decoded::iterator entry);
    bool PlaceStream(CFileReader& reader, uint32_t block, StreamPlace& place);
    void DecodeJpegBlock(CFileReader& reader, uint32_t block, DecodedBlock& entry);
    void DecodeBiLevel(CFileReader& reader, DecodedBlock& entry);
    bool StartRowDecoder(const LOADSOURCE& source, uint32_t flags, uint64_t bandShare, DecodedBlock& entry,
                         FILEINFO& info);
    BITMAPHANDLE* RowBitmap(CFileReader& reader, DecodedBlock& entry, uint32_t frameRow, uint32_t& bitmapRow);
    bool GetBiLevelRow(BITMAPHANDLE* bitmap, uint32_t bitmapRow, uint32_t firstColumn, uint32_t lastColumn,
                       uint32_t byteCount, uint8_t* destination);
    bool GetJpegRow(CFileReader& reader, DecodedBlock& entry, uint32_t row, uint32_t firstColumn,
                    uint32_t lastColumn, uint32_t byteCount, uint8_t* destination);
    uint32_t LoadFlags() const;
    bool LoadBlock(CFileReader& reader, const StreamPlace& stream, uint32_t insertAt, const uint8_t* insert,
                   uint32_t insertSize, DecodedBlock& entry, FILEINFO& info);
};
