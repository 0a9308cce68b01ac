#pragma once

#include <unistd.h>

#include <utility>

namespace hosttools {

/// A descriptor that closes itself.
class Descriptor {
public:
    Descriptor() = default;
    explicit Descriptor(int number) : number_(number) {}
    Descriptor(Descriptor&& other) noexcept : number_(std::exchange(other.number_, -1)) {}
    Descriptor& operator=(Descriptor&& other) noexcept {
        std::swap(number_, other.number_);
        return *this;
    }
    ~Descriptor() { reset(); }

    int get() const { return number_; }
    bool isOpen() const { return number_ >= 0; }
    void reset() {
        if (isOpen()) close(std::exchange(number_, -1));
    }

private:
    int number_ = -1;
};

}  // namespace hosttools
