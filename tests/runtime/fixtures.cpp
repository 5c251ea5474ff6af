#include "fixtures.h"

using Kernite::NarrowToType;
using Kernite::Ref;
using Kernite::RefVector;
using Kernite::System::DateTime;
using Orbit::Any;
using Orbit::DataObject;
namespace Flag = Orbit::Flag;
namespace Kind = Orbit::Kind;

namespace {
constexpr const char* kV0 = "strata.version.version0";
constexpr const char* kV1 = "test.version.v1";
constexpr const char* kV2 = "test.version.v2";
constexpr Orbit::PropertyInfo kPropertyEnd{nullptr, nullptr, 0, nullptr, Flag::End, nullptr};
constexpr Orbit::ParamInfo kParamEnd{nullptr, 0, nullptr, Flag::End, nullptr};
}  // namespace

// ---- enumeration ----------------------------------------------------------

namespace Sample {
const char* const COLOR_RED = "red";
const char* const COLOR_GREEN = "green";
const char* const COLOR_BLUE = "blue";
}  // namespace Sample

namespace {
const char* const kColorTags[] = {Sample::COLOR_RED, Sample::COLOR_GREEN, Sample::COLOR_BLUE, nullptr};
}

const Orbit::TypeInfo gTestColorTypeInfo{Kind::Enum, "test.Color", "TestColor", kV1};
const Orbit::EnumTypeInfo gTestColorEnumTypeInfo{&gTestColorTypeInfo, kColorTags};

// ---- test.Shape -----------------------------------------------------------

const Orbit::TypeInfo gTestShapeTypeInfo{Kind::Data, "test.Shape", "TestShape", kV1};
const Orbit::TypeInfo gTestCircleTypeInfo{Kind::Data, "test.Circle", "TestCircle", kV2};
const Orbit::TypeInfo gTestBadRequestTypeInfo{Kind::Fault, "test.BadRequest", "TestBadRequest", kV1};
const Orbit::TypeInfo gTestCalculatorTypeInfo{Kind::Managed, "test.Calculator", "TestCalculator", kV1};
const Orbit::TypeInfo gTestCounterTypeInfo{Kind::Managed, "test.Counter", "TestCounter", kV1};

