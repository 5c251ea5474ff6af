// Hand-written types in the shape the generator emits: records, classes, a fault,
// an enumeration and a managed interface with its stub, for tests of the runtime.
#pragma once

#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <thread>

#include "orbit/Loopback.h"
#include "orbit/Orbit.h"

namespace Sample {

// Enumeration "test.Color": "red", "green", "blue".
enum class Color : std::int32_t { Red, Green, Blue };
extern const char* const COLOR_RED;
extern const char* const COLOR_GREEN;
extern const char* const COLOR_BLUE;

// Data object "test.Shape", one property of every storage kind.
class Shape : public Orbit::DynamicData {
public:
    enum Property { kLabel, kNote, kCount, kWeight, kSeen, kColor, kNext, kExtra, kOwner, kTags, kChildren };

    Shape() = default;
    Shape(const Shape& other);
    ~Shape() override;

    Orbit::Type* _GetType() const override;
    Orbit::DataObjectType* _GetDataType() const override;
    unsigned int _GetSize(Orbit::SizeFunction f) const override;
    Orbit::Any* _Clone() const override;

    const std::string& GetLabel() const { return _label; }
    void SetLabel(const std::string& v) { _label = v; }
    const Kernite::Optional<std::string>& GetNote() const { return _note; }
    void SetNote(const Kernite::Optional<std::string>& v) { _note = v; }
    int GetCount() const { return _count; }
    void SetCount(int v) { _count = v; }
    const Kernite::Optional<long long>& GetWeight() const { return _weight; }
    void SetWeight(const Kernite::Optional<long long>& v) { _weight = v; }
    const Kernite::Optional<Kernite::System::DateTime>& GetSeen() const { return _seen; }
    void SetSeen(const Kernite::Optional<Kernite::System::DateTime>& v) { _seen = v; }
    Color GetColor() const { return _color; }
    void SetColor(Color v) { _color = v; }
    Shape* GetNext() const { return _next.Get(); }
    void SetNext(Shape* v);
    Orbit::Any* GetExtra() const { return _extra.Get(); }
    void SetExtra(Orbit::Any* v);
    Orbit::MoRef* GetOwner() const { return _owner.Get(); }
    void SetOwner(Orbit::MoRef* v);
    Orbit::Array<std::string>* GetTags() const;
    void SetTags(Orbit::Array<std::string>* v);
    Orbit::DataArray<Shape>* GetChildren() const;
    void SetChildren(Orbit::DataArray<Shape>* v);

private:
    friend struct ShapeAccess;
    std::string _label;
    Kernite::Optional<std::string> _note;
    int _count = 0;
    Kernite::Optional<long long> _weight;
    Kernite::Optional<Kernite::System::DateTime> _seen;
    Color _color = Color::Red;
    Kernite::Ref<Shape> _next;
    Kernite::Ref<Orbit::Any> _extra;
    Kernite::Ref<Orbit::MoRef> _owner;
    Orbit::ArrayField<Orbit::Array<std::string>> _tags;
    Orbit::ArrayField<Orbit::DataArray<Shape>> _children;
};

// Data object "test.Circle", derived from "test.Shape".
class Circle : public Shape {
public:
    Circle() = default;
    Circle(const Circle&) = default;

    Orbit::Type* _GetType() const override;
    Orbit::DataObjectType* _GetDataType() const override;
    unsigned int _GetSize(Orbit::SizeFunction f) const override;
    Orbit::Any* _Clone() const override;

    double GetRadius() const { return _radius; }
    void SetRadius(double v) { _radius = v; }

private:
    friend struct CircleAccess;
    double _radius = 0;
};

// Fault "test.BadRequest", without properties of its own.
class BadRequest : public Orbit::MethodFault {
public:
    class Exception : public Orbit::MethodFault::Exception {
    public:
        using Orbit::MethodFault::Exception::Exception;
        Exception* Clone() const override;
        [[noreturn]] void Throw() const override;
    };

    BadRequest() = default;
    BadRequest(const BadRequest&) = default;

    Orbit::Type* _GetType() const override;
    Orbit::DataObjectType* _GetDataType() const override;
    unsigned int _GetSize(Orbit::SizeFunction f) const override;
    Orbit::Any* _Clone() const override;
    [[noreturn]] void Throw() override;
    Exception* CreateException() override;
};

// Managed interface "test.Calculator". Members: add, fail, echo, startJob (a task),
// then the property name.
class Calculator : public virtual Orbit::ManagedObject {
public:
    static constexpr const char* METHOD_ADD = "test.Calculator.add";

