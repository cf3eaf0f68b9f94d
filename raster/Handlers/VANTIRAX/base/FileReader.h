// CFileReader: the one way every subsystem reads an image file. A thin layer
// over the platform's file calls with a running position and two sticky
// flags, so a caller can issue a series of reads and seeks and test once.
#pragma once

#include "base/Limits.h"

#include <cstdint>

constexpr uint32_t kNoFile = 0xFFFFFFFF;        // handle value after a failed open
constexpr uint32_t kShareDenyWrite = 0x20;      // open mode: read access, deny writers
constexpr int32_t kSeekFailed = -1;

enum SeekOrigin : int { kSeekSet = 0, kSeekCurrent = 1, kSeekEnd = 2 };

class CFileReader {
public:
    uint32_t handle = kNoFile;
    int32_t error = 0;        // kSeekFailed once a seek failed; reads and seeks then do nothing
    uint64_t position = 0;    // set by seeks, advanced by reads
    uint8_t endOfFile = 0;    // 1 once a read came up short
    char path[kReaderPathSize] = {};

    CFileReader() = default;
    // The temporary readers of the open and the probe start with handle 0.
    explicit CFileReader(uint32_t initialHandle) : handle(initialHandle) {}
    ~CFileReader();
    CFileReader(const CFileReader&) = delete;
    CFileReader& operator=(const CFileReader&) = delete;

    // Closes a held file (clearing every field), then opens path read-only.
    // A null path or one of kReaderPathSize bytes or more is refused: the
    // handle becomes kNoFile and the path stays empty.
    void OpenFile(const char* filePath, uint32_t shareMode);
    // Reads count bytes into buffer; a short read sets endOfFile.
    void ReadBytes(void* buffer, uint32_t count);
    void SeekTo(int64_t offset, int origin);
    void CloseFile();

    bool HoldsFile() const { return handle != 0 && handle != kNoFile; }
    // True when a read sequence went wrong: no file, a failed seek or a short read.
    bool Failed() const { return !HoldsFile() || error == kSeekFailed || endOfFile != 0; }
    // The size of the held file in bytes, 0 without a file.
    uint64_t FileSize() const;
    // Clears the flags and position, as the end of a draw does.
    void ResetState();
};