namespace Sample {

struct ShapeAccess {
    static void Get(DataObject* object, int index, void* value) {
        Shape* s = NarrowToType<Shape, DataObject>(object);
        switch (index) {
            case Shape::kLabel: *static_cast<std::string*>(value) = s->_label; break;
            case Shape::kNote: *static_cast<std::string*>(value) = s->_note.GetValue(); break;
            case Shape::kCount: *static_cast<int*>(value) = s->_count; break;
            case Shape::kWeight: *static_cast<long long*>(value) = s->_weight.GetValue(); break;
            case Shape::kSeen: *static_cast<DateTime*>(value) = s->_seen.GetValue(); break;
            case Shape::kColor: *static_cast<int*>(value) = static_cast<int>(s->_color); break;
            case Shape::kNext: *static_cast<Ref<Any>*>(value) = s->_next.Get(); break;
            case Shape::kExtra: *static_cast<Ref<Any>*>(value) = s->_extra.Get(); break;
            case Shape::kOwner: *static_cast<Ref<Any>*>(value) = s->_owner.Get(); break;
            case Shape::kTags: *static_cast<Ref<Any>*>(value) = s->GetTags(); break;
            case Shape::kChildren: *static_cast<Ref<Any>*>(value) = s->GetChildren(); break;
            default: break;
        }
    }
    static void Set(DataObject* object, int index, const void* value) {
        Shape* s = NarrowToType<Shape, DataObject>(object);
        switch (index) {
            case Shape::kLabel: s->_label = Orbit::ReadValue<std::string>(value); break;
            case Shape::kNote: s->_note = Orbit::ReadValue<std::string>(value); break;
            case Shape::kCount: s->_count = Orbit::ReadValue<int>(value); break;
            case Shape::kWeight: s->_weight = Orbit::ReadValue<long long>(value); break;
            case Shape::kSeen: s->_seen = Orbit::ReadValue<DateTime>(value); break;
            case Shape::kColor: s->_color = static_cast<Color>(Orbit::ReadEnum(value, 3)); break;
            case Shape::kNext: s->SetNext(NarrowToType<Shape, Any>(Orbit::ReadObject(value))); break;
            case Shape::kExtra: s->SetExtra(Orbit::ReadObject(value)); break;
            case Shape::kOwner: s->SetOwner(NarrowToType<Orbit::MoRef, Any>(Orbit::ReadObject(value))); break;
            case Shape::kTags:
                s->SetTags(NarrowToType<Orbit::Array<std::string>, Any>(Orbit::ReadObject(value)));
                break;
            case Shape::kChildren:
                s->SetChildren(NarrowToType<Orbit::DataArray<Shape>, Any>(Orbit::ReadObject(value)));
                break;
            default: break;
        }
    }
    static bool IsSet(DataObject* object, int index) {
        Shape* s = NarrowToType<Shape, DataObject>(object);
        switch (index) {
            case Shape::kNote: return s->_note.IsSet();
            case Shape::kWeight: return s->_weight.IsSet();
            case Shape::kSeen: return s->_seen.IsSet();
            case Shape::kNext: return s->_next != nullptr;
            case Shape::kExtra: return s->_extra != nullptr;
            case Shape::kOwner: return s->_owner != nullptr;
            case Shape::kTags: return s->_tags.Peek() != nullptr && !s->_tags.Peek()->IsEmpty();
            case Shape::kChildren: return s->_children.Peek() != nullptr && !s->_children.Peek()->IsEmpty();
            default: return true;
        }
    }
    static void Unset(DataObject* object, int index) {
        Shape* s = NarrowToType<Shape, DataObject>(object);
        switch (index) {
            case Shape::kNote: s->_note.Reset(); break;
            case Shape::kWeight: s->_weight.Reset(); break;
            case Shape::kSeen: s->_seen.Reset(); break;
            case Shape::kNext: s->SetNext(nullptr); break;
            case Shape::kExtra: s->SetExtra(nullptr); break;
            case Shape::kOwner: s->SetOwner(nullptr); break;
            case Shape::kTags: s->_tags.Reset(); break;
            default: break;
        }
    }
    static DataObject* Create() { return new Shape(); }
    static Any* CreateArray() { return new Orbit::DataArray<Shape>(); }
};

Shape::Shape(const Shape& other)
    : DynamicData(other),
      _label(other._label),
      _note(other._note),
      _count(other._count),
      _weight(other._weight),
      _seen(other._seen),
      _color(other._color),
      _next(Orbit::CloneOf(other._next)),
      _extra(Orbit::CloneOf(other._extra)),
      _owner(Orbit::CloneOf(other._owner)),
      _tags(other._tags),
      _children(other._children) {}

Shape::~Shape() = default;

Orbit::Type* Shape::_GetType() const { return Orbit::GetType<Shape>(); }
Orbit::DataObjectType* Shape::_GetDataType() const { return Orbit::GetDoType<Shape>(); }
Any* Shape::_Clone() const { return new Shape(*this); }

unsigned int Shape::_GetSize(Orbit::SizeFunction f) const {
    unsigned int size = DynamicData::_GetSize(f) - f(sizeof(DynamicData)) + f(sizeof(Shape));
    size += f(Orbit::GetPrimitiveExtraSize(_label));
    if (_note.IsSet())
        size += f(sizeof(std::string)) + f(Orbit::GetPrimitiveExtraSize(_note.GetValue()));
    if (_next) size += _next->_GetSize(f);
    if (_extra) size += _extra->_GetSize(f);
    if (_owner) size += _owner->_GetSize(f);
    if (auto* tags = _tags.Peek()) size += tags->_GetSize(f);
    if (auto* children = _children.Peek()) size += children->_GetSize(f);
    return size;
}

void Shape::SetNext(Shape* v) { _next = v; }
void Shape::SetExtra(Any* v) { _extra = v; }
void Shape::SetOwner(Orbit::MoRef* v) { _owner = v; }
Orbit::Array<std::string>* Shape::GetTags() const { return _tags.Get(); }
void Shape::SetTags(Orbit::Array<std::string>* v) { _tags.Set(v); }
Orbit::DataArray<Shape>* Shape::GetChildren() const { return _children.Get(); }
void Shape::SetChildren(Orbit::DataArray<Shape>* v) { _children.Set(v); }

}  // namespace Sample

