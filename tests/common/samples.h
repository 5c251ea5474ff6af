// What the round trip reads from the records: the managed types of the catalogue as
// the type map holds them, their members, and sample values for any parameter or
// result built from its type and flags alone.
#pragma once

#include <string>
#include <vector>

#include "orbit/Orbit.h"

namespace Roundtrip {

// The managed types whose wire names start with "tarn.", in registration order.
std::vector<Orbit::ManagedObjectType*> TarnManagedTypes();

// Every member a stub of `type` answers: the own members of its root base first,
// then those of each derived type down to `type` itself.
std::vector<Orbit::ManagedMethod*> AllMembers(const Orbit::ManagedObjectType* type);

// The name under which a test double records a call of `member`: the operation's
// name ("MarkLogs", "GetFaultManager", "IsCommitted").
std::string OperationName(const Orbit::ManagedMethod* member);

// Held by reference (object, array, anyType, managed object reference) rather than
// passed by value; only these can be null.
bool HeldByReference(const Orbit::Member& member);
// A string, int, long or boolean result returned by value.
bool ReturnedByValue(const Orbit::ManagedMethod* member);
bool IsVoid(const Orbit::ManagedMethod* member);
// A single anyType result, which the stub takes as it comes: no box is wrong for it.
bool TakesAnyResult(const Orbit::ManagedMethod* member);

// A value of the member's type and flags. `seed` tells slots apart: two calls with
// different seeds give different values (where the type has more than one value),
// and an array holds two different items, the second made from seed + 1.
Kernite::Ref<Orbit::Any> MakeSample(const Orbit::Member& member, int seed);
// One item of `type` (never an array).
Kernite::Ref<Orbit::Any> MakeItem(Orbit::Type* type, int seed);
// An object of `type` with every property of its class and bases that `seenBy` sees
// set (all of them when null): scalars and references as MakeSample makes them,
// arrays of two, optional members only when `optionals`. Nested data objects are
// filled the same way, `depth` levels down; below that only required ones are made.
Kernite::Ref<Orbit::DataObject> MakeFullObject(Orbit::DataObjectType* type, int seed, bool optionals,
                                               const Orbit::Version* seenBy = nullptr, int depth = 2);
// MakeSample, with data objects (and arrays of them) made by MakeFullObject.
Kernite::Ref<Orbit::Any> MakeFullSample(const Orbit::Member& member, int seed, bool optionals,
                                        const Orbit::Version* seenBy = nullptr, int depth = 2);
// The reference a task method hands back: the task that runs it.
Kernite::Ref<Orbit::Any> MakeTaskReference(int seed);
// The fault a member's double throws: the first fault the member declares, or a
// plain Orbit::MethodFault when it declares none. Its message is filled.
Kernite::Ref<Orbit::MethodFault> MakeFault(const Orbit::ManagedMethod* member);
// A box of a type that no member expects in place of `member`'s result.
Kernite::Ref<Orbit::Any> MakeWrongBox(const Orbit::ManagedMethod* member);

// Empty when `arrived` is what was sent: both null, or of the same type and equal.
std::string Difference(Orbit::Any* sent, Orbit::Any* arrived);

}  // namespace Roundtrip
