#pragma once

#include <linux/netlink.h>

#include <string_view>

#include "agent/undo/network_messages.h"

namespace cvagent::undo {

/// Attributes behind a fixed part of one kind.
template <class Fixed>
class Parts {
public:
    explicit Parts(const NetworkMessage& message) : body_(message.body) {}
    Fixed fixed() const { return hosttools::readPlain<Fixed>(body_).value_or(Fixed{}); }
    std::string_view operator[](unsigned type) const {
        return attributeOf(body_, NLMSG_ALIGN(sizeof(Fixed)), type);
    }
    unsigned number(unsigned type) const {
        return hosttools::readPlain<std::uint32_t>((*this)[type]).value_or(0);
    }
    bool has(unsigned type) const { return (*this)[type].data() != nullptr; }

private:
    std::string_view body_;
};

}  // namespace cvagent::undo
