// What a pass tells the agent: one alert for each interface whose state is not what it was.
#include "indications/contained.h"
#include "indications/globals.h"
#include "indications/network_monitor.h"

namespace IC {

namespace {

void mark(MutableNode& node, unsigned int state) {
    node.setStatus(1);
    node.setProperty(LinkState::stateProperty, PropertyValue(Number(state), true));
}

void sendAlert(const NodeTree& tree, const Alert& alert) {
    const auto receiver = tree.alertHandler();
    if (receiver.first == nullptr) {
        return;
    }
    // An alert that went wrong is not sent again, and the next interface's goes out.
    contained([&] {
        const auto [handler, context] = receiver;
        Error result = OSHWMI_IND::myerr;
        result = handler({alert}, context);
        if (isLeftBehind()) {
            return;
        }
        logInd(kProgress) << "checkAndSendNetAlert: _alerthandler return code" << result;
    });
}

void tell(const NodeTree& tree, const Compared& change) {
    const auto node = tree.findNetworkPort(change.name);  // held, should it be withdrawn meanwhile
    if (!node) {
        return;
    }
    logInd(kProgress) << "OsHwMI::checkAndSendNetAlert() entering switch case";
    if (change.kind == nullptr) {
        logInd(kProgress) << "Unknown status: curitr->first= " << change.name;
        return;
    }
    if (change.kind->marksNode) {
        mark(*node, change.state);
    }
    const AlertKind& kind = *change.kind;
    sendAlert(tree, Alert(kind.firstCode, 0, {node->getPath()}, kind.eventCode, kind.message));
}

}  // namespace

void checkAndSendNetAlert(const NodeTree& tree, const Pass& pass) {
    const LogScope scope("checkAndSendNetAlert: entry", "Returning from checkAndSendNetAlert",
                         indicationsLogSource);
    for (const Compared& compared : compare(pass.previous, pass.now.current, pass.now.slaves)) {
        logInd(kProgress) << "Slaves Map Size : " << static_cast<unsigned int>(pass.now.slaves.size());
        if (compared.isMember) {
            logInd(kProgress) << "Slaves Found in the Map";
        } else if (compared.hasChanged) {
            tell(tree, compared);
            if (isLeftBehind()) {
                return;
            }
        }
    }
}

}  // namespace IC