namespace {
constexpr Orbit::PropertyInfo kShapeProperties[] = {
    {"label", nullptr, 0, &Orbit::gStringTypeInfo, 0, kV1},
    {"note", nullptr, 0, &Orbit::gStringTypeInfo, Flag::Optional, kV1},
    {"count", nullptr, 0, &Orbit::gIntTypeInfo, 0, kV1},
    {"weight", nullptr, 0, &Orbit::gLongTypeInfo, Flag::Optional | Flag::Carried, kV1},
    {"seen", nullptr, 0, &Orbit::gDateTimeTypeInfo, Flag::Optional, kV2},
    {"color", nullptr, 0, &gTestColorTypeInfo, 0, kV1},
    {"next", nullptr, 0, &gTestShapeTypeInfo, Flag::Optional, kV1},
    {"extra", nullptr, 0, &Orbit::gAnyTypeInfo, Flag::Optional, kV1},
    {"owner", nullptr, 0, &gTestCalculatorTypeInfo, Flag::Optional, kV1},
    {"tags", nullptr, 0, &Orbit::gStringTypeInfo, Flag::Array | Flag::Optional, kV1},
    {"children", nullptr, 0, &gTestShapeTypeInfo, Flag::Array | Flag::Carried, kV2},
    kPropertyEnd,
};
}  // namespace

const Orbit::DataTypeInfo gTestShapeDataTypeInfo{
    &gTestShapeTypeInfo,    &gStrataDynamicDataTypeInfo, kShapeProperties,
    Sample::ShapeAccess::Get, Sample::ShapeAccess::Set,      Sample::ShapeAccess::IsSet,
    Sample::ShapeAccess::Unset, Sample::ShapeAccess::Create, Sample::ShapeAccess::CreateArray};

// ---- test.Circle ----------------------------------------------------------

namespace Sample {

struct CircleAccess {
    static void Get(DataObject* object, int index, void* value) {
        Circle* c = NarrowToType<Circle, DataObject>(object);
        if (index == 0) *static_cast<double*>(value) = c->_radius;
    }
    static void Set(DataObject* object, int index, const void* value) {
        Circle* c = NarrowToType<Circle, DataObject>(object);
        if (index == 0) c->_radius = Orbit::ReadValue<double>(value);
    }
    static bool IsSet(DataObject* object, int) {
        NarrowToType<Circle, DataObject>(object);
        return true;
    }
    static void Unset(DataObject* object, int) { NarrowToType<Circle, DataObject>(object); }
    static DataObject* Create() { return new Circle(); }
    static Any* CreateArray() { return new Orbit::DataArray<Circle>(); }
};

Orbit::Type* Circle::_GetType() const { return Orbit::GetType<Circle>(); }
Orbit::DataObjectType* Circle::_GetDataType() const { return Orbit::GetDoType<Circle>(); }
Any* Circle::_Clone() const { return new Circle(*this); }
unsigned int Circle::_GetSize(Orbit::SizeFunction f) const {
    return Shape::_GetSize(f) - f(sizeof(Shape)) + f(sizeof(Circle));
}

}  // namespace Sample

namespace {
constexpr Orbit::PropertyInfo kCircleProperties[] = {
    {"radius", nullptr, 0, &Orbit::gDoubleTypeInfo, 0, kV2},
    kPropertyEnd,
};
}  // namespace

const Orbit::DataTypeInfo gTestCircleDataTypeInfo{
    &gTestCircleTypeInfo,    &gTestShapeTypeInfo,      kCircleProperties,
    Sample::CircleAccess::Get, Sample::CircleAccess::Set,  Sample::CircleAccess::IsSet,
    Sample::CircleAccess::Unset, Sample::CircleAccess::Create, Sample::CircleAccess::CreateArray};

// ---- test.BadRequest ------------------------------------------------------

namespace Sample {

BadRequest::Exception* BadRequest::Exception::Clone() const { return new Exception(*this); }
void BadRequest::Exception::Throw() const { throw *this; }

Orbit::Type* BadRequest::_GetType() const { return Orbit::GetType<BadRequest>(); }
Orbit::DataObjectType* BadRequest::_GetDataType() const { return Orbit::GetDoType<BadRequest>(); }
Any* BadRequest::_Clone() const { return new BadRequest(*this); }
unsigned int BadRequest::_GetSize(Orbit::SizeFunction f) const {
    return MethodFault::_GetSize(f) - f(sizeof(MethodFault)) + f(sizeof(BadRequest));
}
void BadRequest::Throw() { throw Exception(_GetType()->GetName(), this); }
BadRequest::Exception* BadRequest::CreateException() { return new Exception(_GetType()->GetName(), this); }

}  // namespace Sample

