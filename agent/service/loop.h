#pragma once

#include <systemd/sd-event.h>

#include <chrono>
#include <cstdint>
#include <deque>
#include <exception>
#include <functional>
#include <memory>
#include <mutex>
#include <thread>
#include <utility>

namespace cvagent::service {

/// Work for the loop's thread, from any thread. It outlives the loop; what comes then is dropped.
class Mailbox {
public:
    Mailbox();
    Mailbox(const Mailbox&) = delete;
    Mailbox& operator=(const Mailbox&) = delete;
    ~Mailbox();

    void post(std::function<void()> work);
    /// From now on everything is dropped.
    void close();

private:
    friend class Loop;
    std::deque<std::function<void()>> takeAll();

    int ready_;
    std::mutex guard_;
    std::deque<std::function<void()>> waiting_;  // guarded by guard_
    bool closed_ = false;                        // guarded by guard_
};

/// Holds what belongs to the loop's thread for other threads, too: whoever lets go of it last, it ends on the
/// loop's. To be called there.
template <class Held>
std::shared_ptr<const Held> heldForLoop(const std::shared_ptr<Mailbox>& mailbox, Held held) {
    const auto end = [mailbox, loop = std::this_thread::get_id()](const Held* last) {
        if (std::this_thread::get_id() == loop) {
            delete last;
        } else {
            mailbox->post([owned = std::shared_ptr<const Held>(last)] {});
        }
    };
    return {new Held(std::move(held)), end};
}

/// The thread that all of the bus belongs to: it waits for descriptors, times and other threads' work.
class Loop {
public:
    using Work = std::function<void()>;
    using Duration = std::chrono::microseconds;

    /// Something that is waited for, until it is gone. It may go inside of its own work.
    class Source {
    public:
        Source() = default;
        Source(sd_event_source* source, std::shared_ptr<void> work)
            : work_(std::move(work)), source_(source) {}
        explicit operator bool() const { return source_ != nullptr; }
        void reset() { source_.reset(); }

    private:
        struct Unref {
            void operator()(sd_event_source* source) const { sd_event_source_disable_unref(source); }
        };
        std::shared_ptr<void> work_;
        std::unique_ptr<sd_event_source, Unref> source_;  // goes first
    };

    Loop();
    Loop(const Loop&) = delete;
    Loop& operator=(const Loop&) = delete;
    ~Loop();

    sd_event* get() const { return event_.get(); }
    /// What other threads hand their work to.
    const std::shared_ptr<Mailbox>& mailbox() const { return mailbox_; }

    /// Once, after that time; it may be an eighth of it late, a quarter of a second at most.
    [[nodiscard]] Source after(Duration time, Work work);
    /// Whenever the descriptor can be read.
    [[nodiscard]] Source whenReadable(int descriptor, Work work);

    /// Until stop(); throws what left a work.
    void run();
    void stop();

private:
    struct Registered;
    Source made(sd_event_source* source, const std::shared_ptr<Registered>& registered) const;
    void guarded(const Work& work);
    void takeMail();

    struct Unref {
        void operator()(sd_event* event) const { sd_event_unref(event); }
    };
    std::unique_ptr<sd_event, Unref> event_;
    std::shared_ptr<Mailbox> mailbox_;
    Source mail_;
    std::exception_ptr failure_;
};

}  // namespace cvagent::service
