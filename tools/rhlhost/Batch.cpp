#include "Batch.h"

#include "BatchSummary.h"
#include "ExitCodes.h"
#include "FileWalk.h"
#include "OutputFile.h"
#include "Progress.h"
#include "Render.h"

#include <atomic>
#include <cstdio>
#include <filesystem>
#include <thread>
#include <unistd.h>

namespace host {
namespace {

namespace fs = std::filesystem;

bool Exists(const std::string& path)
{
    std::error_code error;
    return fs::exists(path, error);
}

class Batch {
public:
    Batch(const Exports& rh, const BatchOptions& options, std::vector<InputFile> files)
        : rh_(rh), options_(options), files_(std::move(files)), names_(UniqueNames(files_)),
          outcomes_(files_.size()), progress_(files_.size())
    {
    }

    void Run()
    {
        std::vector<std::thread> workers;
        for (unsigned i = 0; i < options_.jobs; ++i)
            workers.emplace_back([this] { Work(); });
        for (std::thread& worker : workers)
            worker.join();
        progress_.Finish();
    }

    Progress& Reporter() { return progress_; }
    const std::vector<FileOutcome>& Outcomes() const { return outcomes_; }

private:
    void Work()
    {
        for (size_t i = next_++; i < files_.size(); i = next_++) {
            outcomes_[i] = Process(files_[i], names_[i]);
            progress_.Advance();
        }
    }

    FileOutcome Process(const InputFile& file, const std::string& name)
    {
        if (rh_.isFormat(file.path.c_str()) != 1) {
            if (!Exists(file.path))
                return Vanished(file);
            if (!file.named) {
                if (options_.verbose)
                    progress_.Report(file.path + ": not a file this handler reads (left out)");
                return {FileResult::NotRecognised, 0};
            }
            progress_.Report(file.path + ": the handler does not recognise it (nitfinfo says why)");
            return {FileResult::NamedNotRecognised, 0};
        }
        const fs::path output = fs::path(options_.outputDirectory) / (name + options_.extension);
        std::error_code error;
        fs::create_directories(output.parent_path(), error);
        if (error) {
            progress_.Report("cannot create the directory " + output.parent_path().string() + ": " + error.message());
            return {FileResult::Failed, 0};
        }
        return Rendered(file, name, RenderFile(rh_, file.path, output.string(), format_, options_.render));
    }

    FileOutcome Rendered(const InputFile& file, const std::string& name, const RenderOutcome& outcome)
    {
        if (!outcome.warning.empty())
            progress_.Report(file.path + ": " + outcome.warning);
        if (outcome.status == RenderStatus::Failed) {
            progress_.Report(outcome.message);
            return {FileResult::Failed, 0};
        }
        if (outcome.status == RenderStatus::Refused) {
            if (!Exists(file.path))
                return Vanished(file);
            progress_.Report(file.path + ": " + outcome.message);
            return {FileResult::NotOpened, 0};
        }
        if (name != file.name)
            progress_.Report(file.path + ": written as " + name + options_.extension + ", " + file.name +
                             options_.extension + " being another input's");
        if (outcome.failedRows > 0)
            progress_.Report(file.path + ": " + std::to_string(outcome.failedRows) +
                             " rows could not be decoded (written as zeros)");
        return {FileResult::Rendered, outcome.failedRows};
    }

    FileOutcome Vanished(const InputFile& file)
    {
        progress_.Report(file.path + ": the file no longer exists");
        return {FileResult::Vanished, 0};
    }

    const Exports& rh_;
    const BatchOptions& options_;
    const std::vector<InputFile> files_;
    const std::vector<std::string> names_; // unique output names
    std::vector<FileOutcome> outcomes_;
    Progress progress_;
    const OutputFormat format_ = options_.extension == ".png" ? OutputFormat::Png : OutputFormat::GeoTiff;
    std::atomic<size_t> next_{0};
};

} // namespace

BatchOptions BatchOptionsFrom(const CommandLine& line)
{
    BatchOptions options;
    options.inputs = line.positional;
    options.outputDirectory = line.output;
    options.extension = "." + line.format;
    options.jobs = line.jobs;
    options.render = {line.window, line.overviews, line.worldFile};
    options.verbose = line.verbose;
    return options;
}

int RunBatch(const Exports& rh, const BatchOptions& options)
{
    std::error_code error;
    fs::create_directories(options.outputDirectory, error);
    if (error)
        return Fail(kExitRefused, "cannot create " + options.outputDirectory + ": " + error.message());
    if (access(options.outputDirectory.c_str(), W_OK) != 0)
        return Fail(kExitRefused, CannotWrite(options.outputDirectory));
    std::vector<std::string> problems;
    Batch batch(rh, options, CollectInputs(options.inputs, problems));
    for (const std::string& problem : problems)
        batch.Reporter().Report(problem);
    batch.Run();
    const Summary summary = Summarise(batch.Outcomes());
    std::fprintf(stderr, "rhlhost: %s\n", SummaryLine(summary).c_str());
    return SummaryExitCode(summary, problems.size());
}

} // namespace host
