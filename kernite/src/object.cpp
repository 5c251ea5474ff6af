#include "kernite/Object.h"

#include <cxxabi.h>

#include <cstdio>
#include <cstdlib>
#include <memory>
#include <new>

#include "kernite/Assert.h"
#include "kernite/Memory.h"

namespace Kernite {
namespace {

// Live objects are counted per thread, so that making and ending an object costs no
// atomic read-modify-write: each thread adds to a counter of its own, and only that
// thread writes it. An object ended on another thread than the one that made it
// leaves one counter one lower and another one higher; only the sum means anything.
// A thread's counter goes back to a free list when the thread ends, with its count,
// and the next new thread carries on from there.
struct LiveCounter {
    std::atomic<long> count{0};
    std::atomic<bool> taken{true};
    LiveCounter* next = nullptr;
};

std::atomic<LiveCounter*> gCounters{nullptr};
// Objects counted while their thread has no counter of its own: when none could be
// allocated, or while the thread is ending.
std::atomic<long> gUncounted{0};

[[gnu::tls_model("initial-exec")]] thread_local LiveCounter* tCounter = nullptr;
[[gnu::tls_model("initial-exec")]] thread_local bool tEnded = false;

LiveCounter* ClaimCounter() noexcept {
    for (LiveCounter* c = gCounters.load(std::memory_order_acquire); c != nullptr; c = c->next) {
        bool free = false;
        if (!c->taken.load(std::memory_order_relaxed) &&
            c->taken.compare_exchange_strong(free, true, std::memory_order_acquire))
            return c;
    }
    // Never freed, and not from operator new: counting must not fail or throw.
    void* memory = std::malloc(sizeof(LiveCounter));
    if (memory == nullptr) return nullptr;
    auto* c = new (memory) LiveCounter();
    c->next = gCounters.load(std::memory_order_relaxed);
    while (!gCounters.compare_exchange_weak(c->next, c, std::memory_order_release, std::memory_order_relaxed)) {
    }
    return c;
}

// Gives the thread's counter back when the thread ends; objects ended later on this
// thread (by other thread-local destructors) count in gUncounted.
struct CounterRelease {
    ~CounterRelease() {
        LiveCounter* c = tCounter;
        tCounter = nullptr;
        tEnded = true;
        if (c != nullptr) c->taken.store(false, std::memory_order_release);
    }
};

void CountLive(long delta) noexcept {
    if (LiveCounter* c = tCounter) {
        c->count.store(c->count.load(std::memory_order_relaxed) + delta, std::memory_order_relaxed);
        return;
    }
    if (!tEnded) {
        if (LiveCounter* c = ClaimCounter()) {
            tCounter = c;
            thread_local CounterRelease release;
            (void)release;
            c->count.store(c->count.load(std::memory_order_relaxed) + delta, std::memory_order_relaxed);
            return;
        }
    }
    gUncounted.fetch_add(delta, std::memory_order_relaxed);
}

}  // namespace

std::atomic<bool> ObjectImpl::sCountingLive{false};

void ObjectImpl::CountMade() noexcept {
    _counted = true;
    CountLive(1);
}

void ObjectImpl::CountEnded() noexcept { CountLive(-1); }

void* ObjectImpl::operator new(std::size_t size) { return Memory::Allocate(size); }

void ObjectImpl::operator delete(void* p) noexcept { Memory::Free(p); }

long ObjectImpl::LiveObjects() noexcept {
    sCountingLive.store(true, std::memory_order_relaxed);
    long live = gUncounted.load(std::memory_order_relaxed);
    for (LiveCounter* c = gCounters.load(std::memory_order_acquire); c != nullptr; c = c->next)
        live += c->count.load(std::memory_order_relaxed);
    return live;
}

void ObjectImpl::Destroy() const {
    _refCount.store(0, std::memory_order_relaxed);
    auto* self = const_cast<ObjectImpl*>(this);
    self->FinalDecRef(typeid(*this));
    delete self;
}

void ObjectImpl::ReleasedTooOften() { PanicAssert("_refCount > 0", "kernite/Object", __LINE__); }

int ObjectImpl::GetRefCount() const { return _refCount.load(std::memory_order_relaxed); }

std::string ObjectImpl::ToString() const {
    const char* mangled = typeid(*this).name();
    int status = 0;
    std::unique_ptr<char, void (*)(void*)> demangled(abi::__cxa_demangle(mangled, nullptr, nullptr, &status),
                                                     std::free);
    char address[32];
    std::snprintf(address, sizeof address, "@%p", static_cast<const void*>(this));
    return std::string(status == 0 && demangled ? demangled.get() : mangled) + address;
}

void ObjectImpl::FirstIncRef(const std::type_info&) {}
void ObjectImpl::FinalDecRef(const std::type_info&) {}

} // namespace Kernite
