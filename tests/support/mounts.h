#pragma once

#include <string>

namespace fake_host {

/// A detached copy of a mounted tree (or of a single file), to be attached elsewhere.
class Tree {
public:
    explicit Tree(const std::string& path);
    ~Tree();
    Tree(Tree&& other) noexcept;
    Tree& operator=(Tree&&) = delete;

    bool isDirectory() const;
    void makeReadOnly();
    void attach(const std::string& place);

private:
    std::string path_;
    int handle_;
};

}  // namespace fake_host
