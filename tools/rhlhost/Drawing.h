// Opening a file through the handler and drawing a window of it row by row,
// exactly as RH_GetLine delivers the rows.
#pragma once

#include "HandlerLibrary.h"

#include <cstdint>
#include <string>
#include <vector>

namespace host {

// A window of the image; x1 and y1 are exclusive, -1 stands for the image's edge.
struct Window {
    int32_t x0 = 0, y0 = 0, x1 = -1, y1 = -1;
};

// "X0,Y0,X1,Y1" with X1 > X0 >= 0 and Y1 > Y0 >= 0.
bool ParseWindow(const char* text, Window& window);

// What RH_Open's result and status say in words, and where to learn why:
// "(result 1, status 5): recognised but not served; nitfinfo says why".
std::string OpenRefusalWords(const OpenedImage& image);

// An open image, closed again when this object goes away.
class OpenFile {
public:
    OpenFile(const Exports& rh, const std::string& path);
    ~OpenFile();
    OpenFile(const OpenFile&) = delete;
    OpenFile& operator=(const OpenFile&) = delete;

    // RH_Open succeeded: result 1 and status 0.
    bool Ready() const { return image.result == 1 && image.status == 0; }
    // Why the open failed, for messages.
    std::string RefusalReason() const;
    HandleRecord& Handle() { return handle_; }

    OpenedImage image;

private:
    const Exports& rh_;
    HandleRecord handle_;
};

// A draw of a window, its rows taken one at a time from the top, never the
// whole window at once; RH_EndDraw when it goes away.
class WindowDraw {
public:
    WindowDraw(const Exports& rh, OpenFile& file) : rh_(rh), file_(file) {}
    ~WindowDraw();
    WindowDraw(const WindowDraw&) = delete;
    WindowDraw& operator=(const WindowDraw&) = delete;

    // False with a message when the window leaves the image or the handler refuses it.
    bool Start(Window window, std::string& message);
    // The next row as delivered (valid until the next call), or zeros when it
    // failed to decode; null past the last row.
    const uint8_t* NextRow();
    size_t RowBytes() const { return size_t(width) * bytesPerPixel; }

    uint32_t x0 = 0, y0 = 0; // the window's place in the image
    uint32_t width = 0, height = 0;
    size_t bytesPerPixel = 1;
    uint32_t failedRows = 0;

private:
    const Exports& rh_;
    OpenFile& file_;
    bool started_ = false;
    uint32_t nextRow_ = 0;
    std::vector<uint8_t> zeros_; // a failed row
};

} // namespace host
