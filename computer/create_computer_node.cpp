#include <initializer_list>
#include <string>
#include <vector>

#include "computer/computer_builder.h"
#include "computer/computer_node.h"
#include "mi/command.h"
#include "mi/log.h"
#include "mi/node_types.h"
#include "mi/text.h"

namespace IC {

namespace {

/// Stores what the host answers now.
bool storeAnswer(MutableNode& computer, unsigned int id) {
    PropertyValue value;
    if (computer.getProperty(id, value).getStatus() != 0) {
        return false;
    }
    computer.setProperty(id, value);
    return true;
}

void primeOwner(MutableNode& computer) {
    for (const unsigned int id : {ComputerProperty::ownerName, ComputerProperty::ownerContact}) {
        if (!storeAnswer(computer, id)) {
            computer.setProperty(ComputerProperty::ownerName, PropertyValue("", true));
            computer.setProperty(ComputerProperty::ownerContact, PropertyValue("", true));
        }
    }
}

void primeHostName(MutableNode& computer) {
    HostCommand command("hostname 2> /dev/null");
    const auto line = command.nextLine();
    if (line && !contains(*line, "Unknown")) {
        computer.setProperty(ComputerProperty::hostName, PropertyValue(trimEnd(*line), true));
    }
}

/// Fills the store of a new node, so that a reader of all its properties finds them there. Before the end of
/// start-up writing a property only stores it.
void prime(MutableNode& computer) {
    computer.setProperty(ComputerProperty::powerAction, PropertyValue(EnumValue(PowerAction::running), true));
    const std::vector<Number> accepted{PowerAction::running, PowerAction::restart, PowerAction::halt};
    computer.setProperty(ComputerProperty::powerActions, PropertyValue(accepted, true));
    primeOwner(computer);
    storeAnswer(computer, ComputerProperty::currentTime);
    storeAnswer(computer, ComputerProperty::timeZoneOffset);
    primeHostName(computer);
}

}  // namespace

void ComputerBuilder::createComputerNodes() {
    const LogScope scope;
    auto* computer = tree_.makeNode<ComputerNode>(tree_.fixed.root, NodeType::computer, 0);
    tree_.appendNode(computer);
    tree_.fixed.computer = computer;
    prime(*computer);
    computer->setStatus(kStatusGood);
    computer->setDescription("Computer");
}

}  // namespace IC
