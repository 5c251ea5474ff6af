// Enumeration types: tags and their values (a tag's position in the tag table).
#pragma once

#include <boost/functional/hash.hpp>
#include <boost/unordered_map.hpp>
#include <string>
#include <string_view>
#include <vector>

#include "kernite/Exception.h"
#include "kernite/Narrow.h"
#include "kernite/Ref.h"
#include "orbit/Array.h"
#include "orbit/Primitive.h"
#include "orbit/Type.h"

namespace Orbit {

class EnumType : public virtual Type {
public:
    virtual void GetEnumTags(std::vector<std::string>& out) const = 0;
    // Unknown tags throw Kernite::InvalidArgumentException ("Invalid argument : <tag>").
    virtual int GetValue(const std::string& tag) const = 0;
    virtual bool HasValue(const std::string& tag) const = 0;
    // Values outside 0 .. tags-1 throw ("Invalid argument : <value>").
    virtual const std::string& GetTag(int value) const = 0;
    virtual const std::string& EnumToString(Any* value) const = 0;
    virtual void StringToEnum(const std::string& tag, Kernite::Ref<Any>& out) const = 0;
    virtual void EnumArrayToStringArray(Any* values, Kernite::Ref<Array<std::string>>& out) const = 0;
    virtual void StringArrayToEnumArray(Array<std::string>* tags, Kernite::Ref<Any>& out) const = 0;
    virtual void CreateArrayInstance(Kernite::Ref<Any>& out) const = 0;

    // The non-throwing look-ups, for callers that expect unknown input (a decoder
    // reading someone else's text): -1 for a tag that is not one, null for a value
    // outside 0 .. tags-1. Neither is virtual nor allocates: a value is an index,
    // and a few tags are compared faster than one is hashed.
    int FindValue(std::string_view tag) const noexcept {
        if (_tagCount > kScannedTags) return FindHashed(tag);
        for (int i = 0; i < _tagCount; ++i)
            if (_tagList[i] == tag) return i;
        return -1;
    }
    const std::string* FindTag(int value) const noexcept {
        return static_cast<unsigned>(value) < static_cast<unsigned>(_tagCount) ? &_tagList[value] : nullptr;
    }

protected:
    static constexpr int kScannedTags = 8;
    // Called once by the implementation's constructor: `tags` in value order, kept
    // alive by the implementation for the type's life.
    void SetTagList(const std::string* tags, int count) noexcept {
        _tagList = tags;
        _tagCount = count;
    }
    // Beyond kScannedTags: the implementation's hash map, without making a string.
    virtual int FindHashed(std::string_view tag) const noexcept = 0;

private:
    const std::string* _tagList = nullptr;
    int _tagCount = 0;
};

// Built once from the enumeration's record; read-only afterwards, so any thread may
// use it without locking.
template <class E>
class EnumTypeImpl : public TypeImpl, public virtual EnumType {
public:
    explicit EnumTypeImpl(const EnumTypeInfo* record) : TypeImpl(record->header) {
        for (int i = 0; record->tags[i] != nullptr; ++i) {
            std::string tag(record->tags[i]);
            _values[tag] = i;
            _tags.push_back(std::move(tag));
        }
        SetTagList(_tags.data(), static_cast<int>(_tags.size()));
    }

    void GetEnumTags(std::vector<std::string>& out) const override { out = _tags; }
    int GetValue(const std::string& tag) const override {
        auto it = _values.find(tag);
        if (it == _values.end()) throw Kernite::InvalidArgumentException(tag);
        return it->second;
    }
    bool HasValue(const std::string& tag) const override { return _values.find(tag) != _values.end(); }
    const std::string& GetTag(int value) const override {
        if (value < 0 || value >= static_cast<int>(_tags.size()))
            throw Kernite::InvalidArgumentException(value);
        return _tags[value];
    }
    const std::string& EnumToString(Any* value) const override {
        auto* box = Kernite::NarrowToType<Primitive<E>, Any>(value);
        if (box == nullptr) throw Kernite::InvalidArgumentException(std::string("null"));
        return GetTag(static_cast<int>(box->GetValue()));
    }
    void StringToEnum(const std::string& tag, Kernite::Ref<Any>& out) const override {
        out = new Primitive<E>(static_cast<E>(GetValue(tag)));
    }
    void EnumArrayToStringArray(Any* values, Kernite::Ref<Array<std::string>>& out) const override {
        auto* array = Kernite::NarrowToType<Array<E>, Any>(values);
        if (array == nullptr) throw Kernite::InvalidArgumentException(std::string("null"));
        const auto& items = array->GetItems();
        Kernite::Ref<Array<std::string>> strings(new Array<std::string>(items.size()));
        for (std::size_t i = 0; i < items.size(); ++i)
            strings->GetItems()[i] = GetTag(static_cast<int>(items[i]));
        out = std::move(strings);
    }
    void StringArrayToEnumArray(Array<std::string>* tags, Kernite::Ref<Any>& out) const override {
        if (tags == nullptr) throw Kernite::InvalidArgumentException(std::string("null"));
        const auto& names = tags->GetItems();
        Kernite::Ref<Array<E>> values(new Array<E>(names.size()));
        for (std::size_t i = 0; i < names.size(); ++i)
            values->GetItems()[i] = static_cast<E>(GetValue(names[i]));
        out = std::move(values);
    }
    void CreateArrayInstance(Kernite::Ref<Any>& out) const override { out = new Array<E>(); }

protected:
    int FindHashed(std::string_view tag) const noexcept override {
        // boost::hash of a string is hash_range over its characters, so a view hashes alike.
        auto it = _values.find(tag, [](std::string_view t) { return boost::hash_range(t.begin(), t.end()); },
                               [](std::string_view a, const std::string& b) { return a == b; });
        return it == _values.end() ? -1 : it->second;
    }

private:
    boost::unordered_map<std::string, int> _values;
    std::vector<std::string> _tags;
};

// The type object of an enumeration, made once by its GetType<E>().
template <class E>
Type* CreateEnumType(const EnumTypeInfo* record) {
    auto* type = new EnumTypeImpl<E>(record);
    Kernite::Ref<TypeImpl> guard(type);  // released if registration throws
    RegisterCreatedType(type);
    return type;
}

}  // namespace Orbit
