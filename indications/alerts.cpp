// What a pass tells the agent: one alert for each interface whose state is not what it was.
#include <algorithm>

#include "indications/contained.h"
#include "indications/globals.h"
#include "indications/left_behind.h"
#include "indications/link_state.h"
#include "mi/log.h"
#include "mi/os_hw_mi.h"

namespace IC {

namespace {

struct AlertKind {
    unsigned int state;
    const char* message;  ///< the blank at its end is part of it
    unsigned char firstCode;
    unsigned int eventCode;
    bool marksNode;  ///< the node's status and state property take the new state before the alert goes out
};

// The switch-back alert carries the switch-over code: receivers key on it. Only message and property tell
// them apart.
constexpr AlertKind kAlertKinds[] = {
    {LinkState::up, "NIC is Online ", 3, LinkState::up, false},
    {LinkState::down, "NIC is Offline ", 1, LinkState::down, false},
    {LinkState::switchedOver, "NIC has Switched Over ", 1, LinkState::switchedOver, true},
    {LinkState::switchedBack, "NIC has Switched Back ", 1, LinkState::switchedOver, true},
};

const AlertKind* alertKind(unsigned int state) {
    const auto* found = std::ranges::find(kAlertKinds, state, &AlertKind::state);
    return found == std::end(kAlertKinds) ? nullptr : found;
}

void mark(MutableNode& node, unsigned int state) {
    node.setStatus(1);
    node.setProperty(LinkState::stateProperty, PropertyValue(Number(state), true));
}

bool isSlave(const std::string& name) {
    const auto& slaves = OSHWMI_IND::pass().slaves;
    logInd(kProgress) << "Slaves Map Size : " << static_cast<unsigned int>(slaves.size());
    if (std::ranges::find(slaves, name) == slaves.end()) {
        return false;
    }
    logInd(kProgress) << "Slaves Found in the Map";
    return true;
}

}  // namespace

void OsHwMI::checkAndSendNetAlert() {
    const LogScope scope("checkAndSendNetAlert: entry", "Returning from checkAndSendNetAlert",
                         indicationsLogSource);
    for (const auto& [name, before] : OSHWMI_IND::pass().previous) {
        if (isSlave(name)) {
            continue;
        }
        const auto now = OSHWMI_IND::pass().current.find(name);
        if (now == OSHWMI_IND::pass().current.end() || now->second == before) {
            continue;
        }
        const auto node = findNetworkPort(name);  // held, should it be withdrawn meanwhile
        if (!node) {
            continue;
        }
        logInd(kProgress) << "OsHwMI::checkAndSendNetAlert() entering switch case";
        const AlertKind* kind = alertKind(now->second);
        if (kind == nullptr) {
            logInd(kProgress) << "Unknown status: curitr->first= " << name;
            continue;
        }
        if (kind->marksNode) {
            mark(*node, now->second);
        }
        sendAlert(Alert(kind->firstCode, 0, {node->getPath()}, kind->eventCode, kind->message));
        if (isLeftBehind()) {
            return;
        }
    }
}

void OsHwMI::sendAlert(const Alert& alert) {
    const auto receiver = alertHandler();
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

}  // namespace IC
