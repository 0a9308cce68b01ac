#include "agent/shell/filters/filters.h"

namespace cvagent::shell {

namespace {

class Cat : public Filter {
public:
    bool pull(std::string& out) override { return from().pull(out); }
};

}  // namespace

std::unique_ptr<Filter> makeCat(Words words, Manner /*manner*/) {
    return words.empty() ? std::make_unique<Cat>() : nullptr;
}

}  // namespace cvagent::shell
