// CLeadToolLibWrapper: decodes the compressed image data of one NITF image
// segment into bitmaps held in memory, and hands out row spans of them.
//  - JPEG (IC "C3", "C5", "I1"): one JPEG stream per block, in block order,
//    led by the NITF APP6 segment; masked JPEG ("M3", "M5"): one stream per
//    stored block, wherever the mask table places it. Streams are found by
//    walking their marker segments. A stream that leaves out its DQT or DHT
//    gets the NITF defaults, chosen by the APP6 quality byte. A block's rows
//    come only from a frame of the image's depth that fills the block; an
//    "I1" frame was downsampled and fills it with each pixel repeated.
//  - Bi-level (IC "C1"): one CCITT T.4 strip for the whole image, decoded
//    after wrapping it in a fixed TIFF header.
// The three texts of kDecoderErrorTexts are thrown as std::runtime_error;
// every other failure is a false result.
#pragma once

#include "base/FileReader.h"
#include "imaging/ImagingLibrary.h"
#include "imaging/NitfJpegDefaults.h"

#include <cstdint>
#include <vector>

constexpr unsigned kApp6Size = 27;          // the NITF APP6 segment from its marker on

enum DecoderKind : int32_t { kNotPrepared = -1, kJpegDecoder = 0, kBiLevelDecoder = 1 };

extern const char* const kReinitialisedText;
extern const char* const kDamagedImageText;
extern const char* const kOutOfMemoryText;

class CLeadToolLibWrapper {
public:
    int32_t kind = kNotPrepared;
    BITMAPHANDLE** bitmaps = nullptr;   // bitmapCount owned records, or null
    uint32_t bitmapCount = 0;
    uint32_t bitsPerPixel = 0;          // NBPP
    uint32_t bandCount = 0;             // NBANDS
    uint8_t loaderConverted = 0;        // the loader delivered the last block's colours as R,G,B
    uint8_t app6[kApp6Size] = {};       // 2-byte fields at 0, 2, 12, 14 in host order
    uint8_t tiffHeader[kBiLevelHeaderSize]; // the bi-level TIFF wrapper; the strip follows it
    // Masked JPEG: where each bitmap's stream starts, counted from the data
    // offset that Open is given. Empty: the streams follow one another from there.
    std::vector<uint32_t> streamOffsets;

    CLeadToolLibWrapper();
    ~CLeadToolLibWrapper();
    CLeadToolLibWrapper(const CLeadToolLibWrapper&) = delete;
    CLeadToolLibWrapper& operator=(const CLeadToolLibWrapper&) = delete;

    // Binds the imaging library; when bound the decoder becomes a bi-level decoder.
    bool PrepareBiLevel();
    // The data must begin with SOI (fill bytes may lead it) and the NITF APP6
    // segment; NBPP 12 and 16 are refused.
    bool PrepareJpeg(CFileReader& reader, uint64_t dataOffset, uint64_t LI, uint32_t NBPP);
    // Decodes every block. JPEG streams lie within the LI bytes from
    // dataOffset (LI 0: up to the end of the file). blockWidth and
    // blockHeight (NPPBH, NPPBV) bound the size a block's stream may declare;
    // 0 means not known, and the bound is then the largest block NITF allows
    // for an image of NCOLS x NROWS, and any frame fills its block.
    // downsampled: the image is "I1".
    bool Open(CFileReader& reader, uint64_t dataOffset, uint32_t blockCount, uint64_t LI, uint32_t NBPP,
              uint32_t NBANDS, uint32_t NCOLS, uint32_t NROWS, bool oneDimensional,
              uint32_t blockWidth = 0, uint32_t blockHeight = 0, bool downsampled = false);
    // Row `row` of block `block`, columns firstColumn to lastColumn, into
    // destination, which holds byteCount bytes. JPEG rows come out one byte
    // per band and pixel, and fail unless byteCount holds them and every one
    // comes from the block's frame. Bi-level rows come out one byte per pixel
    // (black 0, white 255); byteCount bounds the packed bytes read for them.
    bool GetRow(uint32_t block, uint32_t row, uint32_t firstColumn, uint32_t lastColumn, uint32_t byteCount,
                uint8_t* destination);
    void FreeBitmaps();

    bool ReadNitfApp6(CFileReader& reader, uint64_t dataOffset);
    bool openJPEGBitmap(CFileReader& reader, uint64_t dataOffset, uint64_t dataLength);
    bool openBiLevelBitmap(CFileReader& reader, uint64_t dataOffset, uint64_t LI, uint32_t NCOLS, uint32_t NROWS,
                           bool oneDimensional);

    uint8_t quality() const { return app6[kApp6QualityOffset]; }
    uint8_t streamColor() const { return app6[kApp6StreamColorOffset]; }

private:
    // How a JPEG block's bitmap gives the block's rows: each pixel repeated
    // `across` and `down` times (1, or an "I1" image's downsampling factors),
    // for the block's first `rows` rows. rows 0: none, every row fails.
    struct BlockFill {
        uint32_t rows;
        uint32_t across;
        uint32_t down;
    };

    static constexpr unsigned kApp6QualityOffset = 20;
    static constexpr unsigned kApp6StreamColorOffset = 21;
    uint32_t blockWidthLimit = 0;           // the largest frame a block's stream may declare
    uint32_t blockHeightLimit = 0;
    uint32_t fillWidth = 0;                 // the part of a block the image's rows reach; 0: not known
    uint32_t fillHeight = 0;
    bool downsampled = false;               // "I1"
    std::vector<BlockFill> fills;           // per JPEG bitmap
    L_FreeBitmapFunction freeBitmap = nullptr;  // the kernel that allocated `bitmaps`

    BlockFill FillOf(const FILEINFO& info) const;
    bool GetBiLevelRow(const ImagingBinding& library, uint32_t row, uint32_t firstColumn, uint32_t lastColumn,
                       uint32_t byteCount, uint8_t* destination);
    bool GetJpegRow(const ImagingBinding& library, uint32_t block, uint32_t row, uint32_t firstColumn,
                    uint32_t lastColumn, uint32_t byteCount, uint8_t* destination);
    void AllocateBitmaps(const ImagingBinding& library);
    uint32_t LoadFlags() const;
    bool LoadBlock(CFileReader& reader, const ImagingBinding& library, uint32_t block, uint64_t offset,
                   uint32_t length, LOADFILEOPTION& options);
    bool LoadWithDefaultTables(CFileReader& reader, const ImagingBinding& library, uint32_t block, uint64_t offset,
                               uint32_t length, LOADFILEOPTION& options, FILEINFO& info);
};
