#pragma once

#include <stdexcept>

#include "framework/export.h"

namespace IC {

/// A value that cannot be had as the type asked for ("abc" as a number).
class CORVISTA_API ConversionError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
    ~ConversionError() override;
};

}  // namespace IC
