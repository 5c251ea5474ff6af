// The C++ shape of one managed member (a method, or a property's getter): its
// operation name, parameters, how arguments are boxed and unboxed, and how the
// result comes back. Interfaces, stubs and dispatch functions all read it.
#pragma once

#include <string>
#include <vector>

#include "model.h"

namespace tarngen {

struct MemberParam {
    std::string name;       // C++ parameter name
    std::string declared;   // "const std::string&", "Orbit::DataArray<Orbit::MoRef>*"
    bool boxed = false;     // a value travelling in an Orbit::Primitive<valueType>
    std::string valueType;  // boxed: "std::string"; object: the class to narrow to
};

enum class Delivery { Void, ByValue, RefOut };

struct Member {
    std::string operation;              // "MarkLogs", "GetDebugManager", "IsCommitted"
    int memberNumber = 0;
    std::vector<MemberParam> params;
    Delivery delivery = Delivery::Void;
    std::string resultType;             // ByValue: "std::string"; RefOut: "Orbit::MoRef"
    std::string resultName = "result";
    bool anyResult = false;             // RefOut of Orbit::Any: taken unchanged
    std::string label;                  // "method markLogs", "property debugManager"

    // "(const std::string& message)" / "(Kernite::Ref<Orbit::MoRef>& result)"
    std::string Parameters() const;
    // The same without the result, followed by the completion parameters.
    std::string AsyncParameters() const;
    std::string ReturnType() const { return delivery == Delivery::ByValue ? resultType : "void"; }
};

// Members of a managed type in member-number order (methods, then properties).
std::vector<Member> MembersOf(const Type& type);
// The same in the interface's slot order (property getters, then methods).
std::vector<Member> SlotOrder(const Type& type);

}  // namespace tarngen
