#include "base/FileReader.h"

#include "base/FileCalls.h"

#include <cstring>

CFileReader::~CFileReader()
{
    CloseFile();
}

void CFileReader::OpenFile(const char* filePath, uint32_t shareMode)
{
    if (HoldsFile()) {
        CloseFile();
        handle = 0;
        ResetState();
    }
    std::memset(path, 0, sizeof path);
    handle = kNoFile;
    if (filePath == nullptr || std::strlen(filePath) >= kReaderPathSize)
        return;
    handle = filecalls::Open(filePath, shareMode);
    if (HoldsFile())
        std::memcpy(path, filePath, std::strlen(filePath) + 1);
}

void CFileReader::ReadBytes(void* buffer, uint32_t count)
{
    if (!HoldsFile() || error == kSeekFailed)
        return;
    uint32_t done = filecalls::Read(handle, buffer, count);
    if (done != count)
        endOfFile = 1;
    position += done;
}

void CFileReader::SeekTo(int64_t offset, int origin)
{
    if (!HoldsFile() || error == kSeekFailed)
        return;
    filecalls::SeekOutcome outcome = filecalls::Seek(handle, offset, origin);
    if (outcome.failed) {
        error = kSeekFailed;
        position = UINT64_MAX;
        if (outcome.endOfFile)
            endOfFile = 1;
        return;
    }
    position = outcome.position;
}

void CFileReader::CloseFile()
{
    if (!HoldsFile())
        return;
    filecalls::Close(handle);
    handle = 0;
}

uint64_t CFileReader::FileSize() const
{
    return HoldsFile() ? filecalls::Size(handle) : 0;
}

void CFileReader::ResetState()
{
    error = 0;
    position = 0;
    endOfFile = 0;
}
