// Times the library through its exports against GDAL reading the same pixels
// and against the physical limit of each file, then prints both comparisons
// as markdown tables (the benchmark's own report goes to the error stream).
#include "bench/BenchFiles.h"
#include "bench/JpegLimit.h"
#include "tests/fixtures/HandlerLoader.h"

#include <benchmark/benchmark.h>
#include <gdal.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <fcntl.h>
#include <iostream>
#include <map>
#include <memory>
#include <regex>
#include <sys/stat.h>
#include <unistd.h>

namespace {

constexpr int32_t kWindowSize = 512;
constexpr int32_t kWindowSkew = 3; // keeps the window off block and subframe borders
constexpr int kDefaultRepetitions = 5;
constexpr double kMinTimeSeconds = 0.2;
constexpr int kLargeJpegSize = 16384;      // the image whose open the memory figure measures
constexpr int kLargeJpegBlockSize = 1024;
constexpr int32_t kLargeDrawRows = 2048;
constexpr int kLargeRepetitions = 3;
constexpr size_t kLargeDistinctStreams = 8;   // as BenchFiles writes them

struct Window {
    int32_t x0, y0, x1, y1;
    int32_t Width() const { return x1 - x0; }
    int32_t Height() const { return y1 - y0; }
};

struct CaseGeometry {
    Window full;
    Window window;
};

Window CentreWindow(int32_t width, int32_t height)
{
    const int32_t w = std::min(kWindowSize, width), h = std::min(kWindowSize, height);
    const int32_t x0 = std::clamp((width - w) / 2 + kWindowSkew, 0, width - w);
    const int32_t y0 = std::clamp((height - h) / 2 + kWindowSkew, 0, height - h);
    return {x0, y0, x0 + w, y0 + h};
}

// Opens, draws the window row by row and closes, through the exports. Rows
// are copied into pixels when it is given. False when any step fails.
bool DrawOurs(const HandlerExports& rh, const std::string& path, const Window& window,
              std::vector<uint8_t>* pixels)
{
    RHHandle handle {};
    if (rh.open(&handle, path.c_str()) != 1)
        return false;
    const int32_t rect[4] = {window.x0, window.y0, window.x1, window.y1};
    uint32_t rowWidth = 0;
    bool ok = rh.startDraw(&handle, nullptr, rect, 1.0, &rowWidth) == 1;
    const size_t rowBytes = size_t(rowWidth) * (handle.pixelKind == kPixelDirect ? 3 : 1);
    for (int32_t row = window.y0; ok && row < window.y1; ++row) {
        uint8_t* address = nullptr;
        uint16_t flag = 0;
        ok = rh.getLine(&handle, uint32_t(row), &address, &flag) == 1;
        benchmark::DoNotOptimize(address);
        if (ok && pixels != nullptr)
            pixels->insert(pixels->end(), address, address + rowBytes);
    }
    ok = rh.endDraw(&handle) == 1 && ok;
    rh.close(&handle);
    return ok;
}

// GDALOpen and one RasterIO of the window, every band, pixel-interleaved.
bool ReadGdal(const std::string& path, const Window& window, std::vector<uint8_t>& pixels, int& sampleBytes)
{
    GDALDatasetH dataset = GDALOpen(path.c_str(), GA_ReadOnly);
    if (dataset == nullptr)
        return false;
    const int bands = GDALGetRasterCount(dataset);
    const GDALDataType type = GDALGetRasterDataType(GDALGetRasterBand(dataset, 1));
    sampleBytes = GDALGetDataTypeSizeBytes(type);
    const int pixelBytes = bands * sampleBytes;
    pixels.resize(size_t(window.Width()) * window.Height() * pixelBytes);
    const CPLErr result = GDALDatasetRasterIO(dataset, GF_Read, window.x0, window.y0, window.Width(),
                                              window.Height(), pixels.data(), window.Width(), window.Height(),
                                              type, bands, nullptr, pixelBytes, pixelBytes * window.Width(),
                                              sampleBytes);
    GDALClose(dataset);
    return result == CE_None;
}

bool ReadWholeFile(const std::string& path, std::vector<uint8_t>& bytes)
{
    const int descriptor = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (descriptor < 0)
        return false;
    struct stat info {};
    bool ok = ::fstat(descriptor, &info) == 0;
    bytes.resize(ok ? size_t(info.st_size) : 0);
    size_t done = 0;
    while (ok && done < bytes.size()) {
        const ssize_t got = ::pread(descriptor, bytes.data() + done, bytes.size() - done, off_t(done));
        ok = got > 0;
        done += ok ? size_t(got) : 0;
    }
    ::close(descriptor);
    return ok;
}

// How our rows compare with GDAL's: identical bytes, or for 16-bit samples
// our 8 most significant bits of each.
std::string CompareWithGdal(const std::vector<uint8_t>& ours, const std::vector<uint8_t>& gdal, int sampleBytes)
{
    if (sampleBytes == 2 && gdal.size() == ours.size() * 2) {
        for (size_t i = 0; i < ours.size(); ++i)
            if (ours[i] != uint8_t((gdal[2 * i] | gdal[2 * i + 1] << 8) >> 8))
                return "differs";
        return "top 8 bits";
    }
    if (ours.size() != gdal.size())
        return "sizes differ";
    if (ours == gdal)
        return "identical";
    // GDAL gives a bi-level image's bits as 0 and 1; we give a set bit as black.
    for (size_t i = 0; i < ours.size(); ++i)
        if (gdal[i] > 1 || ours[i] != (gdal[i] != 0 ? 0 : 255))
            return "differs";
    return "same bits";
}

struct Results {
    std::map<std::string, double> median; // milliseconds, by benchmark name
    std::map<std::string, double> cv;     // coefficient of variation, by name
    std::map<std::string, std::string> agreement;
    std::map<std::string, std::string> limitKind;
};

Results results;

class TableReporter : public benchmark::ConsoleReporter {
public:
    void ReportRuns(const std::vector<Run>& runs) override
    {
        for (const Run& run : runs) {
            // A single repetition has no aggregates: its one run stands as the median.
            if (run.aggregate_name == "median" || run.aggregate_name.empty())
                results.median[run.run_name.function_name] = run.GetAdjustedRealTime();
            if (run.aggregate_name == "cv")
                results.cv[run.run_name.function_name] = run.real_accumulated_time; // a fraction, not a time
        }
        ConsoleReporter::ReportRuns(runs);
    }
};

void Configure(benchmark::internal::Benchmark* bench, int repetitions)
{
    bench->Unit(benchmark::kMillisecond)->UseRealTime()->MinTime(kMinTimeSeconds)->Repetitions(repetitions);
    bench->ReportAggregatesOnly(true);
}

void RegisterCase(const HandlerExports& rh, const BenchCase& item, const CaseGeometry& geometry, int repetitions)
{
    for (const auto& [label, window] : {std::pair{"full", geometry.full}, std::pair{"window", geometry.window}}) {
        const Window area = window;
        Configure(benchmark::RegisterBenchmark(("ours_" + std::string(label) + "/" + item.name).c_str(),
                                               [&rh, item, area](benchmark::State& state) {
                                                   for (auto _ : state)
                                                       if (!DrawOurs(rh, item.path, area, nullptr))
                                                           state.SkipWithError("draw failed");
                                               }),
                  repetitions);
        Configure(benchmark::RegisterBenchmark(("gdal_" + std::string(label) + "/" + item.name).c_str(),
                                               [item, area](benchmark::State& state) {
                                                   std::vector<uint8_t> pixels;
                                                   int sampleBytes = 0;
                                                   for (auto _ : state)
                                                       if (!ReadGdal(item.path, area, pixels, sampleBytes))
                                                           state.SkipWithError("GDAL read failed");
                                               }),
                  repetitions);
    }
    std::vector<uint8_t> file;
    std::vector<JpegStream> streams;
    if (item.jpeg && ReadWholeFile(item.path, file))
        streams = FindJpegStreams(file);
    results.limitKind[item.name] = item.jpeg ? "pread + libjpeg-turbo (" + std::to_string(streams.size()) +
                                                   " streams)"
                                             : "pread";
    Configure(benchmark::RegisterBenchmark(("limit/" + item.name).c_str(),
                                           [item, streams](benchmark::State& state) {
                                               // One read first, so that the timed reads land in
                                               // memory that is already mapped.
                                               std::vector<uint8_t> bytes, pixels;
                                               ReadWholeFile(item.path, bytes);
                                               for (auto _ : state) {
                                                   if (!ReadWholeFile(item.path, bytes) ||
                                                       !DecodeJpegStreams(bytes, streams, pixels))
                                                       state.SkipWithError("limit read failed");
                                                   benchmark::DoNotOptimize(bytes.data());
                                               }
                                           }),
              repetitions);
}

// Draws each case once both ways to size the windows and check that both
// libraries deliver the same pixels; false when either cannot read it.
bool Survey(const HandlerExports& rh, const BenchCase& item, CaseGeometry& geometry)
{
    RHHandle handle {};
    const bool opened = rh.open(&handle, item.path.c_str()) == 1;
    const int32_t width = int32_t(handle.width), height = int32_t(handle.height);
    rh.close(&handle);
    if (!opened) {
        std::cerr << item.name << ": our open failed, case skipped\n";
        return false;
    }
    geometry.full = {0, 0, width, height};
    geometry.window = CentreWindow(width, height);
    std::vector<uint8_t> ours, gdal;
    int sampleBytes = 0;
    const bool drawn = DrawOurs(rh, item.path, geometry.full, &ours);
    if (!ReadGdal(item.path, geometry.full, gdal, sampleBytes)) {
        std::cerr << item.name << ": GDAL cannot read it, case skipped\n";
        return false;
    }
    results.agreement[item.name] = drawn ? CompareWithGdal(ours, gdal, sampleBytes) : "our draw failed";
    return drawn;
}

std::string Format(double value, int decimals)
{
    char text[32];
    std::snprintf(text, sizeof text, "%.*f", decimals, value);
    return text;
}

std::string Milliseconds(const std::string& name)
{
    auto found = results.median.find(name);
    return found == results.median.end() ? "-" : Format(found->second, 2);
}

std::string Ratio(const std::string& numerator, const std::string& denominator)
{
    auto top = results.median.find(numerator), bottom = results.median.find(denominator);
    if (top == results.median.end() || bottom == results.median.end() || bottom->second <= 0)
        return "-";
    return Format(top->second / bottom->second, 2) + "x";
}

// Whether the run timed the case (a filter may have left it out).
bool Measured(const std::string& name)
{
    return results.median.count("ours_full/" + name) + results.median.count("gdal_full/" + name) +
               results.median.count("limit/" + name) >
           0;
}

void PrintTables(const std::vector<BenchCase>& cases)
{
    std::cout << "\n### Ours against GDAL (median ms; ratio = GDAL / ours, above 1 means we are faster)\n\n"
              << "| case | ours full | GDAL full | ratio | ours 512x512 | GDAL 512x512 | ratio | pixels |\n"
              << "|---|---:|---:|---:|---:|---:|---:|---|\n";
    for (const BenchCase& item : cases) {
        if (!Measured(item.name))
            continue;
        const std::string& n = item.name;
        std::cout << "| " << n << " | " << Milliseconds("ours_full/" + n) << " | " << Milliseconds("gdal_full/" + n)
                  << " | " << Ratio("gdal_full/" + n, "ours_full/" + n) << " | " << Milliseconds("ours_window/" + n)
                  << " | " << Milliseconds("gdal_window/" + n) << " | "
                  << Ratio("gdal_window/" + n, "ours_window/" + n) << " | " << results.agreement[n] << " |\n";
    }
    std::cout << "\n### Ours against the limit (median ms; ratio = ours / limit, 1 is the floor)\n\n"
              << "| case | ours full | limit | ratio | limit is |\n|---|---:|---:|---:|---|\n";
    double worstCv = 0;
    for (const auto& [name, cv] : results.cv)
        worstCv = std::max(worstCv, cv);
    for (const BenchCase& item : cases) {
        if (!Measured(item.name))
            continue;
        const std::string& n = item.name;
        std::cout << "| " << n << " | " << Milliseconds("ours_full/" + n) << " | " << Milliseconds("limit/" + n)
                  << " | " << Ratio("ours_full/" + n, "limit/" + n) << " | " << results.limitKind[n] << " |\n";
    }
    std::cout << "\nNoise: the largest coefficient of variation over the repetitions was " << Format(worstCv * 100, 1)
              << "%.\n";
}

// Real-sized images: the open alone, then draws that touch a small part of
// them, each beside GDAL and, where one exists, the limit.
struct LargeStep {
    std::string label;
    Window window;
};

std::vector<LargeStep> LargeSteps(const LargeCase& item, int32_t width, int32_t height)
{
    const int32_t x0 = width - kWindowSize - kWindowSkew, y0 = height - kWindowSize - kWindowSkew;
    std::vector<LargeStep> steps{{"open", {0, 0, 0, 0}}, {"window near the end", {x0, y0, x0 + kWindowSize,
                                                                                     y0 + kWindowSize}}};
    if (item.jpeg || item.blockSide == 0) // compressed: rows from the top, as a viewer's first screen
        steps.push_back({"2048 full-width rows", {0, 0, width, kLargeDrawRows}});
    else
        steps.push_back({"last row", {0, height - 1, width, height}});
    return steps;
}

bool OpenOurs(const HandlerExports& rh, const std::string& path)
{
    RHHandle handle {};
    const bool opened = rh.open(&handle, path.c_str()) == 1;
    rh.close(&handle);
    return opened;
}

bool OpenGdal(const std::string& path)
{
    GDALDatasetH dataset = GDALOpen(path.c_str(), GA_ReadOnly);
    if (dataset != nullptr)
        GDALClose(dataset);
    return dataset != nullptr;
}

// The limit of an uncompressed MONO window: pread of each of its rows' bytes
// in each block it crosses (IMODE B, one band, 8-bit samples).
bool PreadWindow(int descriptor, uint64_t dataOffset, int blockSide, int32_t width, const Window& window,
                 std::vector<uint8_t>& bytes)
{
    const uint64_t blocksPerRow = (uint64_t(width) + blockSide - 1) / blockSide, side = uint64_t(blockSide);
    bytes.resize(size_t(window.Width()));
    for (int32_t row = window.y0; row < window.y1; ++row)
        for (int32_t x = window.x0; x < window.x1;) {
            const uint64_t block = uint64_t(row) / side * blocksPerRow + uint64_t(x) / side;
            const int32_t count = std::min<int32_t>(window.x1 - x, blockSide - x % blockSide);
            const uint64_t at = dataOffset + (block * side + uint64_t(row) % side) * side + uint64_t(x) % side;
            if (::pread(descriptor, bytes.data() + (x - window.x0), size_t(count), off_t(at)) != count)
                return false;
            x += count;
        }
    return true;
}

// The streams of a JPEG window's blocks, held in memory: its limit is their
// decoding alone. The image's blocks repeat its first kLargeDistinctStreams
// streams in turn, so a block's stream is found among those.
std::vector<uint8_t> WindowStreams(const LargeCase& item, int32_t width, const Window& window,
                                   std::vector<JpegStream>& streams)
{
    std::vector<uint8_t> file, held;
    if (!ReadWholeFile(item.path, file))
        return held;
    const std::vector<JpegStream> found = FindJpegStreams(file, kLargeDistinctStreams);
    const int32_t side = item.blockSide, perRow = width / side;
    for (int32_t by = window.y0 / side; by <= (window.y1 - 1) / side && !found.empty(); ++by)
        for (int32_t bx = window.x0 / side; bx <= (window.x1 - 1) / side; ++bx) {
            const JpegStream& stream = found[size_t(by * perRow + bx) % found.size()];
            streams.push_back({held.size(), stream.length});
            held.insert(held.end(), file.begin() + long(stream.offset),
                        file.begin() + long(stream.offset + stream.length));
        }
    return held;
}

void RegisterLimit(const LargeCase& item, const std::string& name, int32_t width, const Window& window)
{
    if (item.jpeg) {
        auto streams = std::make_shared<std::vector<JpegStream>>();
        auto held = std::make_shared<std::vector<uint8_t>>(WindowStreams(item, width, window, *streams));
        results.limitKind[name] = "libjpeg-turbo (" + std::to_string(streams->size()) + " streams in memory)";
        Configure(benchmark::RegisterBenchmark(("limit/" + name).c_str(),
                                               [held, streams](benchmark::State& state) {
                                                   std::vector<uint8_t> pixels;
                                                   for (auto _ : state)
                                                       if (!DecodeJpegStreams(*held, *streams, pixels))
                                                           state.SkipWithError("decode failed");
                                               }),
                  1);
        return;
    }
    struct stat info {};
    const uint64_t dataBytes = uint64_t((width + item.blockSide - 1) / item.blockSide) *
                               uint64_t((width + item.blockSide - 1) / item.blockSide) * item.blockSide *
                               item.blockSide;
    if (::stat(item.path.c_str(), &info) != 0 || uint64_t(info.st_size) < dataBytes)
        return;
    const uint64_t dataOffset = uint64_t(info.st_size) - dataBytes;
    results.limitKind[name] = "pread of the rows' bytes";
    Configure(benchmark::RegisterBenchmark(("limit/" + name).c_str(),
                                           [item, dataOffset, width, window](benchmark::State& state) {
                                               const int descriptor = ::open(item.path.c_str(), O_RDONLY);
                                               std::vector<uint8_t> bytes;
                                               for (auto _ : state)
                                                   if (!PreadWindow(descriptor, dataOffset, item.blockSide, width,
                                                                    window, bytes))
                                                       state.SkipWithError("read failed");
                                               ::close(descriptor);
                                           }),
              1);
}

std::vector<std::string> largeNames; // "case: step", in order

void RegisterLargeCase(const HandlerExports& rh, const LargeCase& item)
{
    RHHandle handle {};
    const bool opened = rh.open(&handle, item.path.c_str()) == 1;
    const int32_t width = int32_t(handle.width), height = int32_t(handle.height);
    rh.close(&handle);
    if (!opened) {
        std::cerr << item.name << ": our open failed, case skipped\n";
        return;
    }
    for (const LargeStep& step : LargeSteps(item, width, height)) {
        const std::string name = item.name + ": " + step.label;
        const Window window = step.window;
        const bool openOnly = step.label == "open";
        largeNames.push_back(name);
        Configure(benchmark::RegisterBenchmark(("ours/" + name).c_str(),
                                               [&rh, item, window, openOnly](benchmark::State& state) {
                                                   for (auto _ : state)
                                                       if (!(openOnly ? OpenOurs(rh, item.path)
                                                                      : DrawOurs(rh, item.path, window, nullptr)))
                                                           state.SkipWithError("failed");
                                               }),
                  kLargeRepetitions);
        Configure(benchmark::RegisterBenchmark(("gdal/" + name).c_str(),
                                               [item, window, openOnly](benchmark::State& state) {
                                                   std::vector<uint8_t> pixels;
                                                   int sampleBytes = 0;
                                                   for (auto _ : state)
                                                       if (!(openOnly ? OpenGdal(item.path)
                                                                      : ReadGdal(item.path, window, pixels,
                                                                                 sampleBytes)))
                                                           state.SkipWithError("GDAL failed");
                                               }),
                  kLargeRepetitions);
        if (!openOnly && item.blockSide != 0) // a JPEG 2000 image's limit would be OpenJPEG's, as GDAL's is
            RegisterLimit(item, name, width, window);
    }
}

void PrintLargeTable()
{
    if (largeNames.empty())
        return;
    std::cout << "\n### Real-sized images (median ms; GDAL / ours above 1 means we are faster; ours / limit, 1 is "
                 "the floor)\n\n| case: step | ours | GDAL | GDAL / ours | limit | ours / limit | limit is |\n"
              << "|---|---:|---:|---:|---:|---:|---|\n";
    for (const std::string& n : largeNames)
        std::cout << "| " << n << " | " << Milliseconds("ours/" + n) << " | " << Milliseconds("gdal/" + n) << " | "
                  << Ratio("gdal/" + n, "ours/" + n) << " | " << Milliseconds("limit/" + n) << " | "
                  << Ratio("ours/" + n, "limit/" + n) << " | " << results.limitKind[n] << " |\n";
}

// Whether the benchmark filter selects any benchmark of the case, so that a
// filtered run surveys only the cases it times.
bool Selected(const std::string& name)
{
    const std::string filter = benchmark::GetBenchmarkFilter();
    if (filter.empty() || filter == "all" || filter[0] == '-')
        return true;
    const std::regex pattern(filter);
    for (const char* prefix : {"ours_full/", "gdal_full/", "ours_window/", "gdal_window/", "limit/", "ours/", "gdal/"})
        if (std::regex_search(prefix + name + "/", pattern))
            return true;
    return false;
}

int Repetitions()
{
    const char* text = std::getenv("VX_BENCH_REPETITIONS");
    const int value = text != nullptr ? std::atoi(text) : 0;
    return value > 0 ? value : kDefaultRepetitions;
}

} // namespace

