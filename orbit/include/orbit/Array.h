// Arrays: of values (Array<T>), and of objects (DataArray<T>, items held by
// reference, possibly null). ArrayField<A> is how a data object holds an array
// property: empty until first needed, installed and replaced atomically.
#pragma once

#include <atomic>
#include <initializer_list>
#include <string>
#include <type_traits>
#include <vector>

#include "kernite/Assert.h"
#include "kernite/Narrow.h"
#include "kernite/Ref.h"
#include "orbit/Any.h"
#include "orbit/Type.h"

namespace Orbit {

class DataObject;

template <class T>
class Array : public Collection {
public:
    Array() = default;
    explicit Array(std::size_t n) : _vec(n) {}
    Array(std::initializer_list<T> items) : _vec(items) {}
    explicit Array(std::vector<T> items) : _vec(std::move(items)) {}
    Array(const Array& other) : Collection(), _vec(other._vec) {}

    const std::vector<T>& GetItems() const noexcept { return _vec; }
    std::vector<T>& GetItems() noexcept { return _vec; }
    const T& GetAt(int index) const {
        if (!(0 <= index && index < (int)_vec.size()))
            Kernite::PanicAssert("0 <= index && index < (int)_vec.size()", "orbit/array", __LINE__);
        return _vec[index];
    }
    void Append(const T& item) { _vec.push_back(item); }

    bool IsEmpty() const final { return _vec.empty(); }
    int GetLength() const final { return static_cast<int>(_vec.size()); }
    void Clear() override { _vec.clear(); }

    Type* _GetType() const override { return GetType<T>()->GetArrayType(); }
    Any* _Clone() const override { return new Array(*this); }
    unsigned int _GetSize(SizeFunction f) const override {
        unsigned int size = sizeof(Array);
        if constexpr (std::is_same_v<T, std::string>) {
            size += GetExtraSize(_vec, f);
        } else if constexpr (std::is_same_v<T, bool>) {
            size += f(static_cast<unsigned int>((_vec.capacity() + 7) / 8));
        } else {
            size += f(static_cast<unsigned int>(_vec.capacity() * sizeof(T)));
        }
        return size;
    }
    bool _IsEqual(Any* other, bool = true) const override {
        if (other == nullptr) Kernite::PanicAssert("obj", "orbit/array", __LINE__);
        auto* same = dynamic_cast<Array*>(other);
        return same != nullptr && same->_vec == _vec;
    }
    void _DiffProperties(Any* other, const std::string& path, PropertyDiffSet& diffs) const override {
        if (other == nullptr) Kernite::PanicAssert("obj", "orbit/array", __LINE__);
        auto* same = dynamic_cast<Array*>(other);
        if (same == nullptr || same->_vec != _vec) diffs.Add(path);
    }

private:
    std::vector<T> _vec;
};

// Arrays of objects compare item by item.
class DataArrayBase : public Collection {
public:
    bool _IsEqual(Any* other, bool exact = true) const override;
    void _DiffProperties(Any* other, const std::string& path, PropertyDiffSet& diffs) const override;

protected:
    virtual Any* ItemAt(int index) const = 0;
    virtual const std::type_info& ArrayClass() const = 0;
};

// Items are held by reference, possibly null. The first kInlineItems live inside
// the array object, so a small array is one allocation; four make the object 64
// bytes, one cache line. Larger arrays keep their items in a separate block.
class DataObjectArrayBase : public DataArrayBase {
public:
    static constexpr int kInlineItems = 4;

    DataObjectArrayBase() noexcept = default;
    // A copy clones every item (null stays null), so copies share nothing.
    DataObjectArrayBase(const DataObjectArrayBase& other);
    DataObjectArrayBase& operator=(const DataObjectArrayBase&) = delete;
    ~DataObjectArrayBase() override;

    bool IsEmpty() const final { return _size == 0; }
    int GetLength() const final { return _size; }
    void Clear() override;
    // The item at `index`, possibly null, without taking a reference: for readers that
    // do not know the item class.
    Any* GetItem(int index) const {
        CheckIndex(index);
        return _items[index];
    }
    void RemoveAt(int index);
    void Reserve(int capacity);
    unsigned int _GetSize(SizeFunction f) const override;

    // The runtime's entry points: it holds arrays made by a record's createArray()
    // without knowing their item class, so the check against it is virtual.
    virtual void CheckedSetAt(int index, Any* item) = 0;
    virtual void CheckedAppend(Any* item) = 0;
    virtual void CheckedInsertAt(int index, Any* item) = 0;

protected:
    // Unchecked as to class: the typed entry points of DataArray<T> check first.
    void SetAtInt(int index, Any* item);
    void InsertAtInt(int index, Any* item);
    void AppendInt(Any* item) {
        if (_size == _capacity) Grow(_size + 1);
        if (item) item->IncRef();
        _items[_size++] = item;
    }
    Any* ItemAt(int index) const override { return _items[index]; }
    void CheckIndex(int index) const {
        if (!(0 <= index && index < _size))
            Kernite::PanicAssert("0 <= index && index < (int)_vec.size()", "orbit/array", __LINE__);
    }

private:
    // Room for at least `capacity` items, growing geometrically.
    void Grow(int capacity);
    // Moves the items to a separate block of exactly `capacity` (more than held).
    void Reallocate(int capacity);

