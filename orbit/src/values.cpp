#include <algorithm>
#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <string_view>
#include <typeinfo>
#include <unordered_set>

#include "kernite/Assert.h"
#include "kernite/Memory.h"
#include "orbit/Any.h"
#include "orbit/Array.h"
#include "orbit/DataObject.h"
#include "orbit/Type.h"

namespace Orbit {
namespace {

// Same class, or both data objects when the comparison is not exact; anything else
// differs without asking the item (boxes of another type would throw).
bool Comparable(const Any* a, const Any* b, bool exact) {
    if (typeid(*a) == typeid(*b)) return true;
    return !exact && dynamic_cast<const DataObject*>(a) != nullptr && dynamic_cast<const DataObject*>(b) != nullptr;
}

}  // namespace

unsigned int GetPrimitiveExtraSize(const MethodName& value) { return GetPrimitiveExtraSize(value.GetName()); }

unsigned int GetExtraSize(const std::vector<std::string>& items, SizeFunction f) {
    unsigned int size = f(static_cast<unsigned int>(items.capacity() * sizeof(std::string)));
    for (const std::string& item : items)
        if (unsigned int extra = GetPrimitiveExtraSize(item)) size += f(extra);
    return size;
}

// Type names of managed object references: a fixed open-addressed table read without
// a lock, slots filled once by compare-and-swap and never emptied; names beyond it
// (a process would need thousands of managed types) go to a locked set. The names
// are never freed: every reference may point to them for the life of the process.
namespace {

constexpr std::size_t kTypeNameSlots = 4096;  // a power of two
constexpr std::size_t kTypeNameProbes = 32;
std::atomic<const std::string*> gTypeNames[kTypeNameSlots];

struct MoreTypeNames {
    std::mutex mutex;
    std::unordered_set<std::string> names;  // nodes do not move
};

const std::string* InternBeyondTable(std::string_view type) {
    static auto* more = new MoreTypeNames();
    std::lock_guard<std::mutex> lock(more->mutex);
    return &*more->names.emplace(type).first;
}

}  // namespace

const std::string* MoRef::InternTypeName(std::string_view type) {
    const std::size_t hash = std::hash<std::string_view>{}(type);
    for (std::size_t probe = 0; probe < kTypeNameProbes; ++probe) {
        std::atomic<const std::string*>& slot = gTypeNames[(hash + probe) & (kTypeNameSlots - 1)];
        const std::string* held = slot.load(std::memory_order_acquire);
        if (held == nullptr) {
            auto made = std::make_unique<std::string>(type);
            if (slot.compare_exchange_strong(held, made.get(), std::memory_order_acq_rel, std::memory_order_acquire))
                return made.release();
            // Another thread filled the slot first; `held` is its name.
        }
        if (*held == type) return held;
    }
    return InternBeyondTable(type);
}

Type* MoRef::_GetType() const { return Orbit::GetType<MoRef>(); }

// The type name is shared, not held: only the id counts.
unsigned int MoRef::_GetSize(SizeFunction f) const {
    unsigned int size = f(sizeof(MoRef));
    if (unsigned int extra = GetPrimitiveExtraSize(_id)) size += f(extra);
    return size;
}

Any* MoRef::_Clone() const { return new MoRef(*this); }

bool MoRef::_IsEqual(Any* other, bool) const {
    if (other == nullptr) Kernite::PanicAssert("obj", "orbit/MoRef", __LINE__);
    auto* same = dynamic_cast<MoRef*>(other);
    return same != nullptr && *same == *this;
}

void MoRef::_DiffProperties(Any* other, const std::string& path, PropertyDiffSet& diffs) const {
    if (!_IsEqual(other)) diffs.Add(path);
}

std::string MoRef::ToString() const { return *_type + ":" + _id; }

bool DataArrayBase::_IsEqual(Any* other, bool exact) const {
    if (other == nullptr) Kernite::PanicAssert("obj", "orbit/array", __LINE__);
    auto* that = dynamic_cast<DataArrayBase*>(other);
    if (that == nullptr || (exact && that->ArrayClass() != ArrayClass())) return false;
    if (that == this) return true;
    const int n = GetLength();
    if (that->GetLength() != n) return false;
    for (int i = 0; i < n; ++i) {
        Any* a = ItemAt(i);
        Any* b = that->ItemAt(i);
        if (a == nullptr || b == nullptr) {
            if (a != b) return false;
        } else if (!Comparable(a, b, exact) || !a->_IsEqual(b, exact)) {
            return false;
        }
    }
    return true;
}

// Differing items are reported as "<path>[i]", recursing into items of the same class.
void DataArrayBase::_DiffProperties(Any* other, const std::string& path, PropertyDiffSet& diffs) const {
    if (other == nullptr) Kernite::PanicAssert("obj", "orbit/array", __LINE__);
    auto* that = dynamic_cast<DataArrayBase*>(other);
    if (that == nullptr || that->ArrayClass() != ArrayClass() || that->GetLength() != GetLength()) {
        diffs.Add(path);
        return;
    }
    for (int i = 0, n = GetLength(); i < n; ++i) {
        Any* a = ItemAt(i);
        Any* b = that->ItemAt(i);
        const std::string itemPath = path + "[" + std::to_string(i) + "]";
        if (a == nullptr || b == nullptr) {
            if (a != b) diffs.Add(itemPath);
        } else if (typeid(*a) != typeid(*b)) {
            diffs.Add(itemPath);
        } else {
            a->_DiffProperties(b, itemPath, diffs);
        }
    }
}

DataObjectArrayBase::DataObjectArrayBase(const DataObjectArrayBase& other) : DataArrayBase() {
    Reserve(other._size);
    // Cloned one by one, so that a failing clone leaves a consistent array for the
    // destructor to release.
    try {
        for (int i = 0; i < other._size; ++i) {
            Any* clone = other._items[i] ? other._items[i]->_Clone() : nullptr;
            if (clone) clone->IncRefNew();
            _items[_size++] = clone;
        }
    } catch (...) {
        Clear();
        if (_items != _inline) Kernite::Memory::Free(_items);
        throw;
    }
}

DataObjectArrayBase::~DataObjectArrayBase() {
    Clear();
    if (_items != _inline) Kernite::Memory::Free(_items);
}

void DataObjectArrayBase::Clear() {
    // Items are released last to first, and each after it left the array, so that a
    // release that reaches back into this array sees it consistent.
    while (_size > 0) {
        Any* item = _items[--_size];
        if (item) item->DecRef();
    }
}

void DataObjectArrayBase::Grow(int capacity) {
    if (capacity > _capacity) Reallocate(std::max(capacity, _capacity * 2));
}

void DataObjectArrayBase::Reallocate(int capacity) {
    auto** items = static_cast<Any**>(Kernite::Memory::Allocate(sizeof(Any*) * static_cast<std::size_t>(capacity)));
    std::copy(_items, _items + _size, items);
    if (_items != _inline) Kernite::Memory::Free(_items);
    _items = items;
    _capacity = capacity;
}

void DataObjectArrayBase::RemoveAt(int index) {
    CheckIndex(index);
    Any* removed = _items[index];
    std::copy(_items + index + 1, _items + _size, _items + index);
    --_size;
    if (removed) removed->DecRef();
}

void DataObjectArrayBase::Reserve(int capacity) {
    if (capacity < 0) Kernite::PanicAssert("capacity >= 0", "orbit/array", __LINE__);
    if (capacity > _capacity) Reallocate(capacity);
}

// The inline items are part of the object; a separate block counts on its own.
unsigned int DataObjectArrayBase::_GetSize(SizeFunction f) const {
    unsigned int size = sizeof(DataObjectArrayBase);
    if (_items != _inline) size += f(static_cast<unsigned int>(sizeof(Any*) * static_cast<std::size_t>(_capacity)));
    for (int i = 0; i < _size; ++i)
        if (_items[i]) size += _items[i]->_GetSize(f);
    return size;
}

void DataObjectArrayBase::SetAtInt(int index, Any* item) {
    CheckIndex(index);
    if (item) item->IncRef();
    Any* old = _items[index];
    _items[index] = item;
    if (old) old->DecRef();
}

void DataObjectArrayBase::InsertAtInt(int index, Any* item) {
    if (!(0 <= index && index <= _size))
        Kernite::PanicAssert("0 <= index && index <= (int)_vec.size()", "orbit/array", __LINE__);
    if (_size == _capacity) Grow(_size + 1);
    std::copy_backward(_items + index, _items + _size, _items + _size + 1);
    if (item) item->IncRef();
    _items[index] = item;
    ++_size;
}

}  // namespace Orbit
