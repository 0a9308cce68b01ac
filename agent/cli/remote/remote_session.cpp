#include "agent/cli/remote/remote_session.h"

#include <algorithm>

#include "agent/bus/text.h"
#include "agent/bus/writer.h"
#include "agent/cli/print.h"
#include "agent/cli/remote/answer_errors.h"
#include "agent/cli/remote/service.h"
#include "agent/cli/remote/values.h"
#include "agent/core/catalogue_file.h"
#include "agent/core/property_words.h"

namespace cvagent::remote {

namespace {

void takeErrors(bus::Reader& reader, const Request& request) {
    for (const std::string& error : reader.texts()) {
        request.errors().add(error);
    }
}

WriteResult::Outcome outcomeOf(const std::string& verdict) {
    return verdict == "applied"   ? WriteResult::applied
           : verdict == "differs" ? WriteResult::differs
                                  : WriteResult::notKnown;
}

constexpr const char* kBoth = "FindAndRead";

}  // namespace

Question questionOf(const std::string& node, const std::vector<std::string>& properties) {
    constexpr std::size_t kMostTogether = 4096;
    std::size_t size = 0;
    for (const std::string& property : properties) {
        size += bus::isText(property) ? 1 + property.size() : kMostTogether;
    }
    return size < kMostTogether ? Question{kBoth, node, properties} : Question{"Find", node};
}

/// A class that the program does not know is one of a plug-in that brings its own names.
void RemoteSession::learnClasses(const std::vector<NodeCopy>& nodes) {
    const auto isStrange = [](const NodeCopy& node) { return findClass(node.type) == nullptr; };
    if (std::ranges::none_of(nodes, isStrange)) {
        return;
    }
    std::vector<std::string> plugins;
    const bus::Message answer = client_->askProperty("Plugins");
    client_->read(answer, [&plugins](bus::Reader& reader) {
        reader.variant([&](const std::string& /*type*/) { plugins = reader.texts(); });
    });
    for (const std::string& plugin : plugins) {
        loadCatalogueOf(plugin, complain);
    }
}

Session::Tree RemoteSession::tree(const Request& /*request*/) {
    std::vector<NodeCopy> nodes;
    Tree whole;
    const bus::Message answer = client_->ask({"Tree"});
    client_->read(answer, [&](bus::Reader& reader) {
        whole.plugins = reader.texts();
        reader.array("(uuuuosssua(uyvtus))", [&] {
            reader.structure("uuuuosssua(uyvtus)", [&] {
                nodes.push_back(takeNode(reader));
                whole.readings.push_back(takeReadings(reader));
            });
        });
    });
    learnClasses(nodes);
    for (std::size_t i = 0; i < nodes.size(); ++i) {
        findRows(whole.readings[i], nodes[i].type);
        whole.nodes.push_back(nodes[i].reference(whole.readings[i]));
    }
    if (whole.plugins.empty()) {
        client_->failOtherVersion();
    }
    return whole;
}

NodeRef RemoteSession::find(const std::string& word) {
    NodeCopy node;
    const bus::Message answer = client_->ask({"Find", word});
    client_->read(answer, [&node](bus::Reader& reader) {
        reader.structure(kNodeContents, [&] { node = takeNode(reader); });
    });
    learnClasses({node});
    return node.reference();
}

Session::NodeReadings RemoteSession::findAndRead(const std::string& word,
                                                 const std::vector<std::string>& properties,
                                                 const Request& request) {
    const Question both = questionOf(word, properties);
    if (both.member != kBoth) {
        return Session::findAndRead(word, properties, request);
    }
    const bus::Message answer = client_->answerTo(both, Client::kRead);
    if (answer.isError() && answer.error().name() == bus::kUnknownMethod) {  // an older service
        return Session::findAndRead(word, properties, request);
    }
    client_->checkAnswer(answer);
    NodeCopy node;
    std::vector<Reading> readings;
    client_->read(answer, [&](bus::Reader& reader) {
        reader.structure(kNodeContents, [&] { node = takeNode(reader); });
        readings = takeReadings(reader);
        takeErrors(reader, request);
    });
    learnClasses({node});
    findRows(readings, node.type);
    return {node.reference(), std::move(readings)};
}

std::vector<Reading> RemoteSession::read(const NodeRef& node, const std::vector<std::string>& properties,
                                         const Request& request) {
    const bus::Message call = client_->call("Read");
    bus::Writer writer(call);
    writer.put(std::uint32_t{node->getNodeId()});
    writer.put(properties.empty() ? std::vector<std::uint32_t>() : readableIds(*node, properties));
    std::vector<Reading> readings;
    const bus::Message answer = client_->ask(call, Client::kRead);
    client_->read(answer, [&](bus::Reader& reader) {
        readings = takeReadings(reader);
        takeErrors(reader, request);
    });
    findRows(readings, node->nodeType());
    return readings;
}

bus::Message RemoteSession::writeCall(const NodeRef& node, const Property& row,
                                      const std::vector<std::string>& words) {
    bus::Message call = client_->call("Write");
    bus::Writer writer(call);
    writer.put(std::uint32_t{node->getNodeId()}).put(std::uint32_t{row.id});
    putWords(writer, words);
    if (asksPerson_) {
        call.allowInteraction();
    }
    return call;
}

WriteResult RemoteSession::write(const NodeRef& node, const Property& row,
                                 const std::vector<std::string>& words, const Request& request) {
    WriteResult result;
    result.after.id = row.id;
    result.after.row = &row;
    bus::Message answer;
    try {
        answer = client_->askForLong(writeCall(node, row, words));
    } catch (const ServiceProblem& problem) {
        problem.addErrorsTo(request.errors());
        result.problem = problem;
        return result;
    } catch (const ServiceGone& gone) {
        throw Failure(ExitStatus::failed, std::string(gone.what()) + "; " + row.name +
                                              " may be changed, or not, or only in part: read it again");
    }
    client_->read(answer, [&](bus::Reader& reader) {
        result.before = takeReading(reader);
        result.after = takeReading(reader);
        result.outcome = outcomeOf(reader.text());
        result.complained = reader.flag();
        result.lacking = reader.text();
        takeErrors(reader, request);
    });
    result.before.row = &row;
    result.after.row = &row;
    return result;
}

std::shared_ptr<Subscription> RemoteSession::subscribe(std::optional<Event::Kind> only) {
    if (!feed_) {
        feed_.emplace(*client_, address_);
    }
    return feed_->subscribe(only);
}

std::shared_ptr<ShownMarks> RemoteSession::marks() {
    return client_->isOwn() ? shownMarks() : nullptr;
}

std::size_t RemoteSession::countNodes() {
    std::size_t count = 0;
    const bus::Message answer = client_->ask(client_->call("Tree"), Client::kShort);
    client_->read(answer, [&count](bus::Reader& reader) {
        reader.texts();
        reader.array("(uuuuosssua(uyvtus))", [&] {
            reader.skip();
            ++count;
        });
    });
    return count;
}

/// From now on events come, too: who sends alerts somewhere has subscribed to all he wants.
void RemoteSession::sendAlertsTo(std::function<void(const Event&)> receiver) {
    if (receiver && feed_) {
        feed_->start();
    }
}

void RemoteSession::showErrors(const Request& request) {
    showLines(request.errors());
}

void RemoteSession::tellMissingTools(const std::vector<Reading>& /*properties*/) {}

void RemoteSession::end() {
    if (feed_) {
        feed_->stop();
    }
}

}  // namespace cvagent::remote