    Any** _items = _inline;  // each non-null item holds one reference
    int _size = 0;
    int _capacity = kInlineItems;
    Any* _inline[kInlineItems];
};

// Items are T (a data object class, a fault, Orbit::Any or Orbit::MoRef), or null.
template <class T>
class DataArray : public DataObjectArrayBase {
public:
    DataArray() = default;
    DataArray(std::initializer_list<T*> items) {
        Reserve(static_cast<int>(items.size()));
        for (T* item : items) AppendInt(item);
    }
    DataArray(const DataArray& other) : DataObjectArrayBase(other) {}

    T* GetAt(int index) const {
        CheckIndex(index);
        return static_cast<T*>(ItemAt(index));
    }
    // Typed entry points: the class is known, so no check is needed.
    void Append(T* item) { AppendInt(item); }
    void SetAt(int index, T* item) { SetAtInt(index, item); }
    void InsertAt(int index, T* item) { InsertAtInt(index, item); }

    // A non-null item must be a T.
    void CheckedSetAt(int index, Any* item) override {
        CheckIndex(index);
        SetAtInt(index, Checked(item));
    }
    void CheckedAppend(Any* item) override { AppendInt(Checked(item)); }
    void CheckedInsertAt(int index, Any* item) override {
        if (!(0 <= index && index <= GetLength()))
            Kernite::PanicAssert("0 <= index && index <= (int)_vec.size()", "orbit/array", __LINE__);
        InsertAtInt(index, Checked(item));
    }

    Type* _GetItemType() const { return GetType<T>(); }
    DataObjectType* _GetDataItemType() const {
        if constexpr (std::is_base_of_v<DataObject, T>) return GetDoType<T>();
        else return nullptr;
    }
    Type* _GetType() const override { return GetType<T>()->GetArrayType(); }
    Any* _Clone() const override { return new DataArray(*this); }

protected:
    const std::type_info& ArrayClass() const override { return typeid(DataArray); }

private:
    static Any* Checked(Any* item) {
        if (item != nullptr && dynamic_cast<T*>(item) == nullptr)
            Kernite::PanicAssert("__null != p", "orbit/array", __LINE__);
        return item;
    }
};

// One array property of a data object. Empty means "never created"; readers
// through Get() never see that state.
template <class A>
class ArrayField {
public:
    ArrayField() noexcept = default;
    // Takes a reference on `array`; null leaves the field empty.
    explicit ArrayField(A* array) noexcept : _array(array) {
        if (array) array->IncRef();
    }
    // Deep: the other field's array is cloned. An empty array is not: the copy's
    // field stays empty and makes its own array when first read, so an array that a
    // read created costs later copies nothing. On purpose, such a copy's _GetSize is
    // then its source's less that empty array.
    ArrayField(const ArrayField& other) {
        if (A* source = other.Peek(); source != nullptr && !source->IsEmpty()) {
            A* copy = static_cast<A*>(source->_Clone());
            copy->IncRefNew();
            _array.store(copy, std::memory_order_relaxed);
        }
    }
    ArrayField& operator=(const ArrayField&) = delete;
    ~ArrayField() {
        if (A* old = _array.exchange(nullptr, std::memory_order_acq_rel)) old->DecRef();
    }

    // The installed array, or null when none was created yet.
    A* Peek() const noexcept { return _array.load(std::memory_order_acquire); }

    // The installed array, created empty on first use. Racing first readers each
    // create one; the compare-and-swap keeps the first and the others release theirs.
    A* Get() const {
        if (A* current = Peek()) return current;
        A* created = new A();
        created->IncRef();
        A* expected = nullptr;
        if (_array.compare_exchange_strong(expected, created, std::memory_order_acq_rel,
                                           std::memory_order_acquire)) {
            Kernite::FenceAfterInstall();
            return created;
        }
        created->DecRef();
        return expected;
    }

    // A non-null array replaces the installed one. Null empties the installed array
    // in place (it stays installed) and leaves an empty field empty.
    void Set(A* array) {
        if (array == nullptr) {
            if (A* current = Peek()) current->Clear();
            return;
        }
        array->IncRef();
        if (A* old = _array.exchange(array, std::memory_order_acq_rel)) old->DecRef();
    }

    // Installs a new, empty array in place of whatever was there.
    void Reset() { Set(new A()); }

private:
    mutable std::atomic<A*> _array{nullptr};
};

}  // namespace Orbit
