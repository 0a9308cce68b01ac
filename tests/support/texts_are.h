#pragma once

#include <gmock/gmock.h>

#include <string>
#include <vector>

/// Matches exactly these texts in this order. What testing::ElementsAre could do as well, but that is
/// compiled anew for every number of texts, which was a third of the time to compile a test.
template <class... Texts>
auto TextsAre(const Texts&... texts) {
    return testing::ElementsAreArray(std::vector<std::string>{texts...});
}
