#include "agent/change/proposal.h"

#include <algorithm>
#include <iterator>
#include <utility>

#include "agent/change/order.h"
#include "agent/core/text.h"

namespace cvagent::change {

namespace {

/// Whether it is up is not seen in the network's copy (attempt.cpp): what the host has is known here.
bool isInterfaceState(const Property& row) {
    constexpr unsigned int kInterfaceState = 123;
    return row.type == NodeType::ipConfig && row.id == kInterfaceState;
}

}  // namespace

bool Proposal::isToBeMade(std::size_t change) const {
    return std::ranges::find(order, change) != order.end();
}

Proposal propose(ChangedHost& host, std::vector<MeantChange> changes, const Request& request,
                 Already already) {
    Proposal proposal{std::move(changes), {}, {}, {}, already};
    std::vector<Wanted> wanted;
    for (const MeantChange& change : proposal.changes) {
        proposal.found.push_back(findNow(host, change, request));
        wanted.push_back(change.wanted());
    }
    proposal.order = orderOf(wanted);
    std::erase_if(proposal.order, [&](std::size_t i) {
        return already == Already::leftOut && !isDeed(*proposal.changes[i].row) &&
               proposal.found[i].standing.outcome == WriteResult::applied;
    });
    proposal.objections = objectionsTo(proposal.changes);
    std::erase_if(proposal.objections,
                  [&proposal](const Objection& each) { return !proposal.isToBeMade(each.change); });
    return proposal;
}

std::string objectionsText(const Proposal& proposal) {
    const bool isOne = proposal.changes.size() == 1;  // which one is meant is no question
    std::string text;
    for (const Objection& each : proposal.objections) {
        const MeantChange& change = proposal.changes.at(each.change);
        text += (text.empty() ? "" : "\n") + (isOne || change.place.empty() ? "" : change.place + ": ") +
                printable(change.target()) + ": " + printable(each.reason);
    }
    return text;
}

std::vector<MeantChange> toBeMade(const Proposal& proposal) {
    std::vector<MeantChange> changes;
    for (const std::size_t i : proposal.order) {
        changes.push_back(proposal.changes[i]);
    }
    return changes;
}

void refuse(const Proposal& proposal) {
    if (!proposal.objections.empty()) {
        throw Problem(Problem::refused, objectionsText(proposal), Problem::objection);
    }
}

Plan rehearse(const RehearsalSettings& settings, const Proposal& proposal) {
    std::vector<Change> plain;
    std::ranges::transform(proposal.order, std::back_inserter(plain), [&proposal](std::size_t i) {
        const MeantChange& each = proposal.changes[i];
        return Change{each.node->getPath(), each.row->id, each.words};
    });
    Plan plan = plain.empty() ? Plan() : rehearse(settings, plain);
    for (std::size_t at = 0; at < std::min(plan.answers.size(), proposal.order.size()); ++at) {
        const std::size_t i = proposal.order[at];
        const Reading& now = proposal.found[i].reading;
        if (isInterfaceState(*proposal.changes[i].row) && !now.failed()) {
            plan.answers[at].before = printable(static_cast<std::string>(now.value));
        }
    }
    return plan;
}

Preview previewOf(const Proposal& proposal, Plan plan) {
    Preview preview{{}, {}, std::move(plan)};
    const auto target = [&proposal](std::size_t i, const std::string& reason) {
        return Preview::Target{proposal.changes[i].node->getPath(), proposal.changes[i].row->name, reason};
    };
    for (const Objection& each : proposal.objections) {
        preview.objections.push_back(target(each.change, each.reason));
    }
    for (std::size_t i = 0; i < proposal.changes.size(); ++i) {
        if (!proposal.isToBeMade(i)) {
            preview.unchanged.push_back(target(i, ""));
        }
    }
    return preview;
}

}  // namespace cvagent::change
