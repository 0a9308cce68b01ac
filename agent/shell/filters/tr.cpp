#include <array>
#include <optional>

#include "agent/shell/filters/filters.h"

namespace cvagent::shell {

namespace {

constexpr std::size_t kLetters = 256;

std::size_t number(char letter) {
    return static_cast<unsigned char>(letter);
}

class Tr : public Filter {
public:
    Tr(std::array<char, kLetters> becomes, std::array<bool, kLetters> squeezed)
        : becomes_(becomes), squeezed_(squeezed) {}

    bool printsInBlocks() const override { return true; }
    bool pull(std::string& out) override {
        const std::size_t before = out.size();
        while (out.size() == before) {
            chunk_.clear();
            if (!from().pull(chunk_)) {
                return false;
            }
            out.resize(before + chunk_.size());
            out.resize(before + translate(out.data() + before));
        }
        return true;
    }

private:
    /// @param to for as many letters as there are in the chunk
    /// @return how many it became
    std::size_t translate(char* to) {
        char* end = to;
        for (const char came : chunk_) {
            const char letter = becomes_[number(came)];
            if (last_ != letter || !squeezed_[number(letter)]) {
                *end++ = letter;
            }
            last_ = letter;
        }
        return static_cast<std::size_t>(end - to);
    }

    std::array<char, kLetters> becomes_;
    std::array<bool, kLetters> squeezed_;
    std::optional<char> last_;
    std::string chunk_;
};

/// The letters of a set: single ones and ranges. Nothing for sets with classes, repeats or escapes.
std::optional<std::string> readSet(const std::string& text) {
    if (text.empty() || text.find('\\') != std::string::npos || text.find("[:") != std::string::npos ||
        text.find("[=") != std::string::npos ||
        (text.find('[') != std::string::npos && text.find('*') != std::string::npos)) {
        return std::nullopt;
    }
    std::string letters;
    for (std::size_t at = 0; at < text.size(); ++at) {
        if (at + 2 >= text.size() || text[at + 1] != '-') {
            letters += text[at];
            continue;
        }
        if (number(text[at]) > number(text[at + 2])) {
            return std::nullopt;
        }
        for (std::size_t letter = number(text[at]); letter <= number(text[at + 2]); ++letter) {
            letters += static_cast<char>(letter);
        }
        at += 2;
    }
    return letters;
}

}  // namespace

std::unique_ptr<Filter> makeTr(Words words, Manner /*manner*/) {
    const bool squeeze = !words.empty() && words.front() == "-s";
    words = words.subspan(squeeze ? 1 : 0);
    if (words.empty() || words.size() > 2 || words.front().starts_with('-') ||
        (words.size() == 1 && !squeeze)) {
        return nullptr;
    }
    const auto from = readSet(words.front());
    const auto to = words.size() == 2 ? readSet(words[1]) : from;
    if (!from || !to) {
        return nullptr;
    }
    std::array<char, kLetters> becomes{};
    std::array<bool, kLetters> squeezed{};
    for (std::size_t letter = 0; letter < kLetters; ++letter) {
        becomes[letter] = static_cast<char>(letter);
    }
    for (std::size_t i = 0; i < from->size(); ++i) {
        // A second set that is too short goes on with its last letter.
        becomes[number((*from)[i])] = i < to->size() ? (*to)[i] : to->back();
    }
    for (const char letter : *to) {
        squeezed[number(letter)] = squeeze;
    }
    return std::make_unique<Tr>(becomes, squeezed);
}

}  // namespace cvagent::shell
