#include "framework/ic/node.h"

#include <mutex>

namespace IC {

Node::~Node() = default;

std::string Node::getPath() const {
    const std::shared_lock lock(pathGuard_);
    return path_;
}

void Node::storePath(const std::string& path) {
    const std::unique_lock lock(pathGuard_);
    path_ = path;
}

}  // namespace IC
