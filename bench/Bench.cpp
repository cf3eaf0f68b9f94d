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

// Whether the benchmark filter selects any benchmark of the case, so that a
// filtered run surveys only the cases it times.
bool Selected(const std::string& name)
{
    const std::string filter = benchmark::GetBenchmarkFilter();
    if (filter.empty() || filter == "all" || filter[0] == '-')
        return true;
    const std::regex pattern(filter);
    for (const char* prefix : {"ours_full/", "gdal_full/", "ours_window/", "gdal_window/", "limit/"})
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
    TableReporter reporter;
    reporter.SetOutputStream(&std::cerr);
    reporter.SetErrorStream(&std::cerr);
    benchmark::RunSpecifiedBenchmarks(&reporter);
    PrintTables(cases);
    benchmark::Shutdown();
    return 0;
}
