#pragma once

#include <array>
#include <string>
#include <string_view>

#include "hosttools/text.h"

namespace hosttools {

/// What the kernel answers to one question about a link, over ethtool netlink.
struct LinkReply {
    int error = 0;           ///< an error number, or 0
    std::string complaint;   ///< the kernel's own words for an error, when it has some
    unsigned offset = 0;     ///< of the request's part that it complains of; 0: none
    std::string attributes;  ///< ETHTOOL_A_..., the header with the device among them
};

/// The questions about a link, in the order in which their answers are listed.
enum LinkQuestion { linkModes, linkInfo, wakeOnLan, messageLevel, linkState, linkQuestions };
using LinkReplies = std::array<LinkReply, linkQuestions>;

/// Asks the kernel about a link. @param name any of its names
/// @return false where the kernel has no ethtool netlink
bool askLink(std::string_view name, LinkReplies& replies);

/// What is said of the errors among the answers. A question that a driver has no answer to is none.
Text complaintsOf(const LinkReplies& replies);

}  // namespace hosttools
