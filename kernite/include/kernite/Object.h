// Reference-counted objects: the root of every value, array, type and stub.
//
// Ownership: an object starts with a count of zero. Whoever keeps a pointer takes
// a reference (IncRef, usually through Ref<T>); the last DecRef deletes it. A
// factory that returns a raw new object (for example `_Clone()`) hands the first
// reference to the caller, who takes it by storing the pointer in a Ref.
#pragma once

#include <atomic>
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
    void IncRef() const override;
    void DecRef() const override;
    std::string ToString() const override;
    int GetRefCount() const override;

    // Number of ObjectImpl instances alive in the process; tests use it to prove
    // that nothing leaks.
    static long LiveObjects() noexcept;

protected:
    ObjectImpl() noexcept;
    // A copy is a new object: it starts unreferenced whatever the source's count.
    ObjectImpl(const ObjectImpl&) noexcept;
    ObjectImpl& operator=(const ObjectImpl&) = delete;
    ~ObjectImpl() override;

    // Hooks on the first reference taken and on the last released (just before
    // deletion); the default does nothing.
    virtual void FirstIncRef(const std::type_info& type);
    virtual void FinalDecRef(const std::type_info& type);

private:
    mutable std::atomic<int> _refCount{0};
};

} // namespace Kernite
