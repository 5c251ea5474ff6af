// Owning smart pointers over Kernite objects.
#pragma once

#include <cstddef>
#include <utility>
#include <vector>

namespace Kernite {

// Holds one reference: IncRef on taking, DecRef on releasing or replacing. The new
// reference is always taken before the old one is released, so assigning an
// object to the Ref that already holds it is safe.
template <class T>
class Ref {
public:
    Ref() noexcept = default;
    Ref(std::nullptr_t) noexcept {}
    Ref(T* p) noexcept : _p(p) { if (_p) _p->IncRef(); }
    Ref(const Ref& other) noexcept : Ref(other._p) {}
    Ref(Ref&& other) noexcept : _p(other._p) { other._p = nullptr; }
    template <class U>
    Ref(const Ref<U>& other) noexcept : Ref(other.Get()) {}
    template <class U>
    Ref(Ref<U>&& other) noexcept : _p(other.Release()) {}
    ~Ref() { if (_p) _p->DecRef(); }

    Ref& operator=(T* p) noexcept {
        if (p) p->IncRef();
        T* old = _p;
        _p = p;
        if (old) old->DecRef();
        return *this;
    }
    Ref& operator=(const Ref& other) noexcept { return *this = other._p; }
    Ref& operator=(Ref&& other) noexcept {
        if (this != &other) {
            T* old = _p;
            _p = other._p;
            other._p = nullptr;
            if (old) old->DecRef();
        }
        return *this;
    }
    template <class U>
    Ref& operator=(const Ref<U>& other) noexcept { return *this = other.Get(); }
    Ref& operator=(std::nullptr_t) noexcept { Reset(); return *this; }

    T* Get() const noexcept { return _p; }
    T* operator->() const noexcept { return _p; }
    T& operator*() const noexcept { return *_p; }
    explicit operator bool() const noexcept { return _p != nullptr; }

    void Reset() noexcept {
        T* old = _p;
        _p = nullptr;
        if (old) old->DecRef();
    }
    // Gives up the reference without releasing it; the caller now owns it.
    [[nodiscard]] T* Release() noexcept {
        T* p = _p;
        _p = nullptr;
        return p;
    }
    // Takes over a reference the caller already owns (no IncRef).
    static Ref Adopt(T* p) noexcept {
        Ref r;
        r._p = p;
        return r;
    }

    friend bool operator==(const Ref& a, const Ref& b) noexcept { return a._p == b._p; }
    friend bool operator==(const Ref& a, std::nullptr_t) noexcept { return a._p == nullptr; }
    friend bool operator==(const Ref& a, const T* b) noexcept { return a._p == b; }

private:
    T* _p = nullptr;
};

// The argument vector of an invocation: n empty references to start with.
template <class T>
class RefVector : public std::vector<Ref<T>> {
public:
    RefVector() = default;
    explicit RefVector(unsigned n) : std::vector<Ref<T>>(n) {}
};

// A Ref meant to live in a static: set once, read from anywhere afterwards.
template <class T>
class SingletonRef {
public:
    SingletonRef() noexcept = default;
    explicit SingletonRef(T* p) noexcept : _ref(p) {}
    T* Get() const noexcept { return _ref.Get(); }
    T* operator->() const noexcept { return _ref.Get(); }
    void Set(T* p) noexcept { _ref = p; }

private:
    Ref<T> _ref;
};

} // namespace Kernite
