#include "BatchSummary.h"

#include "ExitCodes.h"

namespace host {

Summary Summarise(const std::vector<FileOutcome>& outcomes)
{
    Summary s;
    s.files = outcomes.size();
    for (const FileOutcome& outcome : outcomes) {
        switch (outcome.result) {
        case FileResult::Rendered:
            ++s.rendered;
            s.withFailedRows += outcome.failedRows > 0;
            s.failedRows += outcome.failedRows;
            break;
        case FileResult::NamedNotRecognised:
            ++s.namedNotRecognised;
            ++s.notRecognised;
            break;
        case FileResult::NotRecognised:
            ++s.notRecognised;
            break;
        case FileResult::NotOpened:
            ++s.notOpened;
            break;
        case FileResult::Vanished:
            ++s.vanished;
            break;
        case FileResult::Failed:
            ++s.failed;
            break;
        }
    }
    return s;
}

std::string SummaryLine(const Summary& s)
{
    return std::to_string(s.files) + " files: " + std::to_string(s.rendered) + " rendered (" +
           std::to_string(s.withFailedRows) + " with " + std::to_string(s.failedRows) + " undecodable rows), " +
           std::to_string(s.notRecognised + s.notOpened + s.vanished) + " refused (" +
           std::to_string(s.notRecognised) + " not recognised, " + std::to_string(s.notOpened) + " not opened, " +
           std::to_string(s.vanished) + " vanished), " + std::to_string(s.failed) + " failed to write";
}

int SummaryExitCode(const Summary& s, size_t problems)
{
    if (s.notOpened + s.namedNotRecognised + s.vanished + s.failed + problems > 0)
        return kExitRefused;
    return s.failedRows > 0 ? kExitRowsFailed : kExitOk;
}

} // namespace host
