#pragma once

#include <memory>
#include <string>
#include <utility>

namespace cvagent::shell {

constexpr std::size_t kChunk = 65536;       ///< bytes that are read at a time
constexpr std::size_t kToolsBuffer = 4096;  ///< bytes that a tool prints to a pipe at a time

/// Bytes that are asked for: a stage of a pipeline reads the one before it, and nothing is read that nobody
/// asked for.
class Source {
public:
    Source() = default;
    Source(const Source&) = delete;
    Source& operator=(const Source&) = delete;
    virtual ~Source() = default;

    /// Appends the next bytes, at least one. Waits until there are some.
    /// @return false at the end
    virtual bool pull(std::string& out) = 0;
    /// Whether the tool it stands for prints to a pipe when its buffer is full, or at its end.
    virtual bool printsInBlocks() const { return false; }
    /// Whether it ended because it could not be read further.
    virtual bool failed() const { return false; }
    /// The stage's exit status, once its end was reached.
    virtual int status() const { return 0; }
};

/// A stage that reads another one.
class Filter : public Source {
public:
    void readFrom(std::unique_ptr<Source> from) { from_ = std::move(from); }

protected:
    Source& from() { return *from_; }

private:
    std::unique_ptr<Source> from_;
};

/// A text that is known from the start.
class TextSource : public Source {
public:
    explicit TextSource(std::string text, int status = 0) : text_(std::move(text)), status_(status) {}
    bool pull(std::string& out) override {
        out += text_;
        return !std::exchange(text_, {}).empty();
    }
    int status() const override { return status_; }

private:
    std::string text_;
    int status_;
};

}  // namespace cvagent::shell
