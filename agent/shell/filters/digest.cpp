#include "agent/shell/filters/digest.h"

#include <bit>
#include <cmath>

#include "agent/shell/filters/filters.h"

namespace cvagent::shell {

namespace {

constexpr unsigned kByteBits = 8;
constexpr std::size_t kWordBytes = 4;
constexpr std::size_t kMd5Rounds = 64;
constexpr std::size_t kSha1Rounds = 80;

/// The numbers of RFC 1321: the sines of 1 to 64, as integers.
const std::array<std::uint32_t, kMd5Rounds>& sines() {
    static const auto table = [] {
        std::array<std::uint32_t, kMd5Rounds> made{};
        for (std::size_t i = 0; i < made.size(); ++i) {
            made[i] =
                static_cast<std::uint32_t>(std::fabs(std::sin(static_cast<double>(i + 1))) * 4294967296.0);
        }
        return made;
    }();
    return table;
}

constexpr std::array<std::array<int, 4>, 4> kMd5Turns{
    {{7, 12, 17, 22}, {5, 9, 14, 20}, {4, 11, 16, 23}, {6, 10, 15, 21}}};

std::uint32_t mix(std::size_t round, std::uint32_t x, std::uint32_t y, std::uint32_t z) {
    switch (round) {
        case 0:
            return (x & y) | (~x & z);
        case 1:
            return (x & z) | (y & ~z);
        case 2:
            return x ^ y ^ z;
        default:
            return y ^ (x | ~z);
    }
}

std::size_t md5Place(std::size_t step) {
    constexpr std::array<std::size_t, 4> kFactor{1, 5, 3, 7};
    constexpr std::array<std::size_t, 4> kOffset{0, 1, 5, 0};
    const std::size_t round = step / 16;
    return (kFactor[round] * step + kOffset[round]) % 16;
}

struct Sha1Round {
    std::uint32_t constant;
    std::uint32_t (*mix)(std::uint32_t, std::uint32_t, std::uint32_t);
};

constexpr std::array<Sha1Round, 4> kSha1{{
    {0x5a827999, [](std::uint32_t x, std::uint32_t y, std::uint32_t z) { return (x & y) | (~x & z); }},
    {0x6ed9eba1, [](std::uint32_t x, std::uint32_t y, std::uint32_t z) { return x ^ y ^ z; }},
    {0x8f1bbcdc,
     [](std::uint32_t x, std::uint32_t y, std::uint32_t z) { return (x & y) | (x & z) | (y & z); }},
    {0xca62c1d6, [](std::uint32_t x, std::uint32_t y, std::uint32_t z) { return x ^ y ^ z; }},
}};

class Sum : public Filter {
public:
    explicit Sum(Digest::Kind kind) : digest_(kind) {}

    bool pull(std::string& out) override {
        if (done_) {
            return false;
        }
        for (std::string chunk; from().pull(chunk); chunk.clear()) {
            digest_.add(chunk);
        }
        done_ = true;
        out += digest_.finish() + "  -\n";
        return true;
    }

private:
    Digest digest_;
    bool done_ = false;
};

}  // namespace

Digest::Digest(Kind kind) : kind_(kind), state_{0x67452301, 0xefcdab89, 0x98badcfe, 0x10325476} {
    if (kind_ == sha1) {
        state_.push_back(0xc3d2e1f0);
    }
}

void Digest::addByte(unsigned char byte) {
    block_[used_++] = byte;
    if (used_ == kBlock) {
        used_ = 0;
        work(block_);
    }
}

void Digest::add(std::string_view bytes) {
    bytes_ += bytes.size();
    for (const char byte : bytes) {
        addByte(static_cast<unsigned char>(byte));
    }
}

std::string Digest::finish() {
    constexpr unsigned char kMark = 0x80;
    constexpr std::size_t kLengthBytes = 8;
    const std::uint64_t bits = bytes_ * kByteBits;
    addByte(kMark);
    while (used_ != kBlock - kLengthBytes) {
        addByte(0);
    }
    for (std::size_t i = 0; i < kLengthBytes; ++i) {
        const std::size_t place = kind_ == md5 ? i : kLengthBytes - 1 - i;
        addByte(static_cast<unsigned char>(bits >> (kByteBits * place)));
    }
    std::string digits;
    for (const std::uint32_t word : state_) {
        for (std::size_t i = 0; i < kWordBytes; ++i) {
            const std::size_t place = kind_ == md5 ? i : kWordBytes - 1 - i;
            const auto byte = static_cast<unsigned char>(word >> (kByteBits * place));
            digits += "0123456789abcdef"[byte >> 4U];
            digits += "0123456789abcdef"[byte & 15U];
        }
    }
    return digits;
}

void Digest::work(const Block& block) {
    kind_ == md5 ? workMd5(block) : workSha1(block);
}

void Digest::workMd5(const Block& block) {
    std::array<std::uint32_t, 16> words{};
    for (std::size_t i = 0; i < kBlock; ++i) {
        words[i / kWordBytes] |= std::uint32_t{block[i]} << (kByteBits * (i % kWordBytes));
    }
    std::uint32_t a = state_[0];
    std::uint32_t b = state_[1];
    std::uint32_t c = state_[2];
    std::uint32_t d = state_[3];
    for (std::size_t step = 0; step < kMd5Rounds; ++step) {
        const std::uint32_t sum = a + mix(step / 16, b, c, d) + words[md5Place(step)] + sines()[step];
        a = d;
        d = c;
        c = b;
        b += std::rotl(sum, kMd5Turns[step / 16][step % 4]);
    }
    state_[0] += a;
    state_[1] += b;
    state_[2] += c;
    state_[3] += d;
}

void Digest::workSha1(const Block& block) {
    constexpr std::size_t kRound = 20;
    std::array<std::uint32_t, kSha1Rounds> words{};
    for (std::size_t i = 0; i < kBlock; ++i) {
        words[i / kWordBytes] |= std::uint32_t{block[i]} << (kByteBits * (kWordBytes - 1 - i % kWordBytes));
    }
    for (std::size_t i = 16; i < kSha1Rounds; ++i) {
        words[i] = std::rotl(words[i - 3] ^ words[i - 8] ^ words[i - 14] ^ words[i - 16], 1);
    }
    std::array<std::uint32_t, 5> now{state_[0], state_[1], state_[2], state_[3], state_[4]};
    for (std::size_t i = 0; i < kSha1Rounds; ++i) {
        const Sha1Round& round = kSha1[i / kRound];
        const std::uint32_t sum =
            std::rotl(now[0], 5) + round.mix(now[1], now[2], now[3]) + now[4] + round.constant + words[i];
        now = {sum, now[0], std::rotl(now[1], 30), now[2], now[3]};
    }
    for (std::size_t i = 0; i < state_.size(); ++i) {
        state_[i] += now[i];
    }
}

std::unique_ptr<Filter> makeMd5sum(Words words, Manner /*manner*/) {
    return words.empty() ? std::make_unique<Sum>(Digest::md5) : nullptr;
}

std::unique_ptr<Filter> makeSha1sum(Words words, Manner /*manner*/) {
    return words.empty() ? std::make_unique<Sum>(Digest::sha1) : nullptr;
}

}  // namespace cvagent::shell
