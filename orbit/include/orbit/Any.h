// Values: the reference-counted base of everything the runtime can hold, box,
// copy, measure and compare.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "kernite/Object.h"
#include "kernite/Ref.h"

namespace Orbit {

class Type;

// Maps a requested allocation size to what the allocator really consumes.
using SizeFunction = unsigned int (*)(unsigned int);

// The paths of the properties that differ between two values.
class PropertyDiffSet {
public:
    void Add(const std::string& path) { _paths.push_back(path); }
    const std::vector<std::string>& GetPaths() const noexcept { return _paths; }
    bool IsEmpty() const noexcept { return _paths.empty(); }

private:
    std::vector<std::string> _paths;
};

class Any : public Kernite::ObjectImpl {
public:
    virtual Type* _GetType() const = 0;
    // The memory this value holds, itself included, each allocation mapped by f.
    // A copy of a data object measures the same as its source, less the empty
    // arrays that reads installed in the source: the copy leaves those out (see
    // ArrayField).
    virtual unsigned int _GetSize(SizeFunction f) const = 0;
    // A deep copy, unreferenced (the caller takes the first reference). Immutable
    // values may return themselves.
    virtual Any* _Clone() const = 0;
    // Value equality. `other` must not be null.
    virtual bool _IsEqual(Any* other, bool exact = true) const = 0;
    // Appends to `diffs` the paths below `path` whose values differ.
    virtual void _DiffProperties(Any* other, const std::string& path, PropertyDiffSet& diffs) const = 0;
};

// The name of a method as a value ("tarn.DebugManager.markLogs").
class MethodName {
public:
    MethodName() = default;
    explicit MethodName(std::string name) : _name(std::move(name)) {}
    const std::string& GetName() const noexcept { return _name; }
    friend bool operator==(const MethodName& a, const MethodName& b) { return a._name == b._name; }
    friend auto operator<=>(const MethodName& a, const MethodName& b) { return a._name <=> b._name; }

private:
    std::string _name;
};

// A reference to a managed object: its type's wire name and its id. The type name
// is kept once per process and shared by every reference of that type, so copying
// a reference copies only its id.
class MoRef : public Any {
public:
    MoRef(std::string_view type, std::string id) : _type(InternTypeName(type)), _id(std::move(id)) {}
    MoRef(const MoRef&) = default;

    const std::string& GetType() const noexcept { return *_type; }
    const std::string& GetId() const noexcept { return _id; }

    Type* _GetType() const override;
    unsigned int _GetSize(SizeFunction f) const override;
    Any* _Clone() const override;
    bool _IsEqual(Any* other, bool exact = true) const override;
    void _DiffProperties(Any* other, const std::string& path, PropertyDiffSet& diffs) const override;
    std::string ToString() const override;

    // Equal type names are one and the same string.
    friend bool operator==(const MoRef& a, const MoRef& b) { return a._type == b._type && a._id == b._id; }

private:
    // The process's one copy of `type`, made on first use and never freed.
    static const std::string* InternTypeName(std::string_view type);

    const std::string* _type;
    std::string _id;
};

// Arrays of any kind.
class Collection : public Any {
public:
    virtual bool IsEmpty() const = 0;
    virtual int GetLength() const = 0;
    // Removes every item; the array object stays, so its holders see it emptied.
    virtual void Clear() = 0;
};

// The heap memory a string holds beyond its own object: zero while its text fits
// inside the object.
inline unsigned int GetPrimitiveExtraSize(const std::string& value) {
    const auto object = reinterpret_cast<std::uintptr_t>(&value);
    const auto text = reinterpret_cast<std::uintptr_t>(value.data());
    if (text >= object && text < object + sizeof(std::string)) return 0;
    return static_cast<unsigned int>(value.capacity() + 1);
}
unsigned int GetPrimitiveExtraSize(const MethodName& value);
// The item storage of a string vector plus each string's heap memory, mapped by f.
unsigned int GetExtraSize(const std::vector<std::string>& items, SizeFunction f);

}  // namespace Orbit
