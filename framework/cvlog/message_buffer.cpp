#include "framework/cvlog/message_buffer.h"

#include <streambuf>

namespace CVLog {

struct CVMessageBuffer::Stream {
    /// Writes straight into a string, so that text and stream output keep their order.
    class Appender : public std::streambuf {
    public:
        explicit Appender(std::string& text) : text_(text) {}

    protected:
        int_type overflow(int_type character) override {
            if (!traits_type::eq_int_type(character, traits_type::eof())) {
                text_ += traits_type::to_char_type(character);
            }
            return traits_type::not_eof(character);
        }
        std::streamsize xsputn(const char* characters, std::streamsize count) override {
            text_.append(characters, static_cast<std::size_t>(count));
            return count;
        }

    private:
        std::string& text_;
    };

    // The classic locale: a log line reads the same whatever the agent has set.
    explicit Stream(std::string& text) : appender(text), stream(&appender) {
        stream.imbue(std::locale::classic());
    }
    Appender appender;
    std::ostream stream;
};

CVMessageBuffer::CVMessageBuffer() = default;
CVMessageBuffer::~CVMessageBuffer() = default;

CVMessageBuffer& CVMessageBuffer::operator<<(const char* text) {
    text_ += text != nullptr ? text : "(null)";
    return *this;
}

CVMessageBuffer& CVMessageBuffer::operator<<(char* text) {
    const char* const constant = text;
    return *this << constant;
}

CVMessageBuffer& CVMessageBuffer::operator<<(const std::string& text) {
    text_ += text;
    return *this;
}

CVMessageBuffer& CVMessageBuffer::operator<<(unsigned int number) {
    text_ += std::to_string(number);
    return *this;
}

CVMessageBuffer& CVMessageBuffer::operator<<(int number) {
    text_ += std::to_string(number);
    return *this;
}

CVMessageBuffer& CVMessageBuffer::operator<<(bool flag) {
    text_ += flag ? '1' : '0';
    return *this;
}

CVMessageBuffer::operator std::ostream&() {
    if (!stream_) {
        stream_ = std::make_unique<Stream>(text_);
    }
    return stream_->stream;
}

}  // namespace CVLog
