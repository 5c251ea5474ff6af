// One emitter per storage kind of a data object property (see the kinds table of
// the data object classes). Every kind answers the same hooks; the class and record
// emitters only loop over properties and call them.
#pragma once

#include <memory>
#include <string>

#include "model.h"
#include "printer.h"

namespace tarngen {

class PropertyKind {
public:
    explicit PropertyKind(const Property& p);
    virtual ~PropertyKind() = default;

    // Class members.
    virtual std::string MemberType() const = 0;
    virtual std::string ParamType() const = 0;  // full-constructor parameter
    // Member initialiser in the default constructor ("" for default construction).
    virtual std::string DefaultInit() const { return ""; }
    virtual std::string CopyInit(const std::string& other) const;  // copy constructor
    virtual void InlineAccessors(Printer& out) const = 0;
    virtual void OutOfLineDeclarations(Printer&) const {}
    virtual void OutOfLineDefinitions(Printer&, const std::string&) const {}
    // Statement adding this member's memory to `size`, or "".
    virtual std::string SizeTerm() const = 0;

    // The record functions, one switch case body each ("self" is the object, "value"
    // the caller's storage).
    virtual std::string Get() const = 0;
    virtual std::string Set() const = 0;
    // "" where the property is always set.
    virtual std::string IsSet() const { return ""; }
    virtual std::string Unset() const { return ""; }

    const Property& property;

protected:
    std::string member;     // "sic_"
    std::string getter;     // "GetSic"
    std::string setter;     // "SetSic"
public:
    std::string param;      // "sic", the full constructor's parameter
};

std::unique_ptr<PropertyKind> MakePropertyKind(const Property& p);

}  // namespace tarngen
