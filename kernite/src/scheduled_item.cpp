#include "kernite/Assert.h"
#include "kernite/Exception.h"
#include "kernite/System.h"

namespace Kernite::System {

ScheduledItem::ScheduledItem() = default;
ScheduledItem::~ScheduledItem() = default;

ScheduledItem::State ScheduledItem::GetState() const {
    std::lock_guard<std::mutex> lock(_mutex);
    return _state;
}

void ScheduledItem::Wait() const {
    std::unique_lock<std::mutex> lock(_mutex);
    _done.wait(lock, [this] { return _state != State::Pending; });
}

bool ScheduledItem::WaitFor(std::chrono::milliseconds timeout) const {
    std::unique_lock<std::mutex> lock(_mutex);
    return _done.wait_for(lock, timeout, [this] { return _state != State::Pending; });
}

const Exception* ScheduledItem::GetException() const {
    std::lock_guard<std::mutex> lock(_mutex);
    return _failure.get();
}

void ScheduledItem::Complete(const Exception* failure) {
    // Cloned before taking the lock: cloning may allocate and throw.
    std::unique_ptr<Exception> kept(failure ? failure->Clone() : nullptr);
    {
        std::lock_guard<std::mutex> lock(_mutex);
        if (_state != State::Pending) PanicAssert("_state == State::Pending", "kernite/System", __LINE__);
        _failure = std::move(kept);
        _state = _failure ? State::Failed : State::Done;
    }
    _done.notify_all();
}

} // namespace Kernite::System
