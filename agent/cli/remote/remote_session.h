#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "agent/cli/remote/client.h"
#include "agent/cli/remote/event_feed.h"
#include "agent/cli/session.h"

namespace cvagent::remote {

/// What is asked for a node and what it says of itself. The bus takes no text that is no UTF-8 as it is, and
/// the service no more than so much at once: the node is asked for by itself then.
Question questionOf(const std::string& node, const std::vector<std::string>& properties);

/// The service's agent. No plug-in is loaded into this process, and of their catalogues only those are read
/// that an answer needs.
class RemoteSession : public Session {
public:
    /// @param address of the bus that the client is connected to
    /// @param asksPerson whether somebody is there whom the service may have asked for his password
    RemoteSession(std::unique_ptr<Client> client, std::string address, bool asksPerson)
        : client_(std::move(client)), address_(std::move(address)), asksPerson_(asksPerson) {}

    Tree tree(const Request& request) override;
    NodeReadings findAndRead(const std::string& word, const std::vector<std::string>& properties,
                             const Request& request) override;
    NodeRef find(const std::string& word) override;
    std::vector<Reading> read(const NodeRef& node, const std::vector<std::string>& properties,
                              const Request& request) override;
    WriteResult write(const NodeRef& node, const Property& row, const std::vector<std::string>& words,
                      const Request& request) override;
    std::unique_ptr<change::Preview> preview(const std::vector<change::MeantChange>& changes) override;
    std::unique_ptr<std::vector<change::Outcome>> apply(const std::vector<change::MeantChange>& changes,
                                                        const ApplyOptions& options) override;
    std::shared_ptr<Subscription> subscribe(std::optional<Event::Kind> only) override;
    /// The marks are beside the history, and only whose service it is has that before him.
    std::shared_ptr<ShownMarks> marks() override;
    std::size_t countNodes() override;
    /// The service has told the alerts to its plug-ins' satisfaction: only who watches hears of them here.
    void sendAlertsTo(std::function<void(const Event&)> receiver) override;
    void announce(const Event& /*event*/) override {}
    void showErrors(const Request& request) override;
    /// That is the service's to tell: its commands are run there.
    void tellMissingTools(const std::vector<Reading>& properties) override;
    void end() override;
    ExitStatus statusAfter(ExitStatus own) const override { return own; }

private:
    void learnClasses(const std::vector<NodeCopy>& nodes);
    bus::Message changesCall(const char* member, const std::vector<change::MeantChange>& changes);
    bus::Message writeCall(const NodeRef& node, const Property& row, const std::vector<std::string>& words);

    std::unique_ptr<Client> client_;
    std::string address_;
    bool asksPerson_;
    std::optional<EventFeed> feed_;
};

}  // namespace cvagent::remote