    Orbit::Type* _GetType() const override;
    virtual std::string GetName() = 0;
    virtual int Add(int a, int b) = 0;
    virtual void Fail(const std::string& why) = 0;
    virtual void Echo(Orbit::Any* value, Kernite::Ref<Orbit::Any>& result) = 0;
    virtual void StartJob(Kernite::Ref<Orbit::MoRef>& result) = 0;
};

class CalculatorStub : public Orbit::StubImpl, public virtual Calculator {
public:
    CalculatorStub(const std::string& id, Orbit::StubAdapter* adapter, Orbit::RequestContext* context);

    std::string GetName() override;
    int Add(int a, int b) override;
    void Fail(const std::string& why) override;
    void Echo(Orbit::Any* value, Kernite::Ref<Orbit::Any>& result) override;
    void StartJob(Kernite::Ref<Orbit::MoRef>& result) override;

    void Add(int a, int b, const Orbit::CompletionCallback& callback,
             Kernite::Ref<Kernite::System::ScheduledItem>& item);
    void Fail(const std::string& why, const Orbit::CompletionCallback& callback,
              Kernite::Ref<Kernite::System::ScheduledItem>& item);
};

// Managed interface "test.Counter", unrelated to the calculator.
class Counter : public virtual Orbit::ManagedObject {
public:
    Orbit::Type* _GetType() const override;
    virtual int Increment() = 0;
};

// A server-side calculator. Remembers what the last call saw.
class CalculatorImpl : public Orbit::ManagedObjectImpl, public virtual Calculator {
public:
    explicit CalculatorImpl(std::string id) : ManagedObjectImpl(std::move(id)) {}

    std::string GetName() override { return "calc:" + GetId(); }
    int Add(int a, int b) override;
    void Fail(const std::string& why) override;
    void Echo(Orbit::Any* value, Kernite::Ref<Orbit::Any>& result) override;
    void StartJob(Kernite::Ref<Orbit::MoRef>& result) override;
    void _Unregistered() override { ++unregistered; }

    Orbit::RequestContext* seenContext = nullptr;
    std::thread::id seenThread;
    int unregistered = 0;
};

}  // namespace Sample

extern const Orbit::TypeInfo gTestColorTypeInfo;
extern const Orbit::EnumTypeInfo gTestColorEnumTypeInfo;
extern const Orbit::TypeInfo gTestShapeTypeInfo;
extern const Orbit::DataTypeInfo gTestShapeDataTypeInfo;
extern const Orbit::TypeInfo gTestCircleTypeInfo;
extern const Orbit::DataTypeInfo gTestCircleDataTypeInfo;
extern const Orbit::TypeInfo gTestBadRequestTypeInfo;
extern const Orbit::DataTypeInfo gTestBadRequestDataTypeInfo;
extern const Orbit::TypeInfo gTestCalculatorTypeInfo;
extern const Orbit::ManagedTypeInfo gTestCalculatorManagedTypeInfo;
extern Orbit::ManagedMethod* gTestCalculatorMethodObjects[6];
extern const Orbit::TypeInfo gTestCounterTypeInfo;
extern const Orbit::ManagedTypeInfo gTestCounterManagedTypeInfo;
extern Orbit::ManagedMethod* gTestCounterMethodObjects[2];

namespace Orbit {
template <> Type* GetType<Sample::Color>();
template <> Type* GetType<Sample::Shape>();
template <> Type* GetType<Sample::Circle>();
template <> Type* GetType<Sample::BadRequest>();
template <> Type* GetType<Sample::Calculator>();
template <> Type* GetType<Sample::Counter>();
}  // namespace Orbit

namespace Sample {
// Makes every runtime and sample type, and their array types. Types live as long as
// the process, so tests that count live objects call this first.
void CreateAllTypes();

// The versions the test records name: "test.version.v1", and "test.version.v2",
// which includes it. Declared on the process's version map on first call.
void DeclareTestVersions();
}  // namespace Sample

namespace Sample {

// A test that must release everything it made; the sample types are made first,
// since types live as long as the process.
class NoLeakTest : public ::testing::Test {
protected:
    void SetUp() override {
        CreateAllTypes();
        _before = Kernite::ObjectImpl::LiveObjects();
    }
    void TearDown() override { EXPECT_EQ(Kernite::ObjectImpl::LiveObjects(), _before); }

private:
    long _before = 0;
};

}  // namespace Sample
