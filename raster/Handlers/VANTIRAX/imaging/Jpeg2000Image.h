// CJpeg2000Image: the JPEG 2000 image data of a NITF image segment ("C8"):
// a codestream, or a JP2 file whose "jp2c" box holds it, lying within a
// range of the file that nothing is read outside. The open reads and checks
// the main header only; a tile is decoded by OpenJPEG when a row first
// needs it and kept, 8 bits a drawn sample, in a cache of the most recently
// used tiles (kMaxJpeg2000TileCacheBytes). A tile that fails to decode, or
// whose decoding would take more than kMaxJpeg2000TileDecodeBytes, fails
// its rows only. Each image makes its own OpenJPEG objects for each tile.
#pragma once

#include "base/FileReader.h"

#include <cstdint>
#include <vector>

// What the image subheader says the codestream holds and how rows show it.
struct Jpeg2000Expectation {
    uint32_t columns = 0, rows = 0;  // NCOLS, NROWS
    uint32_t components = 0;         // NBANDS
    uint32_t largestPrecision = 0;   // NBPP: no component may have more bits
    int32_t significantBits = 0;     // samples shown as the top 8 of these bits; 0: as they are
    std::vector<uint32_t> drawn;     // the components a row shows, in their order
};

class CJpeg2000Image {
public:
    // Reads the header of the codestream within the `length` bytes at
    // `offset` and checks it against the subheader: its image size,
    // component count, precision (1 to 16 bits, unsigned, not subsampled)
    // and a tile grid whose tiles the data could hold. False: not served.
    bool Open(CFileReader& reader, uint64_t offset, uint64_t length, const Jpeg2000Expectation& expected);
    // Columns first..last of a row, the drawn components of each pixel
    // together; false when a tile under the span does not decode.
    bool GetRow(CFileReader& reader, uint32_t row, uint32_t first, uint32_t last, uint8_t* out);
    // Empties the tile cache; every draw starts and ends with an empty one.
    void ReleaseTiles();
    void Release();

    // The grid of the image and its tiles on the reference grid (SIZ).
    struct Grid {
        uint64_t imageX0 = 0, imageY0 = 0, imageX1 = 0, imageY1 = 0; // XOsiz, YOsiz, Xsiz, Ysiz
        uint64_t tileX0 = 0, tileY0 = 0, tileWidth = 0, tileHeight = 0; // XTOsiz, YTOsiz, XTsiz, YTsiz
        uint64_t tilesAcross = 0, tilesDown = 0;
        uint32_t components = 0;                                         // Csiz
    };

private:
    struct Area {
        uint64_t x0, y0, x1, y1;
    };
    struct Tile {
        uint32_t index;
        uint64_t lastUse;
        bool failed;
        std::vector<uint8_t> samples; // the tile's area, drawn components of a pixel together
    };

    bool opened = false;
    uint64_t codestreamOffset = 0, codestreamLength = 0;
    Grid grid;
    int32_t significantBits = 0;
    std::vector<uint32_t> drawn;          // components in the order rows show them
    std::vector<Tile> tiles;
    uint64_t heldBytes = 0;
    uint64_t useCount = 0;

    bool FindCodestream(CFileReader& reader, uint64_t offset, uint64_t length);
    bool ReadSiz(CFileReader& reader, const Jpeg2000Expectation& expected);
    bool HeaderDecodes(CFileReader& reader);
    Area AreaOf(uint64_t tileColumn, uint64_t tileRow) const;
    const Tile* FetchTile(CFileReader& reader, uint64_t tileColumn, uint64_t tileRow);
    bool DecodeTile(CFileReader& reader, uint32_t index, const Area& area, std::vector<uint8_t>& samples) const;
    void MakeRoom(uint64_t bytes);
};
