#include "Mosaic.h"

#include "ExitCodes.h"
#include "MosaicCanvas.h"

#include <cstdio>

namespace host {

int RunMosaic(const Exports& rh, const std::vector<std::string>& inputs, const std::string& output, bool overviews)
{
    std::vector<std::string> problems;
    MosaicFrames collected = CollectFrames(rh, CollectInputs(inputs, problems));
    MosaicGrid grid;
    std::string message;
    const bool planned = !collected.frames.empty() && PlanGrid(collected, grid, message);
    for (const std::string& problem : problems)
        Fail(kExitRefused, problem);
    for (const std::string& refusal : collected.refusals)
        Fail(kExitRefused, refusal);
    if (collected.frames.empty())
        return Fail(kExitRefused, "no frame to place in the mosaic");
    if (!planned)
        return Fail(kExitRefused, message);
    uint32_t failedRows = 0;
    if (!WriteMosaic(rh, collected, grid, output, overviews, failedRows, message))
        return Fail(kExitRefused, message);
    std::fprintf(stderr, "rhlhost: %s: %zu frames on %u x %u pixels, %zu refused, %zu not recognised\n",
                 output.c_str(), collected.frames.size(), grid.width, grid.height, collected.refusals.size(),
                 collected.notRecognised);
    if (!collected.refusals.empty() || !problems.empty())
        return kExitRefused;
    return failedRows > 0 ? kExitRowsFailed : kExitOk;
}

} // namespace host
