#include "base/event_loop.h"

#include <sys/epoll.h>

#include <cerrno>
#include <csignal>
#include <ctime>
#include <system_error>
#include <utility>

#include "base/late_systemd.h"

namespace kelo::tool {
namespace {

constexpr uint64_t kExactUsec = 1; // the accuracy of timers; 0 would mean a quarter of a second

void Require(int result) {
    if (result < 0)
        throw std::system_error(-result, std::generic_category(), "event loop");
}

// Takes a signal that is blocked and has come, so that it does not strike when it is unblocked.
void Discard(int signal) {
    sigset_t signals;
    sigemptyset(&signals);
    sigaddset(&signals, signal);
    const timespec noTime{};
    while (sigtimedwait(&signals, nullptr, &noTime) > 0) {
    }
}

} // namespace

// Has a fixed address, which the library keeps.
struct EventSource::Watch {
    Watch(EventLoop &owner, EventLoop::Handler toRun) : loop(owner), handler(std::move(toRun)) {}
    ~Watch() {
        if (signal != 0)
            Discard(signal);
        sd_event_source_disable_unref(source);
    }
    Watch(const Watch &) = delete;
    Watch &operator=(const Watch &) = delete;

    // No exception may pass through the library, which is C.
    static int Handle(void *watch) {
        auto &self = *static_cast<Watch *>(watch);
        try {
            self.handler();
        } catch (...) {
            self.loop.failure_ = std::current_exception();
        }
        return 0;
    }
    static int OnFile(sd_event_source *, int, uint32_t, void *watch) { return Handle(watch); }
    static int OnReady(sd_event_source *, void *watch) { return Handle(watch); }
    static int OnTime(sd_event_source *, uint64_t, void *watch) { return Handle(watch); }
    static int OnSignal(sd_event_source *, const signalfd_siginfo *, void *watch) { return Handle(watch); }

    EventLoop &loop;
    EventLoop::Handler handler;
    int signal = 0;
    sd_event_source *source = nullptr;
};

EventSource::EventSource() = default;
EventSource::EventSource(EventSource &&) noexcept = default;
EventSource &EventSource::operator=(EventSource &&) noexcept = default;
EventSource::~EventSource() = default;

void EventSource::SetEnabled(bool isEnabled) {
    Require(sd_event_source_set_enabled(watch_->source, isEnabled ? SD_EVENT_ON : SD_EVENT_OFF));
}

void EventSource::FireAt(std::chrono::steady_clock::time_point time) {
    const auto usec = std::chrono::duration_cast<std::chrono::microseconds>(time.time_since_epoch());
    Require(sd_event_source_set_time(watch_->source, static_cast<uint64_t>(usec.count())));
    Require(sd_event_source_set_enabled(watch_->source, SD_EVENT_ONESHOT));
}

EventLoop::EventLoop() {
    Require(sd_event_new(&loop_));
}

EventLoop::~EventLoop() {
    sd_event_unref(loop_);
}

EventSource::Watch &EventLoop::Add(EventSource &source, Handler handler) {
    source.watch_ = std::make_unique<EventSource::Watch>(*this, std::move(handler));
    return *source.watch_;
}

EventSource EventLoop::AddInput(int file, Handler handler) {
    EventSource source;
    EventSource::Watch &watch = Add(source, std::move(handler));
    const int result =
        sd_event_add_io(loop_, &watch.source, file, EPOLLIN, EventSource::Watch::OnFile, &watch);
    if (result != -EPERM) {
        Require(result);
        return source;
    }
    Require(sd_event_add_defer(loop_, &watch.source, EventSource::Watch::OnReady, &watch));
    // Of equal sources the one that became ready first has its turn, and this one always is.
    Require(sd_event_source_set_priority(watch.source, SD_EVENT_PRIORITY_IDLE));
    source.SetEnabled(true); // again and again
    return source;
}

EventSource EventLoop::AddHangUp(int file, Handler handler) {
    EventSource source;
    EventSource::Watch &watch = Add(source, std::move(handler));
    const int result = sd_event_add_io(loop_, &watch.source, file, 0, EventSource::Watch::OnFile, &watch);
    if (result != -EPERM && result != -EBADF)
        Require(result);
    return source;
}

EventSource EventLoop::AddTimer(Handler handler) {
    EventSource source;
    EventSource::Watch &watch = Add(source, std::move(handler));
    Require(sd_event_add_time(loop_, &watch.source, CLOCK_MONOTONIC, 0, kExactUsec,
                              EventSource::Watch::OnTime, &watch));
    source.SetEnabled(false);
    return source;
}

EventSource EventLoop::AddSignal(int signal, Handler handler) {
    EventSource source;
    EventSource::Watch &watch = Add(source, std::move(handler));
    Require(sd_event_add_signal(loop_, &watch.source, signal | SD_EVENT_SIGNAL_PROCMASK,
                                EventSource::Watch::OnSignal, &watch));
    watch.signal = signal;
    Require(sd_event_source_set_priority(watch.source, SD_EVENT_PRIORITY_IMPORTANT));
    return source;
}

void EventLoop::Wait() {
    Run(UINT64_MAX);
}

bool EventLoop::Poll() {
    return Run(0);
}

bool EventLoop::Run(uint64_t timeoutUsec) {
    const int result = sd_event_run(loop_, timeoutUsec);
    if (failure_)
        std::rethrow_exception(std::exchange(failure_, nullptr));
    Require(result);
    return result > 0;
}

void EventLoop::NotifyServiceManager() {
    Require(sd_event_set_watchdog(loop_, 1));
    Require(sd_notify(0, "READY=1"));
}

} // namespace kelo::tool
