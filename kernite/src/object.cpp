#include "kernite/Object.h"

#include <cxxabi.h>

#include <cstdio>
#include <cstdlib>
#include <memory>

#include "kernite/Assert.h"

namespace Kernite {
namespace {
std::atomic<long> gLiveObjects{0};
}

ObjectImpl::ObjectImpl() noexcept { gLiveObjects.fetch_add(1, std::memory_order_relaxed); }

ObjectImpl::ObjectImpl(const ObjectImpl&) noexcept : Object() {
    gLiveObjects.fetch_add(1, std::memory_order_relaxed);
}

ObjectImpl::~ObjectImpl() { gLiveObjects.fetch_sub(1, std::memory_order_relaxed); }

long ObjectImpl::LiveObjects() noexcept { return gLiveObjects.load(std::memory_order_relaxed); }

void ObjectImpl::IncRef() const {
    if (_refCount.fetch_add(1, std::memory_order_relaxed) == 0)
        const_cast<ObjectImpl*>(this)->FirstIncRef(typeid(*this));
}

void ObjectImpl::DecRef() const {
    const int previous = _refCount.fetch_sub(1, std::memory_order_acq_rel);
    if (previous == 1) {
        auto* self = const_cast<ObjectImpl*>(this);
        self->FinalDecRef(typeid(*this));
        delete self;
    } else if (previous <= 0) {
        PanicAssert("_refCount > 0", "kernite/Object", __LINE__);
    }
}

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
