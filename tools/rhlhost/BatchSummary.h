// What became of each file of a batch, summed up in one line and an exit code.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace host {

// NamedNotRecognised: a file named on the command line that the handler does
// not recognise, counted with the others not recognised and failing the batch.
enum class FileResult { Rendered, NotRecognised, NamedNotRecognised, NotOpened, Vanished, Failed };

struct FileOutcome {
    FileResult result = FileResult::Rendered;
    uint32_t failedRows = 0;
};

// Counts of the outcomes of one batch.
struct Summary {
    size_t files = 0, rendered = 0, withFailedRows = 0, failedRows = 0;
    size_t notRecognised = 0, namedNotRecognised = 0, notOpened = 0, vanished = 0, failed = 0;
};

Summary Summarise(const std::vector<FileOutcome>& outcomes);
// "N files: R rendered (...), F refused (...), W failed to write"
std::string SummaryLine(const Summary& summary);
// Failure when a recognised or named file was not rendered, an output not
// written or a directory not read (problems); rows that failed to decode give
// their own code.
int SummaryExitCode(const Summary& summary, size_t problems);

} // namespace host