int main(int argc, char** argv)
{
    benchmark::Initialize(&argc, argv);
    GDALAllRegister();
    if (argc == 3 && std::string(argv[1]) == "--write-large-jpeg")
        return WriteJpegImage(argv[2], kLargeJpegSize, kLargeJpegBlockSize) ? 0 : 1;
    if (argc != 3) {
        std::cerr << "usage: vx_bench [benchmark flags] DATA_DIR CORPUS_DIR\n"
                     "       vx_bench --write-large-jpeg PATH\n";
        return 2;
    }
    const HandlerExports& rh = LoadHandler(VX_HANDLER_PATH);
    const std::vector<BenchCase> cases = PrepareCases(argv[1], argv[2]);
    for (const BenchCase& item : cases) {
        CaseGeometry geometry {};
        if (Selected(item.name) && Survey(rh, item, geometry))
            RegisterCase(rh, item, geometry, Repetitions());
    }
    for (const LargeCase& item : PrepareLargeCases(argv[1]))
        if (Selected(item.name))
            RegisterLargeCase(rh, item);
    TableReporter reporter;
    reporter.SetOutputStream(&std::cerr);
    reporter.SetErrorStream(&std::cerr);
    benchmark::RunSpecifiedBenchmarks(&reporter);
    PrintTables(cases);
    PrintLargeTable();
    benchmark::Shutdown();
    return 0;
}
