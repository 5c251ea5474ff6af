// Time and asynchronous completion.
#pragma once

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <memory>
#include <mutex>
#include <string>

#include "kernite/Object.h"

namespace Kernite {
class Exception;

namespace System {

// An instant in UTC with microsecond resolution. ISO-8601 text in and out:
// "2026-12-06T09:49:01Z", "2026-12-06T09:49:01.250Z", offsets such as "+02:00" on input.
class DateTime {
public:
    DateTime() noexcept = default;  // the epoch, 1970-01-01T00:00:00Z
    static DateTime FromMicroseconds(std::int64_t sinceEpoch) noexcept;
    static DateTime Now();
    // Throws InvalidArgumentException on text that is not an ISO-8601 date-time.
    static DateTime Parse(const std::string& text);

    std::int64_t Microseconds() const noexcept { return _us; }
    std::string ToString() const;

    friend bool operator==(DateTime a, DateTime b) noexcept { return a._us == b._us; }
    friend auto operator<=>(DateTime a, DateTime b) noexcept { return a._us <=> b._us; }

private:
    std::int64_t _us = 0;
};

// The handle of a started asynchronous call. The runtime completes it exactly once,
// after the completion callback has run; waiters wake then.
class ScheduledItem : public ObjectImpl {
public:
    enum class State { Pending, Done, Failed };

    ScheduledItem();
    ~ScheduledItem() override;

    State GetState() const;
    bool IsDone() const { return GetState() != State::Pending; }
    bool IsFailed() const { return GetState() == State::Failed; }
    void Wait() const;
    // False when the timeout passed first.
    bool WaitFor(std::chrono::milliseconds timeout) const;
    // The failure, if any (owned by the item); null while pending or when done.
    const Exception* GetException() const;

    // Completion, for the runtime: `failure` (may be null) is cloned and kept.
    void Complete(const Exception* failure);

private:
    mutable std::mutex _mutex;
    mutable std::condition_variable _done;
    State _state = State::Pending;
    std::unique_ptr<Exception> _failure;
};

} // namespace System
} // namespace Kernite
