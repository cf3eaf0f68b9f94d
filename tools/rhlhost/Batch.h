// Renders many files on worker threads, one handle per file: every file the
// handler recognises goes to OUTDIR/NAME.tif (or .png), NAME being its path
// relative to the directory it was found in, made unique (UniqueNames) before
// any worker starts, so that no output of the run replaces another. A refused,
// damaged or vanished file is reported and skipped; it never stops the batch.
#pragma once

#include "CommandLine.h"
#include "HandlerLibrary.h"
#include "Render.h"

namespace host {

struct BatchOptions {
    std::vector<std::string> inputs;
    std::string outputDirectory;
    std::string extension = ".tif";
    unsigned jobs = 1;
    RenderOptions render;
    bool verbose = false; // name the files found in folders that the handler does not recognise
};

BatchOptions BatchOptionsFrom(const CommandLine& line);

// Prints a line per problem and a one-line summary on stderr; the exit code.
int RunBatch(const Exports& rh, const BatchOptions& options);

} // namespace host
