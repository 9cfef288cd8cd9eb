// kelosyslog parse: converts log text to records, printed or stored.

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <system_error>

#include "base/errors.h"
#include "base/files.h"
#include "cli/exit_status.h"
#include "cli/progress_bar.h"
#include "commands/commands.h"
#include "commands/common_options.h"
#include "store/batch_sink.h"

namespace kelo::tool {
namespace {

constexpr const char *kFooter =
    "One log is one line: facility, severity, date, time, seconds since 1970, a number, time-zone offset, "
    "host,\n"
    "address, program and tag, separated by blanks, and the message.\n\n"
    "Examples:\n"
    "  kelosyslog parse messages.txt -o jsonl                 one JSON object per log\n"
    "  zcat old/*.gz | kelosyslog parse --db /srv/old.db -    into a database, created if need be\n"
    "  kelosyslog parse --db /srv/old.db --resume big.txt     go on where the last run ended\n\n"
    "Exit status: 0 logs found, 1 none (or none new), 2 usage or unreadable input, 3 database, 4 output.";

constexpr const char *kStandardInput = "-";

struct Options {
    std::vector<std::string> files;
    std::string db;
    OutputOptions output;
    bool resume = false;
    bool skipIncomplete = false;
    bool verbose = false;
};

class Input {
public:
    // Throws UsageError naming the file.
    explicit Input(const std::string &name)
        : name_(name),
          file_(name == kStandardInput ? dup(STDIN_FILENO) : open(name.c_str(), O_RDONLY | O_CLOEXEC)) {
        if (!file_)
            throw UsageError(name + ": " + std::strerror(errno));
        if (fstat(file_.Get(), &status_) == 0 && S_ISDIR(status_.st_mode))
            throw UsageError(name + ": " + std::strerror(EISDIR));
    }

    int Fd() const { return file_.Get(); }
    // Bytes to read; 0 when unknown.
    uint64_t Size() const { return S_ISREG(status_.st_mode) ? static_cast<uint64_t>(status_.st_size) : 0; }
    // The name under which progress is stored: the same from every folder.
    std::string Source() const {
        return name_ == kStandardInput ? name_ : std::filesystem::canonical(name_).string();
    }

private:
    std::string name_;
    FileHandle file_;
    struct stat status_ {};
};

// Prints records one by one.
class PrintSink : public RecordSink {
public:
    PrintSink(RecordLayout layout, bool mayPage)
        : output_(mayPage), writer_(MakeRecordWriter(std::move(layout))) {
        writer_->Begin(text_);
    }
    void Take(_SYSLOG_LOG_DATA_tag &log) override {
        writer_->Add(log, text_);
        output_.Write(text_);
        text_.clear();
    }
    void Flush() { output_.Flush(); }
    void Finish() {
        writer_->End(text_);
        output_.Write(text_);
        output_.Finish();
    }

private:
    Output output_;
    std::unique_ptr<RecordFormatter> writer_;
    std::string text_;
};

// The default fields: those of the text, without the row id, which it does not have.
RecordLayout MakeParseLayout(const OutputOptions &options) {
    static constexpr RecordField kExtnum = {"extnum", true, 0, 0,
                                            [](const _SYSLOG_LOG_DATA_tag &log, RecordField::Digits &digits) {
                                                return TextOfNumber(log.extnum, digits);
                                            }};
    RecordLayout layout = MakeLayout(options, TableKind::Logs);
    if (layout.fields.empty() && layout.format != OutputFormat::Text) {
        layout.fields = AllFields(TableKind::Logs);
        layout.fields.front() = &kExtnum; // for "id"
    }
    return layout;
}

// Reads the inputs one after the other and keeps common counts.
class ParseRun {
public:
    explicit ParseRun(const Options &options)
        : options_(options), bar_(CheckInputs(options)),
          import_([this](const LineReader &reader,
                         const std::string &reason) { Report(reader.Number(), reason); },
                  options.skipIncomplete) {}

    void Print() {
        PrintSink sink(MakeParseLayout(options_.output), !options_.output.noPager);
        ForEachInput(
            [&](const Input &, BlockReader &blocks, LineReader &lines) { Import(blocks, lines, sink); });
        sink.Finish();
    }

    void Store() {
        LogStore store(options_.db);
        ForEachInput([&](const Input &input, BlockReader &blocks, LineReader &lines) {
            const std::string source = input.Source();
            if (options_.resume)
                SkipStored(store.ProgressGet(source), blocks, lines);
            BatchSink sink(store, blocks, lines, source);
            Import(blocks, lines, sink);
        });
    }

