// Image data placed at an offset in a temporary file and opened with a
// CFileReader, as the decoder meets it inside a NITF file.
#pragma once

#include "base/FileReader.h"
#include "tests/fixtures/TempFiles.h"

#include <cstdint>
#include <string>
#include <vector>

constexpr uint32_t kTestDataOffset = 137; // odd, so no alignment is assumed

struct DecoderTestFile {
    explicit DecoderTestFile(const std::vector<uint8_t>& data)
        : file(std::string(kTestDataOffset, 'x') + std::string(data.begin(), data.end()), ".ntf")
    {
        reader.OpenFile(file.c_str(), kShareDenyWrite);
    }

    TempFile file;
    CFileReader reader;
};
