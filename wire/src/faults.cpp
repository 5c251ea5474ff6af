#include "orbit/wire/Faults.h"

#include <type_traits>

#include "orbit/Dispatch.h"
#include "orbit/Registry.h"
#include "schema.h"

namespace Orbit::Wire {
namespace {

// The version every API version sees.
constexpr const char* kVersion = kNoneVersion;

void NoGet(DataObject*, int, void*) {}
void NoSet(DataObject*, int, const void*) {}
bool AlwaysSet(DataObject*, int) { return true; }
void NoUnset(DataObject*, int) {}

constexpr PropertyInfo kNoProperties[] = {{nullptr, nullptr, 0, nullptr, Flag::End, nullptr}};
constexpr PropertyInfo kInvalidRequestProperties[] = {
    {"path", nullptr, 0, &gStringTypeInfo, 0, kVersion},
    {nullptr, nullptr, 0, nullptr, Flag::End, nullptr},
};

void GetPath(DataObject* object, int index, void* value) {
    auto* fault = NarrowTarget<InvalidRequest, DataObject>(object);
    if (index == 0) WriteValue<std::string>(value) = fault->GetPath();
}

void SetPath(DataObject* object, int index, const void* value) {
    auto* fault = NarrowTarget<InvalidRequest, DataObject>(object);
    if (index == 0) fault->SetPath(ReadValue<std::string>(value));
}

bool IsPathSet(DataObject* object, int) {
    NarrowTarget<InvalidRequest, DataObject>(object);
    return true;
}

const TypeInfo kInvalidRequestHeader{Kind::Fault, "strata.wire.InvalidRequest", "StrataWireInvalidRequest", kVersion};

DataObject* NewInvalidRequest() { return new InvalidRequest(); }
Any* NewInvalidRequestArray() { return new DataArray<InvalidRequest>(); }

const DataTypeInfo kInvalidRequestRecord{&kInvalidRequestHeader, &gStrataMethodFaultTypeInfo,
                                         kInvalidRequestProperties, GetPath, SetPath, IsPathSet, NoUnset,
                                         NewInvalidRequest, NewInvalidRequestArray};

// The records of one kind: its header names it; its base is InvalidRequest for the
// refused messages and MethodFault for the others.
template <class F>
struct KindRecord {
    static const TypeInfo header;
    static DataObject* Create() { return new F(); }
    static Any* CreateArray() { return new DataArray<F>(); }
    static constexpr DataTypeInfo record{
        &header, std::is_base_of_v<InvalidRequest, F> ? &kInvalidRequestHeader : &gStrataMethodFaultTypeInfo,
        kNoProperties, NoGet, NoSet, AlwaysSet, NoUnset, Create, CreateArray};
};

#define ORBIT_WIRE_KIND(Name, Base)                                                                 \
    template <>                                                                                     \
    const TypeInfo KindRecord<Name>::header{Kind::Fault, "strata.wire." #Name, "StrataWire" #Name, \
                                            kVersion};
ORBIT_WIRE_FAULT_KINDS(ORBIT_WIRE_KIND)
#undef ORBIT_WIRE_KIND

}  // namespace

void RegisterFaultTypes() {
    static const bool registered = [] {
        TypeMap* map = GetTypeMap();
#define ORBIT_WIRE_TYPE(Name, Base) GetType<Name>(),
        for (Type* type : {GetType<InvalidRequest>(), ORBIT_WIRE_FAULT_KINDS(ORBIT_WIRE_TYPE)})
#undef ORBIT_WIRE_TYPE
            map->AddType(type);
        return true;
    }();
    (void)registered;
}

bool IsClientFault(const MethodFault& fault) {
    return dynamic_cast<const InvalidRequest*>(&fault) != nullptr ||
           dynamic_cast<const NotAuthenticated*>(&fault) != nullptr ||
           dynamic_cast<const NotAuthorized*>(&fault) != nullptr;
}

InvalidRequest::Exception* InvalidRequest::Exception::Clone() const { return new Exception(*this); }
void InvalidRequest::Exception::Throw() const { throw *this; }

Type* InvalidRequest::_GetType() const { return GetType<InvalidRequest>(); }
DataObjectType* InvalidRequest::_GetDataType() const { return GetDoType<InvalidRequest>(); }
unsigned int InvalidRequest::_GetSize(SizeFunction f) const {
    return MethodFault::_GetSize(f) - f(sizeof(MethodFault)) + f(sizeof(InvalidRequest)) +
           f(GetPrimitiveExtraSize(_path));
}
Any* InvalidRequest::_Clone() const { return new InvalidRequest(*this); }
void InvalidRequest::Throw() { throw Exception(_GetType()->GetName(), this); }
InvalidRequest::Exception* InvalidRequest::CreateException() { return new Exception(_GetType()->GetName(), this); }

}  // namespace Orbit::Wire

namespace Orbit {

template <> Type* GetType<Wire::InvalidRequest>() {
    static Type* const type = CreateDataObjectType(&Wire::kInvalidRequestRecord);
    return type;
}

#define ORBIT_WIRE_GET_TYPE(Name, Base)                                                \
    template <> Type* GetType<Wire::Name>() {                                          \
        static Type* const type = CreateDataObjectType(&Wire::KindRecord<Wire::Name>::record); \
        return type;                                                                   \
    }
ORBIT_WIRE_FAULT_KINDS(ORBIT_WIRE_GET_TYPE)
#undef ORBIT_WIRE_GET_TYPE

}  // namespace Orbit