namespace {
constexpr Orbit::PropertyInfo kNoProperties[] = {kPropertyEnd};
void BadRequestGet(DataObject* object, int, void*) { NarrowToType<Sample::BadRequest, DataObject>(object); }
void BadRequestSet(DataObject* object, int, const void*) { NarrowToType<Sample::BadRequest, DataObject>(object); }
bool BadRequestIsSet(DataObject* object, int) {
    NarrowToType<Sample::BadRequest, DataObject>(object);
    return true;
}
void BadRequestUnset(DataObject* object, int) { NarrowToType<Sample::BadRequest, DataObject>(object); }
DataObject* NewBadRequest() { return new Sample::BadRequest(); }
Any* NewBadRequestArray() { return new Orbit::DataArray<Sample::BadRequest>(); }
}  // namespace

const Orbit::DataTypeInfo gTestBadRequestDataTypeInfo{
    &gTestBadRequestTypeInfo, &Orbit::gStrataMethodFaultTypeInfo, kNoProperties, BadRequestGet, BadRequestSet,
    BadRequestIsSet,          BadRequestUnset,                    NewBadRequest, NewBadRequestArray};

// ---- test.Calculator ------------------------------------------------------

namespace {

constexpr Orbit::ParamInfo kAddParams[] = {
    {"a", 0, &Orbit::gIntTypeInfo, 0, kV1}, {"b", 0, &Orbit::gIntTypeInfo, 0, kV1}, kParamEnd};
constexpr Orbit::ParamInfo kFailParams[] = {{"why", 0, &Orbit::gStringTypeInfo, 0, kV1}, kParamEnd};
constexpr Orbit::ParamInfo kEchoParams[] = {{"value", 0, &Orbit::gAnyTypeInfo, Flag::Optional, kV2}, kParamEnd};
constexpr Orbit::ParamInfo kNoParams[] = {kParamEnd};
constexpr const Orbit::TypeInfo* kFailFaults[] = {&gTestBadRequestTypeInfo, nullptr};
constexpr const Orbit::TypeInfo* kNoFaults[] = {nullptr};

constexpr Orbit::MethodInfo kCalculatorMethods[] = {
    {"add", "Add", nullptr, 0, {"result", 0, &Orbit::gIntTypeInfo, 0, kV1}, kAddParams, kNoFaults, 0, kV1},
    {"fail", "Fail", nullptr, 0, {"result", 0, nullptr, 0, kV0}, kFailParams, kFailFaults, 0, kV1},
    {"echo", "Echo", "Global.HubServer", 0, {"result", 0, &Orbit::gAnyTypeInfo, Flag::Optional, kV2}, kEchoParams,
     kNoFaults, 0, kV2},
    {"startJob", "StartJob_Task", nullptr, 0, {"result", 0, &gTestShapeTypeInfo, 0, kV2}, kNoParams, kNoFaults, 1,
     kV2},
    {nullptr, nullptr, nullptr, 0, {nullptr, 0, nullptr, 0, nullptr}, nullptr, nullptr, 0, nullptr},
};

constexpr Orbit::PropertyInfo kCalculatorProperties[] = {
    {"name", "Global.HubServer", 0, &Orbit::gStringTypeInfo, Flag::Carried, kV1},
    kPropertyEnd,
};

void InvokeCalculator(Orbit::ManagedObject* target, int index, RefVector<Any>& args, Ref<Any>& result) {
    result = nullptr;
    Sample::Calculator* self = NarrowToType<Sample::Calculator, Orbit::ManagedObject>(target);
    switch (index) {
        case 0:
            Orbit::CheckArgumentCount(args, 2);
            result = new Orbit::Primitive<int>(
                self->Add(Orbit::UnboxArgument<int>(args, 0), Orbit::UnboxArgument<int>(args, 1)));
            break;
        case 1:
            Orbit::CheckArgumentCount(args, 1);
            self->Fail(Orbit::UnboxArgument<std::string>(args, 0));
            break;
        case 2: {
            Orbit::CheckArgumentCount(args, 1);
            Ref<Any> out;
            self->Echo(Orbit::NarrowArgument<Any>(args, 0), out);
            result = out;
            break;
        }
        case 3: {
            Orbit::CheckArgumentCount(args, 0);
            Ref<Orbit::MoRef> out;
            self->StartJob(out);
            result = out;
            break;
        }
        case 4: result = new Orbit::Primitive<std::string>(self->GetName()); break;
        default: break;
    }
}

Orbit::ManagedObject* NewCalculatorStub(const std::string& id, Orbit::StubAdapter* adapter,
                                        Orbit::RequestContext* context) {
    return new Sample::CalculatorStub(id, adapter, context);
}

}  // namespace

