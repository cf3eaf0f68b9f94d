// Writes samples/sample_cadrg.ntf (or the path given): a CADRG frame of a
// synthetic coast. Every 4 x 4 kernel is one colour, or one colour crossed by
// a graticule line, so the picture needs only a few dozen VQ codes.
#include "tests/fixtures/NitfFileWriter.h"
#include "tests/fixtures/RpfFrameWriter.h"

#include <cmath>
#include <cstdio>
#include <exception>

namespace {

// Entries of the writer's 6 x 6 x 6 colour cube: red * 36 + green * 6 + blue, each 0..5.
constexpr uint8_t Cube(int red, int green, int blue)
{
    return static_cast<uint8_t>(red * 36 + green * 6 + blue);
}

constexpr uint8_t kDeepSea = Cube(0, 2, 5);
constexpr uint8_t kShallowSea = Cube(1, 4, 5);
constexpr uint8_t kCoast = Cube(0, 0, 0);
constexpr uint8_t kBeach = Cube(5, 5, 3);
constexpr uint8_t kLowland = Cube(1, 4, 1);
constexpr uint8_t kHighland = Cube(4, 3, 1);
constexpr uint8_t kTown = Cube(5, 0, 0);
constexpr uint8_t kGraticule = Cube(1, 1, 1);
constexpr int kKernel = 4;
constexpr int kGraticuleSpacing = 128;
constexpr int kSide = static_cast<int>(kRpfFrameSide);

// Kernel row of the coastline under kernel column: land lies below it.
double CoastRow(int kernelColumn)
{
    return 170.0 + 60.0 * std::sin(kernelColumn * 0.021) + 18.0 * std::sin(kernelColumn * 0.093 + 1.0);
}

uint8_t KernelColor(int kernelRow, int kernelColumn)
{
    double depth = kernelRow - CoastRow(kernelColumn); // kernels below the coast
    if (depth < -10)
        return kDeepSea;
    if (depth < -1)
        return kShallowSea;
    if (depth < 0)
        return kCoast;
    if (depth < 2)
        return kBeach;
    const int towns[][2] = {{230, 60}, {260, 200}, {300, 330}, {215, 300}};
    for (const auto& town : towns)
        if (std::abs(kernelRow - town[0]) <= 1 && std::abs(kernelColumn - town[1]) <= 1)
            return kTown;
    bool high = depth > 120 + 25 * std::sin(kernelColumn * 0.05) + 15 * std::cos(kernelRow * 0.07);
    return high ? kHighland : kLowland;
}

std::vector<uint8_t> MapPicture()
{
    std::vector<uint8_t> image(size_t(kSide) * kSide);
    for (int row = 0; row < kSide; ++row) {
        for (int column = 0; column < kSide; ++column) {
            bool onGraticule = row % kGraticuleSpacing == 0 || column % kGraticuleSpacing == 0;
            image[size_t(row) * kSide + column] = onGraticule ? kGraticule : KernelColor(row / kKernel, column / kKernel);
        }
    }
    return image;
}

} // namespace

int main(int argc, char** argv)
{
    const char* path = argc > 1 ? argv[1] : "samples/sample_cadrg.ntf";
    try {
        RpfFramePlan plan;
        plan.indexImage = MapPicture();
        plan.corners.northWestLatitude = plan.corners.northEastLatitude = 36.0;
        plan.corners.southWestLatitude = plan.corners.southEastLatitude = 35.5;
        plan.corners.northWestLongitude = plan.corners.southWestLongitude = -76.0;
        plan.corners.northEastLongitude = plan.corners.southEastLongitude = -75.5;
        WriteFile(path, BuildRpfFrame(plan).bytes);
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "samplegen: %s\n", failure.what());
        return 1;
    }
    std::printf("wrote %s\n", path);
    return 0;
}
