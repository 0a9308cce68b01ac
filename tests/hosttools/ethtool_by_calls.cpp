// Our ethtool as it is on a kernel without ethtool netlink.
#include <unistd.h>

#include "hosttools/ethtool_calls.h"

int main(int count, char** words) {
    hosttools::Answer answer;
    const int status = hosttools::listLinkByCalls(count > 1 ? words[1] : "", answer);
    hosttools::writeAll(STDOUT_FILENO, answer.out);
    hosttools::writeAll(STDERR_FILENO, answer.errors);
    return status;
}