Orbit::ManagedMethod* gTestCalculatorMethodObjects[6];

const Orbit::ManagedTypeInfo gTestCalculatorManagedTypeInfo{
    &gTestCalculatorTypeInfo, &Orbit::gStrataManagedObjectTypeInfo, kCalculatorProperties, kCalculatorMethods,
    InvokeCalculator,         NewCalculatorStub,                    gTestCalculatorMethodObjects};

namespace Sample {

Orbit::Type* Calculator::_GetType() const { return Orbit::GetTypeHelper<Calculator, Orbit::ManagedObjectType>(); }

CalculatorStub::CalculatorStub(const std::string& id, Orbit::StubAdapter* adapter, Orbit::RequestContext* context)
    : StubImpl(id, adapter, context) {}

std::string CalculatorStub::GetName() {
    Ref<Any> result;
    RefVector<Any> args(0);
    _Invoke_Task(gTestCalculatorMethodObjects[4], args, result);
    return Orbit::UnboxResult<std::string>(result);
}

int CalculatorStub::Add(int a, int b) {
    Ref<Any> result;
    RefVector<Any> args(2);
    args[0] = new Orbit::Primitive<int>(a);
    args[1] = new Orbit::Primitive<int>(b);
    _Invoke_Task(gTestCalculatorMethodObjects[0], args, result);
    return Orbit::UnboxResult<int>(result);
}

void CalculatorStub::Fail(const std::string& why) {
    Ref<Any> result;
    RefVector<Any> args(1);
    args[0] = new Orbit::Primitive<std::string>(why);
    _Invoke_Task(gTestCalculatorMethodObjects[1], args, result);
    Orbit::CheckNoResult(result, "test/stub", __LINE__);
}

void CalculatorStub::Echo(Any* value, Ref<Any>& result) {
    Ref<Any> answer;
    RefVector<Any> args(1);
    args[0] = value;
    _Invoke_Task(gTestCalculatorMethodObjects[2], args, answer);
    result = answer;
}

void CalculatorStub::StartJob(Ref<Orbit::MoRef>& result) {
    Ref<Any> answer;
    RefVector<Any> args(0);
    _Invoke_Task(gTestCalculatorMethodObjects[3], args, answer);
    Orbit::NarrowResult(answer, result);
}

void CalculatorStub::Add(int a, int b, const Orbit::CompletionCallback& callback,
                         Ref<Kernite::System::ScheduledItem>& item) {
    RefVector<Any> args(2);
    args[0] = new Orbit::Primitive<int>(a);
    args[1] = new Orbit::Primitive<int>(b);
    _StartInvoke_Task(gTestCalculatorMethodObjects[0], args, callback, item);
}

void CalculatorStub::Fail(const std::string& why, const Orbit::CompletionCallback& callback,
                          Ref<Kernite::System::ScheduledItem>& item) {
    RefVector<Any> args(1);
    args[0] = new Orbit::Primitive<std::string>(why);
    _StartInvoke_Task(gTestCalculatorMethodObjects[1], args, callback, item);
}

int CalculatorImpl::Add(int a, int b) {
    seenContext = Orbit::LoopbackAdapter::CurrentContext();
    seenThread = std::this_thread::get_id();
    return a + b;
}

void CalculatorImpl::Fail(const std::string& why) {
    seenThread = std::this_thread::get_id();
    Ref<BadRequest> fault(new BadRequest());
    fault->SetMsg(why);
    fault->Throw();
}

void CalculatorImpl::Echo(Any* value, Ref<Any>& result) { result = value; }

void CalculatorImpl::StartJob(Ref<Orbit::MoRef>& result) { result = new Orbit::MoRef("test.Task", "task-1"); }

}  // namespace Sample

