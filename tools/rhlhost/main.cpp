// rhlhost: a stand-in for the host application. It loads a handler file at
// run time and drives it only through its seven exports.
//
//   rhlhost [--handler PATH] identify
//   rhlhost [--handler PATH] probe FILE...
//   rhlhost [--handler PATH] info FILE
//   rhlhost [--handler PATH] dump FILE OUT.raw [--window X0,Y0,X1,Y1]
//   rhlhost [--handler PATH] render FILE OUT.png [--window X0,Y0,X1,Y1]
#include "HandlerLibrary.h"
#include "PngWriter.h"

#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

using namespace host;

namespace {

constexpr int kExitOk = 0;
constexpr int kExitRefused = 1;
constexpr int kExitUsage = 2;
constexpr int kExitRowsFailed = 3;

int Fail(int code, const std::string& message)
{
    std::fprintf(stderr, "rhlhost: %s\n", message.c_str());
    return code;
}

// The directory of this executable, where the handler is built beside it.
std::string DefaultHandlerPath(const char* argv0)
{
    std::string self = argv0;
    size_t slash = self.rfind('/');
    std::string directory = slash == std::string::npos ? "." : self.substr(0, slash);
    return directory + "/" VX_DEFAULT_HANDLER;
}

std::string JsonString(const char* text)
{
    std::string quoted = "\"";
    for (const char* c = text; *c != '\0'; ++c) {
        if (*c == '"' || *c == '\\')
            quoted += '\\';
        quoted += *c;
    }
    return quoted + "\"";
}

int Identify(const Exports& rh)
{
    alignas(8) char identity[kIdentitySize] = {};
    rh.identify(identity);
    uint16_t version;
    uint16_t extensionCount;
    std::memcpy(&version, identity, 2);
    std::memcpy(&extensionCount, identity + 1026, 2);
    std::string extensions;
    for (uint16_t i = 0; i < extensionCount && i < 100; ++i) {
        char slot[11] = {};
        std::memcpy(slot, identity + 1028 + 10 * i, 10);
        extensions += (i ? ", " : "") + JsonString(slot);
    }
    identity[2 + 511] = identity[514 + 511] = '\0';
    std::printf("{\"version\": %u, \"name\": %s, \"description\": %s, \"extensions\": [%s]}\n", version,
                JsonString(identity + 2).c_str(), JsonString(identity + 514).c_str(), extensions.c_str());
    return kExitOk;
}

int Probe(const Exports& rh, int count, char** files)
{
    for (int i = 0; i < count; ++i)
        std::printf("%d %s\n", rh.isFormat(files[i]), files[i]);
    return kExitOk;
}

void PrintInfo(const OpenedImage& image)
{
    std::printf("{\"result\": %d, \"status\": %u, \"width\": %u, \"height\": %u, \"pixelKind\": %u, \"palette\": ",
                image.result, image.status, image.width, image.height, image.pixelKind);
    if (!image.hasPalette) {
        std::printf("null");
    } else {
        std::printf("[");
        for (size_t i = 0; i + 2 < image.palette.size(); i += 3)
            std::printf("%s[%u, %u, %u]", i ? ", " : "", image.palette[i], image.palette[i + 1], image.palette[i + 2]);
        std::printf("]");
    }
    std::printf(", \"georef\": ");
    if (!image.hasGeoRef) {
        std::printf("null");
    } else {
        std::printf("{\"epsg\": %u, \"points\": [", image.epsg);
        for (size_t i = 0; i < image.points.size(); ++i) {
            const ControlPoint& p = image.points[i];
            std::printf("%s[%.17g, %.17g, %.17g, %.17g]", i ? ", " : "", p.column, p.row, p.x, p.y);
        }
        std::printf("]}");
    }
    std::printf("}\n");
}

// An open image, closed again when this object goes away.
class OpenFile {
public:
    OpenFile(const Exports& rh, const char* path) : rh_(rh)
    {
        int32_t result = rh_.open(handle_.bytes, path);
        image = ReadOpenedImage(handle_, result);
    }
    ~OpenFile() { rh_.close(handle_.bytes); }
    bool Ready() const { return image.result == 1 && image.status == 0; }
    HandleRecord& Handle() { return handle_; }

