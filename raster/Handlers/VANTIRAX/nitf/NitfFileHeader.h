// CNitfFileHeader: the NITF 2.0 / 2.1 (and NSIF 1.0) file header, read to learn whether a
// file is NITF at all, where its segments lie and what user-defined header
// data (the RPFHDR extension of RPF frames) it carries.
#pragma once

#include "base/Refusal.h"

#include <cstdint>
#include <string>

struct NitfSegmentLength {
    uint32_t subheaderLength; // LISH, LSSH, LLSH, LTSH, LDSH or LRESH
    uint64_t dataLength;      // LI, LS, LL, LT, LD or LRE
};

constexpr uint32_t kNoUserHeader = 0xFFFFFFFF;

class CNitfFileHeader {
public:
    std::string path;                   // set by the caller before Parse
    char headerText[342] = {};          // FHDR to OPHONE (NITF 2.0 with FSDEVT: to FSCOP) as read
    char lengthText[18] = {};           // FL (12) and HL (6) as last read
    int32_t NUMI = 0;
    NitfSegmentLength* imageSegments = nullptr;
    int32_t NUMS = 0;
    NitfSegmentLength* graphicSegments = nullptr;
    int32_t NUML = 0;                   // NUMX in NITF 2.1, always 0 there
    NitfSegmentLength* labelSegments = nullptr;
    int32_t NUMT = 0;
    NitfSegmentLength* textSegments = nullptr;
    int32_t NUMDES = 0;
    NitfSegmentLength* desSegments = nullptr;
    int32_t NUMRES = 0;
    NitfSegmentLength* resSegments = nullptr;
    int32_t UDHDL = 0;
    int32_t UDHOFL = 0;
    uint8_t* UDHD = nullptr;            // UDHDL - 3 bytes, not NUL-terminated
    int32_t XHDL = 0;
    int32_t XHDLOFL = 0;
    uint8_t* XHD = nullptr;             // XHDL - 3 bytes
    uint32_t HL = 0;
    uint64_t FL = 0;
    uint32_t userHeaderOffset = 0;      // file offset of UDHOFL; kNoUserHeader when UDHDL is 0
    uint16_t fixedLayout = 0;           // 1: FL at offset 342; 0: at 382 (NITF 2.0 with FSDEVT)
    uint16_t version21 = 0;             // 1 in NITF 2.1 and NSIF 1.0
    Refusal refusal = Refusal::kNone;   // why Parse failed

    CNitfFileHeader() = default;
    ~CNitfFileHeader() { Release(); }
    CNitfFileHeader(const CNitfFileHeader&) = delete;
    CNitfFileHeader& operator=(const CNitfFileHeader&) = delete;

    // Sets the path Parse reads (none for null).
    void SetPath(const char* filePath);
    // Reads the header of the file at path. False on any failure; what was
    // read before the failure stays in the record.
    bool Parse();
    // Frees every owned buffer and nulls it; forgets the path.
    void Release();

    // True when UDHD holds the RPFHDR extension of an RPF frame.
    bool HasRpfHeader() const;

    // FTITLE (80 characters) and FSCLAS lie at the same positions in NITF 2.0 and 2.1.
    static constexpr unsigned kFtitleWidth = 80;
    const char* FTITLE() const { return headerText + 39; }
    char FSCLAS() const { return headerText[119]; }
};