// ---- test.Counter ---------------------------------------------------------

namespace {

constexpr Orbit::MethodInfo kCounterMethods[] = {
    {"increment", "Increment", nullptr, 0, {"result", 0, &Orbit::gIntTypeInfo, 0, kV1}, kNoParams, kNoFaults, 0,
     kV1},
    {nullptr, nullptr, nullptr, 0, {nullptr, 0, nullptr, 0, nullptr}, nullptr, nullptr, 0, nullptr},
};

void InvokeCounter(Orbit::ManagedObject* target, int index, RefVector<Any>& args, Ref<Any>& result) {
    result = nullptr;
    Sample::Counter* self = NarrowToType<Sample::Counter, Orbit::ManagedObject>(target);
    if (index == 0) {
        Orbit::CheckArgumentCount(args, 0);
        result = new Orbit::Primitive<int>(self->Increment());
    }
}

}  // namespace

Orbit::ManagedMethod* gTestCounterMethodObjects[2];

const Orbit::ManagedTypeInfo gTestCounterManagedTypeInfo{
    &gTestCounterTypeInfo, &Orbit::gStrataManagedObjectTypeInfo, kNoProperties, kCounterMethods,
    InvokeCounter,         nullptr,                              gTestCounterMethodObjects};

Orbit::Type* Sample::Counter::_GetType() const { return Orbit::GetTypeHelper<Counter, Orbit::ManagedObjectType>(); }

// ---- type objects ---------------------------------------------------------

namespace Orbit {
template <> Type* GetType<Sample::Color>() {
    static Type* const type = CreateEnumType<Sample::Color>(&gTestColorEnumTypeInfo);
    return type;
}
template <> Type* GetType<Sample::Shape>() {
    static Type* const type = CreateDataObjectType(&gTestShapeDataTypeInfo);
    return type;
}
template <> Type* GetType<Sample::Circle>() {
    static Type* const type = CreateDataObjectType(&gTestCircleDataTypeInfo);
    return type;
}
template <> Type* GetType<Sample::BadRequest>() {
    static Type* const type = CreateDataObjectType(&gTestBadRequestDataTypeInfo);
    return type;
}
template <> Type* GetType<Sample::Calculator>() {
    static Type* const type = CreateManagedObjectType(&gTestCalculatorManagedTypeInfo);
    return type;
}
template <> Type* GetType<Sample::Counter>() {
    static Type* const type = CreateManagedObjectType(&gTestCounterManagedTypeInfo);
    return type;
}
}  // namespace Orbit

void Sample::DeclareTestVersions() {
    Orbit::VersionMap* map = Orbit::GetVersionMap();
    map->AddVersion(kV1, "test", "1.0", 0, "cairn.Task", 0, "");
    map->AddVersion(kV2, "test", "2.0", 0, "cairn.Task", 0, "");
    map->AddIncludedVersion(kV1, kV1);
    map->AddIncludedVersion(kV2, kV2);
    map->AddIncludedVersion(kV2, kV1);
}

void Sample::CreateAllTypes() {
    using namespace Sample;
    for (Orbit::Type* type :
         {Orbit::GetType<std::string>(), Orbit::GetType<bool>(), Orbit::GetType<int>(), Orbit::GetType<long long>(),
          Orbit::GetType<double>(), Orbit::GetType<DateTime>(), Orbit::GetType<Orbit::MethodName>(),
          Orbit::GetType<Any>(), Orbit::GetType<Orbit::MoRef>(), Orbit::GetType<Orbit::DynamicData>(),
          Orbit::GetType<Orbit::MethodFault>(), Orbit::GetType<Orbit::KeyAnyValue>(),
          Orbit::GetType<Orbit::ManagedObject>(), Orbit::GetType<Color>(), Orbit::GetType<Shape>(),
          Orbit::GetType<Circle>(), Orbit::GetType<BadRequest>(), Orbit::GetType<Calculator>(),
          Orbit::GetType<Counter>()})
        type->GetArrayType();
}
