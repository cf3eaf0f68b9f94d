// CRpfFrameReader: one CADRG or CIB frame (MIL-STD-2411 RPF inside NITF).
// Open reads every section that decoding needs into memory; afterwards only
// the VQ codes stay on disk, read a code row at a time as lines are served.
#pragma once

#include "base/FileReader.h"
#include "base/Refusal.h"
#include "rpf/RpfColorGraySection.h"
#include "rpf/RpfCompressionSection.h"
#include "rpf/RpfCoverage.h"
#include "rpf/RpfHeaderSection.h"
#include "rpf/RpfImageSection.h"
#include "rpf/RpfLocationSection.h"

#include <cstdint>
#include <vector>

class CRpfFrameReader {
public:
    // Line state of the current draw.
    uint32_t codeCapacity = 0;
    std::vector<uint16_t> codeBuffer;     // the codes of the current line; empty outside a draw
    std::vector<uint8_t> kernelRowBuffer; // one kernel row of one code

    RpfHeaderSection headerSection;
    RpfLocationSection locationSection;
    RpfCoverage coverage;
    RpfCompressionSection compressionSection;
    RpfColorGraySection colorGraySection;
    RpfImageSection imageSection;
    Refusal refusal = Refusal::kNone; // why Open failed

    // Reads the frame whose RPF header section (the RPFHDR TRE data) starts
    // at headerSectionOffset. True when every section was read and accepted.
    bool Open(CFileReader& reader, uint64_t headerSectionOffset);
    uint32_t FindComponentLocation(uint16_t componentId) const;

    // Sizes the code buffer for a draw of width columns, clipped to the frame's.
    void PrepareDraw(uint32_t width);
    // Palette indices of columns firstColumn..lastColumn (inclusive) of
    // imageRow into output, through the draw's reader.
    bool ReadLine(CFileReader& reader, uint32_t imageRow, uint32_t firstColumn, uint32_t lastColumn,
                  uint8_t* output);
    // Frees the code buffer at the end of a draw.
    void ReleaseCodeBuffer();

private:
    // The code row and span whose codes the code buffer holds: the kernel-height
    // rows of one code row decode from the same codes, so they are read once.
    bool codesHeld = false;
    uint32_t heldCodeRow = 0;
    uint32_t heldFirstColumn = 0;
    uint32_t heldLastColumn = 0;

    bool FetchCodes(CFileReader& reader, uint32_t imageRow, uint32_t firstColumn, uint32_t lastColumn);
    bool AssembleLine(uint32_t imageRow, uint32_t firstColumn, uint32_t lastColumn, uint8_t* output);
    bool ListsNeededComponents() const;
    bool AssembleFromTable(const RpfValueTable& table, uint32_t firstOffset, uint32_t span, uint8_t* output);
};
