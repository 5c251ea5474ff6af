// Data objects: records with properties that the runtime reaches through their
// type's record functions. Generated classes derive from DynamicData (or from
// MethodFault for faults) and add one member per property.
#pragma once

#include <string>

#include "kernite/Exception.h"
#include "kernite/Ref.h"
#include "orbit/Any.h"
#include "orbit/Array.h"
#include "orbit/Type.h"

namespace Orbit {

class DataObject : public Any {
public:
    virtual DataObjectType* _GetDataType() const = 0;
    // Property by property through the record functions of the whole base chain:
    // equal when `other` has the same data type and every property is set alike and
    // equal (objects and arrays compared with their own _IsEqual).
    bool _IsEqual(Any* other, bool exact = true) const override;
    // Records "<path>.<property>" for every differing property, recursing into
    // nested data objects; records `path` alone when the types differ.
    void _DiffProperties(Any* other, const std::string& path, PropertyDiffSet& diffs) const override;
};

class DynamicData : public DataObject {
public:
    DynamicData() = default;
    DynamicData(const DynamicData&) = default;

    Type* _GetType() const override;
    DataObjectType* _GetDataType() const override;
    unsigned int _GetSize(SizeFunction f) const override;
    Any* _Clone() const override;
};

class KeyAnyValue;

// The base of every fault: a message, an optional cause and optional data.
class MethodFault : public DynamicData {
public:
    // The exception that carries a fault; it keeps its fault alive.
    class Exception : public Kernite::Exception {
    public:
        Exception(const std::string& message, MethodFault* fault);
        Exception(const Exception&) = default;
        ~Exception() override;

        MethodFault* GetFault() const noexcept { return _fault.Get(); }

        Exception* Clone() const override;
        [[noreturn]] void Throw() const override;

    private:
        Kernite::Ref<MethodFault> _fault;
    };

    MethodFault() = default;
    MethodFault(const MethodFault& other);
    MethodFault(const std::string& msg, MethodFault* faultCause, DataArray<KeyAnyValue>* faultData);
    ~MethodFault() override;

    const std::string& GetMsg() const noexcept { return _msg; }
    void SetMsg(const std::string& msg) { _msg = msg; }
    MethodFault* GetFaultCause() const noexcept { return _faultCause.Get(); }
    void SetFaultCause(MethodFault* cause);
    DataArray<KeyAnyValue>* GetFaultData() const;
    void SetFaultData(DataArray<KeyAnyValue>* data);

    Type* _GetType() const override;
    DataObjectType* _GetDataType() const override;
    unsigned int _GetSize(SizeFunction f) const override;
    Any* _Clone() const override;

    // Throws an Exception reporting this fault; its message is the fault type's name.
    [[noreturn]] virtual void Throw();
    // The same exception on the heap; the caller owns it.
    virtual Exception* CreateException();

private:
    std::string _msg;
    Kernite::Ref<MethodFault> _faultCause;
    ArrayField<DataArray<KeyAnyValue>> _faultData;
};

// A key and any value.
class KeyAnyValue : public DynamicData {
public:
    KeyAnyValue() = default;
    KeyAnyValue(const KeyAnyValue& other);
    KeyAnyValue(const std::string& key, Any* value);
    ~KeyAnyValue() override;

    const std::string& GetKey() const noexcept { return _key; }
    void SetKey(const std::string& key) { _key = key; }
    Any* GetValue() const noexcept { return _value.Get(); }
    void SetValue(Any* value);

    Type* _GetType() const override;
    DataObjectType* _GetDataType() const override;
    unsigned int _GetSize(SizeFunction f) const override;
    Any* _Clone() const override;

private:
    std::string _key;
    Kernite::Ref<Any> _value;
};

}  // namespace Orbit
