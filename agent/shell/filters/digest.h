#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace cvagent::shell {

/// MD5 or SHA-1 of bytes that come in pieces. Fingerprints that notice a change, no protection from anybody.
class Digest {
public:
    enum Kind { md5, sha1 };

    explicit Digest(Kind kind);
    void add(std::string_view bytes);
    /// Ends the sum. @return lower-case hexadecimal digits
    std::string finish();

private:
    static constexpr std::size_t kBlock = 64;
    using Block = std::array<unsigned char, kBlock>;

    void work(const Block& block);
    void workMd5(const Block& block);
    void workSha1(const Block& block);
    void addByte(unsigned char byte);

    Kind kind_;
    std::vector<std::uint32_t> state_;
    Block block_{};
    std::size_t used_ = 0;
    std::uint64_t bytes_ = 0;
};

}  // namespace cvagent::shell
