#pragma once

#include <string>

namespace IC {

/// Gives the running system a host and a domain name (`hostname`), and rewrites the host's entry in
/// /etc/hosts and the whole of /etc/HOSTNAME. Line
/// breaks at the end of a name are cut. With a name that could be more than a name to the shell the command
/// is refused, before any file is touched. A step that fails is logged at level 6000 and ends the operation;
/// what was done before stays done.
/// @param domainName may be empty: the command then takes the host name alone, the files "host."
/// @param operation  only logged
/// @param ipAddress  the address of the entry; empty: 127.0.0.2. Every line of /etc/hosts that contains
///                   it, or 127.0.0.2, anywhere gives way to the new entry at the end
void executeDomainandHostnameChanges(std::string hostName, std::string domainName, bool operation,
                                     std::string ipAddress);

}  // namespace IC
