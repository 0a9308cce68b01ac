#pragma once

#include <string>

namespace IC {

/// What the host's administrator noted about its owner: two keys of the asset file in the agent's data
/// directory, which has its slash at the end. Both operations throw what QX::PropertyFile throws. Two writers
/// at the same time are not guarded: the later one wins.
class OwnerData {
public:
    static constexpr wchar_t contact[] = L"Computer.OwnerContact";
    static constexpr wchar_t name[] = L"Computer.OwnerName";

    explicit OwnerData(const char* dataDirectory);

    /// The text of a key, "" when the file lacks the key. Throws when there is no file.
    std::string read(const wchar_t* key) const;
    /// Stores a text under a key, the rest of the file stays; creates the file.
    void write(const wchar_t* key, const std::string& text) const;

private:
    std::string path_;
};

}  // namespace IC
