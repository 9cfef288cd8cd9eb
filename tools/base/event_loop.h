#pragma once

#include <chrono>
#include <cstdint>
#include <exception>
#include <functional>
#include <memory>

struct sd_event;

namespace kelo::tool {

// What an EventLoop waits for, as long as the object lives. Destroy it before its loop, and not in its own
// handler.
class EventSource {
public:
    // Waits for nothing.
    EventSource();
    EventSource(EventSource &&) noexcept;
    EventSource &operator=(EventSource &&) noexcept;
    ~EventSource();

    // While a source is disabled its handler does not run; what comes waits until it is enabled again.
    void SetEnabled(bool isEnabled);

    // For a timer: runs the handler once at this time, which replaces the one set before; at once when it has
    // passed.
    void FireAt(std::chrono::steady_clock::time_point time);

private:
    friend class EventLoop;
    struct Watch;
    std::unique_ptr<Watch> watch_;
};

// Waits for files, times and signals on the thread that calls it, and runs their handlers there, one event a
// call. Signals come before anything else.
//
// All functions throw std::system_error.
class EventLoop {
public:
    using Handler = std::function<void()>;

    EventLoop();
    ~EventLoop();
    EventLoop(const EventLoop &) = delete;
    EventLoop &operator=(const EventLoop &) = delete;

    // The input can be read, or has ended. Regular files and /dev/null are always ready.
    EventSource AddInput(int file, Handler handler);

    // The other end of an output was closed. Never happens to a file without another end or that is not open.
    EventSource AddHangUp(int file, Handler handler);

    // The time of EventSource::FireAt has come.
    EventSource AddTimer(Handler handler);

    // The signal has come. It does nothing else in the process while the source lives; one that came and was
    // not handled by then is discarded. A signal has one source at a time.
    EventSource AddSignal(int signal, Handler handler);

    // Tells the service manager that the program has started and, where that asks for it, regularly that it
    // still handles events. Without a service manager nothing happens.
    void NotifyServiceManager();

    // Waits for an event and handles it; may also return without one. Throws what the handler throws.
    void Wait();

    // Handles an event that has come. Returns false if there was none. Throws what the handler throws.
    bool Poll();

private:
    friend struct EventSource::Watch;
    EventSource::Watch &Add(EventSource &source, Handler handler);
    bool Run(uint64_t timeoutUsec);

    sd_event *loop_ = nullptr;
    std::exception_ptr failure_; // of the handler that was run last
};

} // namespace kelo::tool
