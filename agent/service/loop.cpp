#include "agent/service/loop.h"

#include <sys/epoll.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <ctime>
#include <system_error>
#include <utility>

namespace cvagent::service {

namespace {

void checkLoop(int result) {
    if (result < 0) {
        throw std::system_error(-result, std::generic_category(), "the event loop");
    }
}

sd_event* madeEvent() {
    sd_event* event = nullptr;
    checkLoop(sd_event_new(&event));
    return event;
}

}  // namespace

Mailbox::Mailbox() : ready_(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
    if (ready_ < 0) {
        throw std::system_error(errno, std::generic_category(), "the event loop");
    }
}

Mailbox::~Mailbox() {
    ::close(ready_);
}

void Mailbox::post(std::function<void()> work) {
    {
        const std::lock_guard lock(guard_);
        if (closed_) {
            return;
        }
        waiting_.push_back(std::move(work));
    }
    eventfd_write(ready_, 1);
}

void Mailbox::close() {
    std::deque<std::function<void()>> dropped;  // outside of the lock: what goes with it may post
    const std::lock_guard lock(guard_);
    closed_ = true;
    dropped.swap(waiting_);
}

std::deque<std::function<void()>> Mailbox::takeAll() {
    eventfd_t count = 0;
    eventfd_read(ready_, &count);
    const std::lock_guard lock(guard_);
    return std::exchange(waiting_, {});
}

struct Loop::Registered {
    Loop* loop;
    Work work;

    static int ready(sd_event_source* /*source*/, int /*descriptor*/, std::uint32_t /*events*/, void* data) {
        return call(data);
    }
    static int due(sd_event_source* /*source*/, std::uint64_t /*time*/, void* data) { return call(data); }

private:
    static int call(void* data) {
        const Registered held = *static_cast<Registered*>(data);  // the work may end its own source
        held.loop->guarded(held.work);
        return 0;
    }
};

Loop::Loop() : event_(madeEvent()), mailbox_(std::make_shared<Mailbox>()) {
    mail_ = whenReadable(mailbox_->ready_, [this] { takeMail(); });
}

Loop::~Loop() {
    mailbox_->close();
}

Loop::Source Loop::made(sd_event_source* source, const std::shared_ptr<Registered>& registered) const {
    return {source, registered};
}

Loop::Source Loop::after(Duration time, Work work) {
    constexpr Duration kLeast{1};  // of none the library makes a quarter of a second
    constexpr Duration kMost = std::chrono::milliseconds(250);
    constexpr int kPart = 8;
    const auto registered = std::make_shared<Registered>(Registered{this, std::move(work)});
    const Duration late = std::clamp(time / kPart, kLeast, kMost);
    sd_event_source* source = nullptr;
    checkLoop(sd_event_add_time_relative(
        get(), &source, CLOCK_MONOTONIC, static_cast<std::uint64_t>(time.count()),
        static_cast<std::uint64_t>(late.count()), Registered::due, registered.get()));
    return made(source, registered);
}

Loop::Source Loop::whenReadable(int descriptor, Work work) {
    const auto registered = std::make_shared<Registered>(Registered{this, std::move(work)});
    sd_event_source* source = nullptr;
    checkLoop(sd_event_add_io(get(), &source, descriptor, EPOLLIN, Registered::ready, registered.get()));
    return made(source, registered);
}

void Loop::guarded(const Work& work) {
    try {
        work();
    } catch (const std::exception&) {
        failure_ = std::current_exception();
        stop();
    }
}

void Loop::takeMail() {
    for (const Work& work : mailbox_->takeAll()) {
        guarded(work);
    }
}

void Loop::run() {
    checkLoop(sd_event_loop(get()));
    if (failure_) {
        std::rethrow_exception(std::exchange(failure_, nullptr));
    }
}

void Loop::stop() {
    sd_event_exit(get(), 0);
}

}  // namespace cvagent::service
