#include "rpf/tests/RpfTestSupport.h"

#include "tests/fixtures/NitfFileWriter.h"

#include <cstdio>
#include <cstdlib>
#include <stdexcept>
#include <unistd.h>

TempFile::TempFile(const std::string& bytes, const std::string& suffix)
{
    std::string pattern = "/tmp/vx_rpf_XXXXXX" + suffix;
    std::vector<char> name(pattern.begin(), pattern.end());
    name.push_back('\0');
    int descriptor = mkstemps(name.data(), static_cast<int>(suffix.size()));
    if (descriptor < 0)
        throw std::runtime_error("cannot create a temporary file");
    close(descriptor);
    path_ = name.data();
    WriteFile(path_, bytes);
}

TempFile::~TempFile()
{
    std::remove(path_.c_str());
}

std::unique_ptr<OpenedFrame> OpenFrame(const std::string& bytes, uint32_t headerSection)
{
    auto frame = std::make_unique<OpenedFrame>();
    frame->file = std::make_unique<TempFile>(bytes);
    frame->openReader.OpenFile(frame->file->Path().c_str(), kShareDenyWrite);
    frame->opened = frame->reader.Open(frame->openReader, headerSection);
    frame->drawReader.OpenFile(frame->file->Path().c_str(), kShareDenyWrite);
    return frame;
}

std::unique_ptr<OpenedFrame> OpenFrame(const RpfFrame& frame)
{
    return OpenFrame(frame.bytes, frame.layout.headerSection);
}

std::vector<uint8_t> DecodeWholeFrame(OpenedFrame& frame)
{
    std::vector<uint8_t> pixels(size_t(kRpfFrameSide) * kRpfFrameSide);
    frame.reader.PrepareDraw(kRpfFrameSide);
    for (uint32_t row = 0; row < kRpfFrameSide; ++row)
        if (!frame.reader.ReadLine(frame.drawReader, row, 0, kRpfFrameSide - 1, &pixels[size_t(row) * kRpfFrameSide]))
            return {};
    frame.reader.ReleaseCodeBuffer();
    return pixels;
}

RpfFrame BuildTestFrame(RpfProduct product, bool bigEndian, std::set<uint32_t> masked)
{
    RpfFramePlan plan;
    plan.product = product;
    plan.bigEndian = bigEndian;
    plan.maskedSubframes = std::move(masked);
    return BuildRpfFrame(plan);
}
