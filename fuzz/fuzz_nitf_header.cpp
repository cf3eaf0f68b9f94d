// The NITF file header parse on one input file (its FL set to the input's
// size, so that the segment lists are reached).
#include "FuzzFile.h"
#include "nitf/NitfFileHeader.h"

#include <string>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size)
{
    std::basic_string<uint8_t> input(data, size);
    DeclareInputLength(input.data(), input.size());
    if (!WriteFuzzFile(input.data(), input.size()))
        return 0;
    CNitfFileHeader header;
    header.SetPath(FuzzFilePath().c_str());
    if (header.Parse())
        header.HasRpfHeader();
    return 0;
}
