// Renders one file, or a window of it, to a GeoTIFF, a PNG or the raw rows,
// each row written as it arrives, through a temporary name so that a failure
// leaves no output behind.
#pragma once

#include "Drawing.h"

#include <string>

namespace host {

enum class OutputFormat { GeoTiff, Png, Raw };

// ".tif" / ".tiff": GeoTIFF, ".png": PNG, ".raw": the rows (any case); false for other names.
bool FormatFromName(const std::string& output, OutputFormat& format);

struct RenderOptions {
    Window window;
    bool overviews = true;  // GeoTIFF: internal overviews when large (--no-overviews: none)
    bool worldFile = false; // PNG: the NAME.pgw world file beside it (--world-file)
};

// False with a message when an option does not go with the format.
bool OptionsFitFormat(OutputFormat format, const RenderOptions& options, std::string& message);

enum class RenderStatus {
    Rendered, // written; some rows may have failed to decode
    Refused,  // the handler did not open the file, or the window does not fit
    Failed,   // the output could not be written
};

struct RenderOutcome {
    RenderStatus status = RenderStatus::Rendered;
    std::string message;   // why, when not rendered
    std::string warning;   // something the user should know about a rendered file
    uint32_t failedRows = 0; // written as zeros
};

RenderOutcome RenderFile(const Exports& rh, const std::string& input, const std::string& output,
                         OutputFormat format, const RenderOptions& options);

} // namespace host