    OpenedImage image;

private:
    const Exports& rh_;
    HandleRecord handle_;
};

int Info(const Exports& rh, const char* path)
{
    OpenFile file(rh, path);
    PrintInfo(file.image);
    return file.Ready() ? kExitOk : kExitRefused;
}

struct Window {
    int32_t x0 = 0, y0 = 0, x1 = -1, y1 = -1; // x1, y1 exclusive; -1: the image's edge
};

bool ParseWindow(const char* text, Window& window)
{
    char tail = '\0';
    return std::sscanf(text, "%d,%d,%d,%d%c", &window.x0, &window.y0, &window.x1, &window.y1, &tail) == 4 &&
           window.x0 >= 0 && window.y0 >= 0 && window.x1 > window.x0 && window.y1 > window.y0;
}

struct Pixels {
    uint32_t width = 0, height = 0;
    size_t bytesPerPixel = 1;
    std::vector<uint8_t> bytes;
    uint32_t failedRows = 0;
};

// Draws the window row by row exactly as RH_GetLine delivers it; rows that fail stay zero.
bool DrawWindow(const Exports& rh, OpenFile& file, Window window, Pixels& pixels, std::string& message)
{
    if (window.x1 < 0)
        window.x1 = static_cast<int32_t>(file.image.width);
    if (window.y1 < 0)
        window.y1 = static_cast<int32_t>(file.image.height);
    if (window.x1 > int32_t(file.image.width) || window.y1 > int32_t(file.image.height) || window.x1 <= window.x0 ||
        window.y1 <= window.y0) {
        message = "the window lies outside the image";
        return false;
    }
    const int32_t rect[4] = {window.x0, window.y0, window.x1, window.y1};
    uint32_t rowWidth = 0;
    if (rh.startDraw(file.Handle().bytes, nullptr, rect, 1.0, &rowWidth) != 1) {
        message = "the handler refused to start the draw";
        return false;
    }
    pixels.width = rowWidth;
    pixels.height = static_cast<uint32_t>(window.y1 - window.y0);
    pixels.bytesPerPixel = BytesPerPixel(file.image.pixelKind);
    const size_t rowBytes = size_t(rowWidth) * pixels.bytesPerPixel;
    pixels.bytes.assign(rowBytes * pixels.height, 0);
    for (uint32_t i = 0; i < pixels.height; ++i) {
        uint8_t* row = nullptr;
        uint16_t flag = 0;
        if (rh.getLine(file.Handle().bytes, uint32_t(window.y0) + i, &row, &flag) == 1 && row != nullptr)
            std::memcpy(pixels.bytes.data() + i * rowBytes, row, rowBytes);
        else
            ++pixels.failedRows;
    }
    rh.endDraw(file.Handle().bytes);
    return true;
}

// Expands palette indices to RGB (or keeps grey / RGB rows as they are).
unsigned ToDisplay(const OpenedImage& image, const Pixels& pixels, std::vector<uint8_t>& display)
{
    if (pixels.bytesPerPixel == 3 || image.palette.empty()) {
        display = pixels.bytes;
        return static_cast<unsigned>(pixels.bytesPerPixel);
    }
    const size_t entries = image.palette.size() / 3;
    display.resize(pixels.bytes.size() * 3);
    for (size_t i = 0; i < pixels.bytes.size(); ++i) {
        size_t index = pixels.bytes[i] < entries ? pixels.bytes[i] : 0;
        std::memcpy(&display[i * 3], &image.palette[index * 3], 3);
    }
    return 3;
}

int Draw(const Exports& rh, const char* path, const char* output, const Window& window, bool asPng)
{
    OpenFile file(rh, path);
    if (!file.Ready())
        return Fail(kExitRefused, std::string(path) + ": refused by the handler (result " +
                                      std::to_string(file.image.result) + ", status " +
                                      std::to_string(file.image.status) + ")");
    Pixels pixels;
    std::string message;
    if (!DrawWindow(rh, file, window, pixels, message))
        return Fail(kExitRefused, std::string(path) + ": " + message);
    if (asPng) {
        std::vector<uint8_t> display;
        unsigned channels = ToDisplay(file.image, pixels, display);
        if (!WritePng(output, pixels.width, pixels.height, channels, display, message))
            return Fail(kExitRefused, message);
    } else {
        FILE* out = std::fopen(output, "wb");
        if (out == nullptr)
            return Fail(kExitRefused, std::string("cannot write ") + output);
        bool written = std::fwrite(pixels.bytes.data(), 1, pixels.bytes.size(), out) == pixels.bytes.size();
        if (std::fclose(out) != 0 || !written)
            return Fail(kExitRefused, std::string("cannot write ") + output);
    }
    if (pixels.failedRows > 0)
        return Fail(kExitRowsFailed, std::string(path) + ": " + std::to_string(pixels.failedRows) +
                                         " rows could not be decoded (written as zeros)");
    return kExitOk;
}

int Usage()
{
    return Fail(kExitUsage, "usage: rhlhost [--handler PATH] identify | probe FILE... | info FILE | "
                            "dump FILE OUT.raw [--window X0,Y0,X1,Y1] | render FILE OUT.png [--window X0,Y0,X1,Y1]");
}

} // namespace

int main(int argc, char** argv)
{
    std::string handlerPath = DefaultHandlerPath(argv[0]);
    int next = 1;
    if (next + 1 < argc && std::strcmp(argv[next], "--handler") == 0) {
        handlerPath = argv[next + 1];
        next += 2;
    }
    if (next >= argc)
        return Usage();
    const std::string command = argv[next++];
    std::vector<char*> args(argv + next, argv + argc);

    Exports rh{};
    std::string message;
    if (!LoadHandler(handlerPath, rh, message))
        return Fail(kExitUsage, message);

    if (command == "identify" && args.empty())
        return Identify(rh);
    if (command == "probe" && !args.empty())
        return Probe(rh, static_cast<int>(args.size()), args.data());
    if (command == "info" && args.size() == 1)
        return Info(rh, args[0]);
    if ((command == "dump" || command == "render") && (args.size() == 2 || args.size() == 4)) {
        Window window;
        if (args.size() == 4 && (std::strcmp(args[2], "--window") != 0 || !ParseWindow(args[3], window)))
            return Fail(kExitUsage, "--window takes X0,Y0,X1,Y1 with X1 > X0 and Y1 > Y0");
        return Draw(rh, args[0], args[1], window, command == "render");
    }
    return Usage();
}
