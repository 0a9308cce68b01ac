#include "agent/core/reader.h"

#include <algorithm>
#include <condition_variable>
#include <mutex>
#include <utility>

namespace cvagent {

namespace {

/// The readings of one call, as they come in. The work holds it, too: some may come when nobody waits any
/// more.
class Answers {
public:
    explicit Answers(std::size_t count) : readings_(count), left_(count) {}

    void put(std::size_t place, Reading reading) {
        {
            const std::lock_guard lock(guard_);
            readings_[place] = std::move(reading);
            --left_;
        }
        changed_.notify_one();
    }
    /// What has come until the deadline; nothing at a place means that it has not.
    std::vector<std::optional<Reading>> takeAt(Request::Clock::time_point deadline, Pool& pool) {
        std::unique_lock lock(guard_);
        pool.wait(changed_, lock, deadline, [this] { return left_ == 0; });
        return readings_;
    }

private:
    std::mutex guard_;
    std::condition_variable changed_;
    std::vector<std::optional<Reading>> readings_;  // guarded by guard_
    std::size_t left_;                              // guarded by guard_
};

}  // namespace

std::vector<Reading> Reader::read(const Handle& node, const std::vector<unsigned int>& ids,
                                  Freshness freshness, const Request& request) {
    if (freshness != Freshness::known) {
        const Source source = freshness == Freshness::anew ? Source::host : Source::plugin;
        std::vector<Question> questions;
        questions.reserve(ids.size());
        for (const unsigned int id : ids) {
            questions.push_back({node, id, source});
        }
        return readNow(questions, request);
    }
    std::vector<Reading> readings;
    readings.reserve(ids.size());
    for (const unsigned int id : ids) {
        readings.push_back(facts_.known(*node, id));
    }
    return readings;
}

/// The errors of a stop of the agent, which may come next on this thread, are not the request's.
Reading Reader::askHere(const Question& question, const Request& request) {
    const ErrorScope scope(request.errors());
    return facts_.ask(*question.node, question.id, question.source);
}

/// Whether there is no use in asking: nobody would wait for the answer, or the node has not answered others
/// for long. One who waits for as long as it takes is given the time.
bool Reader::isHopeless(const IC::MutableNode& node, const Request& request) const {
    return request.deadline() != Request::Clock::time_point::max() &&
           (request.deadline() <= Request::Clock::now() || pool_.isStuck(node.getNodeId()));
}

std::vector<Reading> Reader::readNow(const std::vector<Question>& questions, const Request& request) {
    const auto asked = Facts::Clock::now();
    std::vector<std::optional<Reading>> come = ask(questions, request);
    std::vector<Reading> readings;
    readings.reserve(questions.size());
    for (std::size_t i = 0; i < questions.size(); ++i) {
        readings.push_back(come[i] ? *std::move(come[i])
                                   : facts_.overdue(*questions[i].node, questions[i].id, asked));
    }
    return readings;
}

std::vector<std::optional<Reading>> Reader::ask(const std::vector<Question>& questions,
                                                const Request& request) {
    std::vector<std::size_t> hopeful;
    for (std::size_t i = 0; i < questions.size(); ++i) {
        if (!isHopeless(*questions[i].node, request)) {
            hopeful.push_back(i);
        }
    }
    std::vector<std::optional<Reading>> all(questions.size());
    const auto answers = std::make_shared<Answers>(hopeful.size());
    for (std::size_t place = 0; place < hopeful.size(); ++place) {
        const Question& question = questions[hopeful[place]];
        pool_.submit(
            question.node->getNodeId(), answers.get(),
            [held = question, place, answers, request, this]() mutable {
                Reading reading = askHere(held, request);
                held.node.reset();  // whoever has his answer may end the agent and know that it has ended
                answers->put(place, std::move(reading));
            });
    }
    auto come = answers->takeAt(request.deadline(), pool_);
    if (!std::all_of(come.begin(), come.end(), [](const auto& reading) { return reading.has_value(); })) {
        pool_.giveUp(answers.get());
    }
    for (std::size_t place = 0; place < hopeful.size(); ++place) {
        all[hopeful[place]] = std::move(come[place]);
    }
    return all;
}

}  // namespace cvagent
