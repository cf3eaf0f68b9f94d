// Every cap the library sets, in one place. Memory otherwise follows the
// file: a table, stream or buffer sized from a file is first checked to lie
// within it. These caps stand where the file cannot bound a size.
#pragma once

#include <cstdint>

// The largest file a reader reads: the largest FL (12 digits). Every read
// ends at or before it; positions and seeks are 64-bit below it.
constexpr uint64_t kLargestReaderOffset = 999999999999;

// Path bytes a reader holds, the terminator included; longer paths are refused.
constexpr unsigned kReaderPathSize = 260;

// What one compressed image holds decoded, however large it declares itself:
// the JPEG blocks and the bi-level bitmap decoded whole, and for those too
// large to share it with the rest of their block row, an open row decoder
// and a band of rows each. Least recently drawn blocks make room.
constexpr uint64_t kMaxDecodedCacheBytes = uint64_t(64) << 20;

// One allocation of libtiff's working memory while it decodes a bi-level
// strip: its run arrays take 16 bytes per column of the declared width,
// which a few bytes of strip can claim.
constexpr uint64_t kMaxBiLevelLibraryAllocation = uint64_t(256) << 20;

// The strips of NITF blocks a draw holds, one per block column (per band
// and block column when bands are stored apart); larger strips are read a
// row at a time.
constexpr uint64_t kMaxBlockCacheBytes = uint64_t(64) << 20;

// JPEG 2000 ("C8") tiles decoded on demand and held, 8 bits a drawn sample,
// least recently used dropped first.
constexpr uint64_t kMaxJpeg2000TileCacheBytes = uint64_t(64) << 20;

// OpenJPEG's memory while it decodes one tile: 4 bytes a sample in its tile
// buffer and 4 more in its output image, for each decoded component. The
// header alone sets the tile's size, so a larger tile is not decoded and
// its rows fail. Its 8-bit samples (an eighth of this) always fit the cache.
constexpr uint64_t kMaxJpeg2000TileDecodeBytes = uint64_t(256) << 20;

// JPEG 2000 tiles of one codestream, and tiles times components: OpenJPEG
// keeps about 6 KB of header state a tile and 1 KB a tile component from
// the main header on, before any tile data is read. A codestream must also
// hold the 14 bytes of a tile-part's SOT and SOD for each tile.
constexpr uint64_t kMaxJpeg2000Tiles = 16384;
constexpr uint64_t kMaxJpeg2000TileComponents = 65536;

// The RPF subframes a draw holds, one row of them; larger subframes are read
// a code row at a time.
constexpr uint64_t kMaxSubframeCacheBytes = uint64_t(1) << 20;

// The largest factor by which an "I1" frame may have been downsampled: a
// frame smaller than its block by more does not fill it.
constexpr uint32_t kLargestDownsampling = 8;
