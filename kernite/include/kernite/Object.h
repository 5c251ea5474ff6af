// Reference-counted objects: the root of every value, array, type and stub.
//
// Ownership: an object starts with a count of zero. Whoever keeps a pointer takes
// a reference (IncRef, usually through Ref<T>); the last DecRef deletes it. A
// factory that returns a raw new object (for example `_Clone()`) hands the first
// reference to the caller, who takes it by storing the pointer in a Ref.
#pragma once

#include <atomic>
#include <cstddef>
#include <string>
#include <typeinfo>

namespace Kernite {

class Object {
public:
    virtual void IncRef() const = 0;
    virtual void DecRef() const = 0;
    virtual std::string ToString() const = 0;
    virtual int GetRefCount() const = 0;

protected:
    virtual ~Object() = default;
};

class ObjectImpl : public virtual Object {
public:
    // Final and inline: wherever the class is known to be built on ObjectImpl the
    // count is changed in place, without a virtual call; the hooks below are where a
    // class adds its own behaviour.
    void IncRef() const final {
        if (_refCount.fetch_add(1, std::memory_order_relaxed) == 0)
            const_cast<ObjectImpl*>(this)->FirstIncRef(typeid(*this));
    }
    void DecRef() const final {
        // Whoever holds the only reference is the only one who may still reach the
        // object, so the last release needs no read-modify-write.
        if (_refCount.load(std::memory_order_acquire) == 1) return Destroy();
        const int previous = _refCount.fetch_sub(1, std::memory_order_acq_rel);
        if (previous == 1) Destroy();
        else if (previous <= 0) ReleasedTooOften();
    }
    // Takes the first reference of an object that only its maker can reach yet, such
    // as a clone just made, without a read-modify-write. An object that already has
    // references (an immutable value may be its own clone) takes a plain IncRef.
    void IncRefNew() const {
        if (_refCount.load(std::memory_order_relaxed) != 0) return IncRef();
        _refCount.store(1, std::memory_order_relaxed);
        const_cast<ObjectImpl*>(this)->FirstIncRef(typeid(*this));
    }
    std::string ToString() const override;
    int GetRefCount() const override;

    // Number of ObjectImpl instances made since counting began and still alive;
    // tests use it to prove that nothing leaks. Counting begins with the first call,
    // so a process that never asks pays a load and a branch per object for it, and
    // objects made before that call are not counted, not even when they end: ask
    // once before what is measured, then compare.
    static long LiveObjects() noexcept;

    // Objects take their memory from Kernite::Memory (kernite/Memory.h).
    static void* operator new(std::size_t size);
    static void operator delete(void* p) noexcept;
    // Construction in storage of the caller's, which the class-level forms would hide.
    static void* operator new(std::size_t, void* where) noexcept { return where; }
    static void operator delete(void*, void*) noexcept {}

protected:
    ObjectImpl() noexcept {
        if (sCountingLive.load(std::memory_order_relaxed)) CountMade();
    }
    // A copy is a new object: it starts unreferenced whatever the source's count.
    ObjectImpl(const ObjectImpl&) noexcept : Object() {
        if (sCountingLive.load(std::memory_order_relaxed)) CountMade();
    }
    ObjectImpl& operator=(const ObjectImpl&) = delete;
    ~ObjectImpl() override {
        if (_counted) CountEnded();
    }

    // Hooks on the first reference taken and on the last released (just before
    // deletion); the default does nothing.
    virtual void FirstIncRef(const std::type_info& type);
    virtual void FinalDecRef(const std::type_info& type);

private:
    // Runs the last-release hook and deletes the object.
    void Destroy() const;
    [[noreturn]] static void ReleasedTooOften();
    void CountMade() noexcept;
    void CountEnded() noexcept;

    static std::atomic<bool> sCountingLive;

    mutable std::atomic<int> _refCount{0};
    // Whether this object is in the live count (it was made while counting).
    bool _counted = false;
};

} // namespace Kernite
