// Shared by the RPF reader tests: frames written to temporary files and
// opened through a CFileReader, and whole-frame decoding.
#pragma once

#include "base/FileReader.h"
#include "rpf/RpfFrameReader.h"
#include "tests/fixtures/RpfFrameWriter.h"

#include <cstdint>
#include <memory>
#include <set>
#include <string>
#include <vector>

// A file that is removed when the object goes.
class TempFile {
public:
    explicit TempFile(const std::string& bytes, const std::string& suffix = ".ntf");
    ~TempFile();
    TempFile(const TempFile&) = delete;
    TempFile& operator=(const TempFile&) = delete;
    const std::string& Path() const { return path_; }

private:
    std::string path_;
};

// A frame on disk with a frame reader opened on it and a draw reader.
struct OpenedFrame {
    std::unique_ptr<TempFile> file;
    CFileReader openReader{0};
    CFileReader drawReader{0};
    CRpfFrameReader reader;
    bool opened = false;
};

// Writes bytes and opens the frame whose header section is at headerSection.
std::unique_ptr<OpenedFrame> OpenFrame(const std::string& bytes, uint32_t headerSection);
std::unique_ptr<OpenedFrame> OpenFrame(const RpfFrame& frame);
// Every row of the frame, full width, in one draw; empty when a line fails.
std::vector<uint8_t> DecodeWholeFrame(OpenedFrame& frame);
// A frame of the pattern image with the given subframes masked.
RpfFrame BuildTestFrame(RpfProduct product, bool bigEndian, std::set<uint32_t> masked = {});
