#pragma once

#include <memory>
#include <optional>
#include <vector>

#include "agent/core/facts.h"
#include "agent/core/pool.h"
#include "agent/core/request.h"

namespace cvagent {

/// What a read is content with.
enum class Freshness {
    known,  ///< what is known, with its age; nothing is asked of the host
    now,    ///< what is so now, as far as the plug-in reads it again
    anew,   ///< the same, and what it asks for at its start alone (oshw/start_facts.h)
};

/// Reads properties side by side on the pool: most of a read is waiting for the host's tools. Any thread.
class Reader {
public:
    /// Both outlive the reader; work that still hangs when a caller has gone reaches them through its node.
    Reader(Pool& pool, Facts& facts) : pool_(pool), facts_(facts) {}

    /// @param node kept by the work until it is done
    /// @return one reading an id, in the order of the ids. What the host does not tell until the request's
    ///         deadline is the last known value, stale; at once when a node that others have given up has
    ///         not answered for a second. Never throws for what a read does.
    std::vector<Reading> read(const Handle& node, const std::vector<unsigned int>& ids, Freshness freshness,
                              const Request& request);

    /// A property of a node.
    struct Question {
        Handle node;
        unsigned int id;
        Source source = Source::plugin;
    };
    /// The same with what is so now, for many nodes side by side.
    std::vector<Reading> readNow(const std::vector<Question>& questions, const Request& request);

private:
    bool isHopeless(const IC::MutableNode& node, const Request& request) const;
    /// What comes until the request's deadline.
    std::vector<std::optional<Reading>> ask(const std::vector<Question>& questions, const Request& request);
    Reading askHere(const Question& question, const Request& request);

    Pool& pool_;
    Facts& facts_;
};

}  // namespace cvagent
