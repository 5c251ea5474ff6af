#include "members.h"

#include "names.h"

namespace tarngen {
namespace {

MemberParam ParamOf(const Param& p) {
    MemberParam out;
    out.name = names::Identifier(p.name);
    if (p.IsArray()) {
        out.declared = p.type.ArrayClass() + "*";
        out.valueType = p.type.ArrayClass();
    } else if (p.type.IsObject()) {
        out.declared = p.type.ParamType();
        out.valueType = p.type.CppType();
    } else {
        out.declared = p.type.ParamType();
        out.valueType = p.type.CppType();
        out.boxed = true;
    }
    return out;
}

// How a value of `type` with `flags` comes back from a member.
void Deliver(Member& m, const TypeRef& type, std::uint32_t flags) {
    if (flags & Orbit::Flag::Array) {
        m.delivery = Delivery::RefOut;
        m.resultType = type.ArrayClass();
    } else if (type.IsObject()) {
        m.delivery = Delivery::RefOut;
        m.resultType = type.CppType();
        m.anyResult = type.primitive != nullptr;
    } else {
        m.delivery = Delivery::ByValue;
        m.resultType = type.CppType();
    }
}

}  // namespace

std::string Member::Parameters() const {
    std::string out;
    for (const MemberParam& p : params) out += (out.empty() ? "" : ", ") + p.declared + " " + p.name;
    if (delivery == Delivery::RefOut) out += std::string(out.empty() ? "" : ", ") + "Kernite::Ref<" + resultType + ">& " + resultName;
    return "(" + out + ")";
}

std::string Member::AsyncParameters() const {
    std::string out;
    for (const MemberParam& p : params) out += p.declared + " " + p.name + ", ";
    return "(" + out + "const Orbit::CompletionCallback& callback, Kernite::Ref<Kernite::System::ScheduledItem>& item)";
}

std::vector<Member> MembersOf(const Type& type) {
    std::vector<Member> out;
    for (const Method& method : type.methods) {
        Member m;
        m.operation = method.operation;
        m.memberNumber = method.memberNumber;
        m.label = "method " + method.name;
        for (const Param& p : method.params) {
            m.params.push_back(ParamOf(p));
            if (p.name == "result") m.resultName = "result_";
        }
        if (method.task) {
            m.delivery = Delivery::RefOut;
            m.resultType = "Orbit::MoRef";
        } else if (method.hasResult) {
            Deliver(m, method.result.type, method.result.flags);
        }
        out.push_back(std::move(m));
    }
    for (const Property& p : type.properties) {
        Member m;
        bool boolean = p.type.primitive && p.type.primitive->keyword == "boolean" && !p.IsArray();
        m.operation = names::Accessor(boolean ? "Is" : "Get", p.name);
        m.memberNumber = p.memberNumber;
        m.label = "property " + p.name;
        Deliver(m, p.type, p.flags);
        out.push_back(std::move(m));
    }
    return out;
}

std::vector<Member> SlotOrder(const Type& type) {
    std::vector<Member> members = MembersOf(type);
    std::vector<Member> out(members.begin() + type.methods.size(), members.end());
    out.insert(out.end(), members.begin(), members.begin() + type.methods.size());
    return out;
}

}  // namespace tarngen