    // The counts on the standard error. Returns the ExitStatus.
    int Finish() {
        const ImportCounts &counts = import_.Counts();
        std::string text = std::to_string(counts.parsed) + " parsed";
        for (const auto &[field, count] : counts.incomplete)
            text += ", " + std::to_string(count) + " of them incomplete (" + field + " is empty)";
        if (counts.tooFewFields > 0)
            text += ", " + std::to_string(counts.tooFewFields) + " rejected (fewer than 11 fields)";
        if (counts.overlong > 0)
            text += ", " + std::to_string(counts.overlong) + " rejected (too long)";
        Say(text);
        return counts.parsed > 0 ? kExitFound : kExitNothing;
    }

private:
    // Finds unreadable files before anything is printed or stored. Returns the size of all inputs, 0 when it
    // is unknown or when a progress bar would be mixed with the records on the terminal.
    static uint64_t CheckInputs(const Options &options) {
        uint64_t total = 0;
        bool isKnown = !options.db.empty() || isatty(STDOUT_FILENO) == 0;
        for (const std::string &file : options.files) {
            const uint64_t size = Input(file).Size();
            isKnown = isKnown && size > 0;
            total += size;
        }
        return isKnown ? total : 0;
    }

    template <typename Work>
    void ForEachInput(Work work) {
        for (const std::string &file : options_.files) {
            file_ = file;
            const Input input(file);
            BlockReader blocks(input.Fd());
            LineReader lines(LogStream::kMaxLineBytes);
            try {
                work(input, blocks, lines);
            } catch (const std::system_error &error) {
                throw UsageError(file + ": " + error.code().message());
            }
        }
        bar_.Clear();
    }

    // All lines of the input. Where it pauses nothing that was taken waits for more.
    template <typename Sink>
    void Import(BlockReader &blocks, LineReader &lines, Sink &sink) {
        for (bool hasEnded = false; !hasEnded;) {
            if (!blocks.HasInput())
                sink.Flush();
            const std::string_view bytes = blocks.Read();
            bar_.Add(bytes.size());
            hasEnded = bytes.empty();
            if (hasEnded)
                lines.End();
            lines.Feed(bytes);
            import_.Run(lines, sink);
        }
        sink.Flush();
    }

    void SkipStored(const std::optional<StoreProgress> &stored, BlockReader &blocks, LineReader &lines) {
        if (!stored)
            return;
        blocks.ReadHead(stored->head.size());
        if (!blocks.Head().starts_with(stored->head)) {
            Say(file_ + ": begins differently than when it was stored, so it is read from its start");
            return;
        }
        if (!blocks.Skip(stored->offset))
            throw UsageError(file_ + ": shorter than the " + std::to_string(stored->offset) +
                             " bytes that were stored of it");
        lines.StartAt(stored->offset, stored->lines);
        bar_.Add(stored->offset);
    }

    void Report(uint64_t line, const std::string &reason) {
        if (options_.verbose)
            Say(file_ + ":" + std::to_string(line) + ": " + reason);
    }

    void Say(const std::string &text) {
        bar_.Clear();
        PrintMessage(text);
    }

    const Options &options_;
    ProgressBar bar_;
    LogImport import_;
    std::string file_;
};

int Run(Options options, bool hasDb) {
    if (options.files.empty())
        options.files = {kStandardInput};
    if (std::count(options.files.begin(), options.files.end(), kStandardInput) > 1)
        throw UsageError("FILE: '-' can be read only once");
    if (hasDb && options.db.empty())
        throw UsageError("--db: an empty path");
    RequireDatabase(options.db, "parse --db");
    ApplyUtc(options.output.inUtc);
    ParseRun run(options);
    if (hasDb)
        run.Store();
    else
        run.Print();
    return run.Finish();
}

} // namespace

void AddParse(Program &program) {
    auto options = std::make_shared<Options>();
    Command command = AddSubcommand(program, "parse", "Turn log text into logs, printed or stored", nullptr);
    command.Footer(kFooter);
    command.AddTexts("FILE", options->files, "FILE", "Files of log text; '-' or none: the standard input")
        .AnyNumber();
    AddOutputOptions(command, options->output);
    const std::string group = "How to store";
    Option db = command
                    .AddText("--db", options->db, "PATH",
                             "Store into table logs of this database, which is created when missing")
                    .Group(group)
                    .Excludes("--output");
    command
        .AddFlag("--resume", options->resume,
                 "Go on behind what earlier runs stored of the same input, each log once")
        .Group(group)
        .Needs(db);
    command.AddFlag("--skip-incomplete", options->skipIncomplete,
                    "Leave out logs without a message or another mandatory field");
    command.AddFlag("-v,--verbose", options->verbose,
                    "Name every line that is rejected or incomplete, with the reason");
    command.WhenChosen(
        [options, db, &program] { program.run = [options, db] { return Run(*options, db.IsGiven()); }; });
}

} // namespace kelo::tool
