// Image data placed at an offset in a temporary file and opened with a
// CFileReader, as the decoder meets it inside a NITF file.
#pragma once

#include "base/FileReader.h"
#include "tests/fixtures/TempFiles.h"

#include <cstdint>
#include <string>
#include <vector>

constexpr uint32_t kTestDataOffset = 137;   // odd, so no alignment is assumed

struct DecoderTestFile {
    TempFile file;
    CFileReader reader;

    explicit DecoderTestFile(const std::vector<uint8_t>& data, const std::vector<uint8_t>& trailer = {})
        : file(Content(data, trailer), ".ntf")
    {
        reader.OpenFile(file.c_str(), kShareDenyWrite);
    }

    static std::string Content(const std::vector<uint8_t>& data, const std::vector<uint8_t>& trailer)
    {
        std::string bytes(kTestDataOffset, 'x');
        bytes.append(data.begin(), data.end());
        bytes.append(trailer.begin(), trailer.end());
        return bytes;
    }
};
