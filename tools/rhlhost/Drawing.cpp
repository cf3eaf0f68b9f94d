#include "Drawing.h"

#include <cstdio>

namespace host {
namespace {

// Replaces the -1 edges by the image's size; false when the window leaves the image.
bool ResolveWindow(const OpenedImage& image, Window& window)
{
    if (window.x1 < 0)
        window.x1 = static_cast<int32_t>(image.width);
    if (window.y1 < 0)
        window.y1 = static_cast<int32_t>(image.height);
    return window.x1 <= int32_t(image.width) && window.y1 <= int32_t(image.height) && window.x1 > window.x0 &&
           window.y1 > window.y0;
}

} // namespace

bool ParseWindow(const char* text, Window& window)
{
    char tail = '\0';
    return std::sscanf(text, "%d,%d,%d,%d%c", &window.x0, &window.y0, &window.x1, &window.y1, &tail) == 4 &&
           window.x0 >= 0 && window.y0 >= 0 && window.x1 > window.x0 && window.y1 > window.y0;
}

OpenFile::OpenFile(const Exports& rh, const std::string& path) : rh_(rh)
{
    int32_t result = rh_.open(handle_.bytes, path.c_str());
    image = ReadOpenedImage(handle_, result);
}

OpenFile::~OpenFile()
{
    rh_.close(handle_.bytes);
}

std::string OpenRefusalWords(const OpenedImage& image)
{
    // Result 1 with a failed status: a file of the handler's format whose kind it does not serve.
    const char* words = image.result == 1 ? "recognised but not served" : "not a file this handler reads";
    return "(result " + std::to_string(image.result) + ", status " + std::to_string(image.status) + "): " + words +
           "; nitfinfo says why";
}

std::string OpenFile::RefusalReason() const
{
    return "the handler could not open it " + OpenRefusalWords(image);
}

WindowDraw::~WindowDraw()
{
    if (started_)
        rh_.endDraw(file_.Handle().bytes);
}

bool WindowDraw::Start(Window window, std::string& message)
{
    if (!ResolveWindow(file_.image, window)) {
        message = "the window lies outside the " + std::to_string(file_.image.width) + " x " +
                  std::to_string(file_.image.height) + " image";
        return false;
    }
    const int32_t rect[4] = {window.x0, window.y0, window.x1, window.y1};
    uint32_t rowWidth = 0;
    if (rh_.startDraw(file_.Handle().bytes, nullptr, rect, 1.0, &rowWidth) != 1) {
        message = "the handler refused to start the draw";
        return false;
    }
    started_ = true;
    x0 = uint32_t(window.x0);
    y0 = uint32_t(window.y0);
    width = rowWidth;
    height = static_cast<uint32_t>(window.y1 - window.y0);
    bytesPerPixel = BytesPerPixel(file_.image.pixelKind);
    return true;
}

const uint8_t* WindowDraw::NextRow()
{
    if (!started_ || nextRow_ >= height)
        return nullptr;
    uint8_t* row = nullptr;
    uint16_t flag = 0;
    if (rh_.getLine(file_.Handle().bytes, y0 + nextRow_++, &row, &flag) == 1 && row != nullptr)
        return row;
    ++failedRows;
    zeros_.assign(RowBytes(), 0);
    return zeros_.data();
}

} // namespace host
