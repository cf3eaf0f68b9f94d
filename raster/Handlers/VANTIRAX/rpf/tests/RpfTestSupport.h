// Shared by the RPF reader tests: a frame written to a temporary file, opened
// and drawn through two CFileReaders as the RPF branch does.
#pragma once

#include "base/FileReader.h"
#include "rpf/RpfFrameReader.h"
#include "tests/fixtures/RpfFrameWriter.h"
#include "tests/fixtures/TempFiles.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

struct OpenedFrame {
    OpenedFrame(const std::string& bytes, uint32_t headerSection) : file(bytes, ".ntf")
    {
        openReader.OpenFile(file.c_str(), kShareDenyWrite);
        opened = reader.Open(openReader, headerSection);
        drawReader.OpenFile(file.c_str(), kShareDenyWrite);
    }
    explicit OpenedFrame(const RpfFrame& frame) : OpenedFrame(frame.bytes, frame.layout.headerSection) {}

    // Columns first..last of a row in a draw of that width; empty when the line fails.
    std::vector<uint8_t> Line(uint32_t row, uint32_t first = 0, uint32_t last = kRpfFrameSide - 1)
    {
        std::vector<uint8_t> line(last - first + 2, 0xEE);
        reader.PrepareDraw(last - first + 1);
        const bool read = reader.ReadLine(drawReader, row, first, last, line.data());
        EXPECT_EQ(line.back(), 0xEE) << "row " << row << ": wrote past column " << last;
        line.pop_back();
        return read ? line : std::vector<uint8_t>();
    }
    // Every row in one draw; empty when a line fails.
    std::vector<uint8_t> All()
    {
        std::vector<uint8_t> pixels(size_t(kRpfFrameSide) * kRpfFrameSide);
        reader.PrepareDraw(kRpfFrameSide);
        for (uint32_t row = 0; row < kRpfFrameSide; ++row)
            if (!reader.ReadLine(drawReader, row, 0, kRpfFrameSide - 1, &pixels[size_t(row) * kRpfFrameSide]))
                return {};
        reader.ReleaseCodeBuffer();
        return pixels;
    }

    TempFile file;
    CFileReader openReader{0}, drawReader{0};
    CRpfFrameReader reader;
    bool opened = false;
};
