#include "agent/shell/pipeline_run.h"

#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <utility>

#include "agent/shell/filters/filters.h"
#include "agent/shell/local_file.h"
#include "hosttools/text.h"

namespace cvagent::shell {

namespace {

constexpr int kBrokenPipe = 128 + SIGPIPE;
constexpr std::size_t kMostInserted = 1UL << 20U;

struct FilterTool {
    std::string_view name;
    std::unique_ptr<Filter> (*make)(Words words, Manner manner);
};
constexpr auto kFilters = std::to_array<FilterTool>({{"awk", makeAwk},
                                                     {"cat", makeCat},
                                                     {"cut", makeCut},
                                                     {"egrep", makeEgrep},
                                                     {"grep", makeGrep},
                                                     {"md5sum", makeMd5sum},
                                                     {"sha1sum", makeSha1sum},
                                                     {"tr", makeTr}});

std::vector<std::string> textsOf(const std::vector<Word>& words) {
    std::vector<std::string> texts;
    std::ranges::transform(words, std::back_inserter(texts), &Word::text);
    return texts;
}

std::unique_ptr<Filter> makeFilter(const Stage& stage, ProgramSearch& programs) {
    const std::vector<std::string> words = textsOf(stage.words);
    const auto* const tool = std::ranges::find(kFilters, words.front(), &FilterTool::name);
    if (tool == kFilters.end()) {
        return nullptr;
    }
    const Program::Kind kind = programs.find(words.front()).kind;
    const bool busybox = kind == Program::busybox;
    // What it says of a write that fails is its own.
    if ((!busybox && kind != Program::known) || (busybox && stage.output)) {
        return nullptr;
    }
    return tool->make(Words(words).subspan(1), {stage.silent, busybox});
}

/// The words that a shell makes of a word with something inserted: divided at blanks.
std::vector<std::string> splitWord(const std::string& text) {
    constexpr std::string_view kSeparators = " \t\n";
    std::vector<std::string> words;
    for (std::size_t at = text.find_first_not_of(kSeparators); at != std::string::npos;) {
        const std::size_t end = std::min(text.find_first_of(kSeparators, at), text.size());
        words.push_back(text.substr(at, end - at));
        at = text.find_first_not_of(kSeparators, end);
    }
    return words;
}

}  // namespace

Outcome PipelineRun::makeFilters(ProgramSearch& programs) {
    for (const Stage& stage : pipeline_->stages) {
        if (stage.silent && !nullDeviceIsThere()) {
            return {Outcome::refused};
        }
        if (&stage == &pipeline_->stages.front()) {
            continue;
        }
        filters_.push_back(makeFilter(stage, programs));
        if (filters_.back() == nullptr) {
            return {Outcome::refused};
        }
    }
    return {};
}

Outcome PipelineRun::openOutput() {
    if (const auto& output = pipeline_->stages.back().output) {
        LocalFile file = openForWriting(output->path, output->append);
        file_ = std::move(file.descriptor);
        return {file_.isOpen() ? Outcome::started : Outcome::refused};
    }
    return {};
}

Outcome PipelineRun::start(const Pipeline& pipeline) {
    pipeline_ = &pipeline;
    // A filter prints into a file or to who reads here, and nowhere else.
    if (standardOutput_ >= 0 && pipeline.stages.size() > 1 && !pipeline.stages.back().output) {
        return {Outcome::refused};
    }
    // These two tell of a write that fails in their own way.
    const Stage& last = pipeline.stages.back();
    if (last.output && (last.words.front().text == "echo" || last.words.front().text == "awk")) {
        return {Outcome::refused};
    }
    ProgramSearch programs;
    if (const Outcome made = makeFilters(programs); made.kind != Outcome::started) {
        return made;
    }
    const Stage& first = pipeline.stages.front();
    if (!first.pattern.empty()) {
        return startPattern(first, programs);
    }
    const auto& words = first.words;
    const auto inserted =
        std::ranges::find_if(words, [](const Word& word) { return word.inserted != nullptr; });
    if (inserted == words.end()) {
        return startFirst(textsOf(words), programs);
    }
    inner_ = std::make_unique<PipelineRun>(command_, -1);
    return inner_->start(*inserted->inserted);
}

Outcome PipelineRun::startFirst(std::vector<std::string> words, ProgramSearch& programs) {
    if (const Outcome opened = openOutput(); opened.kind != Outcome::started) {
        return opened;
    }
    const bool alone = filters_.empty();
    const int output = !alone ? -1 : file_.isOpen() ? file_.get() : standardOutput_;
    const auto& written = pipeline_->stages.back().output;
    // A tool notices, or is killed, that reads what it prints.
    const bool isOwn = written && std::ranges::find(words, written->path) != words.end();
    const bool isRead = !isOwn && (standardOutput_ < 0 || file_.isOpen());
    return take(startFirstStage(
        {std::move(words), pipeline_->stages.front().silent, command_, output, isRead}, programs));
}

/// A shell finds the files, then becomes the tool.
Outcome PipelineRun::startPattern(const Stage& stage, ProgramSearch& programs) {
    const Program program = programs.find(stage.words.front().text);
    // A shell's own echo is not the tool.
    if (program.kind == Program::missing || program.kind == Program::unclear ||
        stage.words.front().text == "echo") {
        return {Outcome::refused};
    }
    const Outcome opened = openOutput();
    return opened.kind != Outcome::started
               ? opened
               : take(startShell({{}, false, command_, -1}, "exec " + stage.pattern));
}

Outcome PipelineRun::startInShell(const Pipeline& pipeline) {
    pipeline_ = &pipeline;
    filters_.clear();
    inner_.reset();
    file_.reset();
    return take(startShell({{}, false, command_, standardOutput_}, pipeline.text));
}

Outcome PipelineRun::take(FirstStage first) {
    if (first.outcome.kind != Outcome::started) {
        return first.outcome;
    }
    last_ = std::move(first.source);
    process_ = first.process;
    filtered_ = !filters_.empty();
    for (auto& filter : std::exchange(filters_, {})) {
        filter->readFrom(std::move(last_));
        last_ = std::move(filter);
    }
    return {};
}

/// Lets the command in backquotes come to its end and starts the stage that was waiting for it.
bool PipelineRun::resolve() {
    if (inner_ == nullptr) {
        return last_ != nullptr;
    }
    std::string printed;
    while (printed.size() < kMostInserted && inner_->pull(printed)) {
    }
    innerEnd_ = inner_->finish(false);
    inner_.reset();
    if (innerEnd_.forced || printed.size() >= kMostInserted) {
        last_ = std::make_unique<TextSource>("", 2);
    } else {
        substitute(printed);
    }
    return last_ != nullptr;
}

void PipelineRun::substitute(const std::string& printed) {
    std::string text = printed;
    std::erase(text, '\0');
    text.erase(text.find_last_not_of('\n') + 1);
    std::vector<std::string> words;
    for (const Word& word : pipeline_->stages.front().words) {
        if (word.inserted == nullptr) {
            words.push_back(word.text);
        } else {
            std::ranges::move(splitWord(word.text + text + word.after), std::back_inserter(words));
        }
    }
    const bool plain = text.find_first_of("*?[\\") == std::string::npos;
    ProgramSearch programs;
    const Outcome outcome = plain ? startFirst(std::move(words), programs) : Outcome{Outcome::refused};
    if (outcome.kind == Outcome::refused) {
        // The tool in backquotes has run and is not run again: a shell gets what it printed.
        filters_.clear();
        file_.reset();
        take(startShell({{}, false, command_, standardOutput_},
                        pipeline_->beforeInserted + "${1}" + pipeline_->behindInserted, text));
    }
}

bool PipelineRun::pull(std::string& out) {
    if (!resolve()) {
        return false;
    }
    if (file_.isOpen()) {
        drainIntoFile();
        return false;
    }
    return last_->pull(out);
}

void PipelineRun::drainIntoFile() {
    std::string chunk;
    while (file_.isOpen() && last_->pull(chunk)) {
        if (!hosttools::writeAll(file_.get(), chunk)) {
            failToWrite(errno);
            file_.reset();
        }
        chunk.clear();
    }
    file_.reset();
}

/// As the tools of GNU say it and end.
void PipelineRun::failToWrite(int error) {
    const Stage& stage = pipeline_->stages.back();
    const bool grep = stage.words.front().text.ends_with("grep");
    writeStatus_ = grep ? 2 : 1;
    if (!stage.silent) {
        hosttools::writeAll(STDERR_FILENO, (grep ? "grep" : stage.words.front().text) +
                                               ": write error: " + std::strerror(error) + '\n');
    }
}

/// A tool that prints learns that nobody reads when it has filled its buffer or ends.
bool PipelineRun::drainUnread() {
    std::string printed;
    while (printed.size() < kToolsBuffer && last_->pull(printed)) {
    }
    return !printed.empty();
}

Child::End PipelineRun::finish(bool unread) {
    const bool runs = resolve();
    if (runs && file_.isOpen()) {
        drainIntoFile();
    }
    const bool alone = process_ != nullptr && !filtered_;
    const bool broken = runs && unread && !alone && drainUnread();
    Child::End end;
    if (process_ != nullptr) {
        end = process_->finish();
    }
    end.forced = end.forced || innerEnd_.forced;
    if (!alone) {
        end.status = broken ? kBrokenPipe : runs ? last_->status() : 2;
    }
    end.status = writeStatus_ != 0 ? writeStatus_ : end.status;
    return end;
}

}  // namespace cvagent::shell
