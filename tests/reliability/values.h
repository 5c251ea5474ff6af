// Values for any property of any registered data type, made from the property's
// record alone: the reliability tests and the fuzzers fill objects of every type
// the same way the runtime reaches them, through the record functions.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "orbit/Orbit.h"

namespace Reliability {

// What getProperty writes and setProperty reads for a property.
enum class Storage { String, Bool, Int, Long, Double, DateTime, MethodName, Enum, Reference };
Storage StorageOf(const Orbit::Member& property);

// Where choices come from: a fuzzer's bytes (zeros once they run out) or a
// pseudo-random sequence from a seed.
class Chooser {
public:
    Chooser(const std::uint8_t* data, std::size_t size) : _data(data), _size(size) {}
    explicit Chooser(std::uint32_t seed) : _seed(seed | 1u) {}

    // A number below `bound` (0 when bound is 0).
    std::uint32_t Below(std::uint32_t bound);
    std::uint8_t Byte();
    bool Exhausted() const { return _data != nullptr && _next >= _size; }
    // Short or heap-sized text.
    std::string Text();

private:
    const std::uint8_t* _data = nullptr;
    std::size_t _size = 0;
    std::size_t _next = 0;
    std::uint32_t _seed = 0;
};

// A value of a class that no property or parameter has.
class Stranger : public Orbit::Any {
public:
    Orbit::Type* _GetType() const override { return nullptr; }
    unsigned int _GetSize(Orbit::SizeFunction f) const override { return f(sizeof(Stranger)); }
    Orbit::Any* _Clone() const override { return const_cast<Stranger*>(this); }
    bool _IsEqual(Orbit::Any* other, bool) const override { return other == this; }
    void _DiffProperties(Orbit::Any*, const std::string&, Orbit::PropertyDiffSet&) const override {}
};

// The data types of an object, root-most first (the runtime's roots included).
std::vector<const Orbit::DataObjectType*> Chain(const Orbit::DataObjectType* type);

// Every registered data object and fault type, in registration order.
std::vector<Orbit::DataObjectType*> RegisteredDataTypes();

// A value for `property` held by reference (object, anyType, managed reference or
// array), nested data objects filled `depth` levels deep, arrays of `items` items.
Kernite::Ref<Orbit::Any> MakeReference(const Orbit::Member& property, Chooser& choose, int depth, int items);

// Writes a chosen value into property `index` of `level` through setProperty.
void SetChosen(Orbit::DataObject* object, const Orbit::DataObjectType* level, int index, Chooser& choose, int depth,
               int items);

// Sets every property of every level of the object's type.
void Populate(Orbit::DataObject* object, Chooser& choose, int depth, int items);

// A new object of `type`, populated.
Kernite::Ref<Orbit::DataObject> MakePopulated(const Orbit::DataObjectType* type, std::uint32_t seed, int depth,
                                              int items);

}  // namespace Reliability
