#include "text_output.h"

#include <algorithm>
#include <string>

#include "orbit/Records.h"

namespace tarncatalog {
namespace {

const char* KindName(std::uint32_t kind) {
    switch (kind) {
    case Orbit::Kind::Enum: return "enum";
    case Orbit::Kind::Data: return "data";
    case Orbit::Kind::Fault: return "fault";
    case Orbit::Kind::Managed: return "managed";
    default: return "other";
    }
}

std::string Hex(std::uint32_t value) {
    const char* digits = "0123456789ABCDEF";
    return std::string("0x") + digits[(value >> 4) & 15] + digits[value & 15];
}

std::string Count(std::size_t n, const char* one, const char* many) {
    return std::to_string(n) + " " + (n == 1 ? one : many);
}

std::string Pad(const std::string& s, std::size_t width) {
    return s.size() >= width ? s + " " : s + std::string(width - s.size(), ' ');
}

std::string Flags(std::uint32_t flags) {
    std::string words;
    auto add = [&](std::uint32_t bit, const char* word) {
        if ((flags & bit) == 0) return;
        words += words.empty() ? "" : ", ";
        words += word;
    };
    add(Orbit::Flag::Array, "array");
    add(Orbit::Flag::Optional, "optional");
    add(Orbit::Flag::Carried, "carried");
    return "flags " + std::to_string(flags) + (words.empty() ? "" : " (" + words + ")");
}

std::string Members(const TypeEntry& t) {
    std::string s;
    if (t.kind == Orbit::Kind::Enum) return Count(t.tags.size(), "tag", "tags");
    if (t.kind == Orbit::Kind::Managed) s = Count(t.methods.size(), "method", "methods") + ", ";
    s += Count(t.properties.size(), "property", "properties");
    if (t.hiddenMembers > 0) s += " (" + std::to_string(t.hiddenMembers) + " hidden)";
    return s;
}

void WriteMember(const std::string& label, const MemberEntry& m, std::ostream& out) {
    out << "       " << label << ": " << m.type.value_or("none") << "  " << Flags(m.flags) << "  " << m.version << "\n";
}

}  // namespace

void WriteListing(const Catalog& c, std::ostream& out) {
    std::size_t width = 0;
    for (const TypeEntry& t : c.types) width = std::max(width, t.name.size());
    std::size_t versionWidth = 0;
    for (const TypeEntry& t : c.types) versionWidth = std::max(versionWidth, t.version.size());

    std::size_t namespaces = 0;
    for (const std::string& ns : c.loaders)
        namespaces += std::any_of(c.types.begin(), c.types.end(), [&](const TypeEntry& t) { return t.ns == ns; });
    if (c.seenBy)
        out << "What " << *c.seenBy << " sees: " << c.types.size() << " of " << c.registeredTypes << " types, in "
            << namespaces << " of " << c.loaders.size() << " namespaces (loader order)\n";
    else
        out << c.loaders.size() << " namespaces in loader order, " << c.types.size() << " types\n";

    for (const std::string& ns : c.loaders) {
        std::size_t n = std::count_if(c.types.begin(), c.types.end(), [&](const TypeEntry& t) { return t.ns == ns; });
        if (n == 0) continue;  // nothing of it is visible
        out << "\n" << ns << "  (" << Count(n, "type", "types") << ")\n";
        for (const TypeEntry& t : c.types) {
            if (t.ns != ns) continue;
            out << "  " << Pad(KindName(t.kind), 8) << Pad(t.name, width + 2) << Pad(t.version, versionWidth + 2)
                << Members(t) << "\n";
        }
    }
}

void WriteType(const Catalog& c, const TypeEntry& t, std::ostream& out) {
    out << t.name << "\n";
    out << "  kind       " << KindName(t.kind) << " (" << Hex(t.kind) << ")\n";
    out << "  flat name  " << t.flatName << "\n";
    out << "  version    " << t.version << "\n";
    out << "  C++ class  " << t.className << (t.standin ? "  (stand-in for another library's type)" : "") << "\n";
    out << "  header     #include \"" << t.header << "\"\n";
    out << "  namespace  " << t.ns << "\n";
    out << "  base       ";
    if (t.baseChain.empty()) out << t.base.value_or("none");
    for (std::size_t i = 0; i < t.baseChain.size(); ++i) out << (i ? " <- " : "") << t.baseChain[i];
    out << "\n";
    if (c.seenBy) {
        out << "  seen by    " << *c.seenBy;
        if (t.hiddenMembers > 0) out << ", which does not see " << Count(t.hiddenMembers, "member", "members");
        out << "\n";
    }

    if (t.kind == Orbit::Kind::Managed) {
        out << "\nmethods (" << t.methods.size() << "):\n";
        for (const MethodEntry& m : t.methods) {
            out << "  #" << m.memberNumber << " " << m.name << "  wsdl \"" << m.wsdlName << "\"  " << m.version;
            if (m.task) out << "  task";
            if (m.privilege) out << "  privilege " << *m.privilege;
            out << "\n";
            for (const MemberEntry& p : m.params) WriteMember("param " + p.name, p, out);
            WriteMember("result", m.result, out);
            for (const std::string& f : m.faults) out << "       throws " << f << "\n";
        }
    }
    if (t.kind != Orbit::Kind::Enum) {
        out << "\nproperties (" << t.properties.size() << "):\n";
        for (const MemberEntry& p : t.properties) {
            out << "  #" << p.memberNumber << " " << p.name << ": " << p.type.value_or("none") << "  " << Flags(p.flags)
                << "  " << p.version;
            if (p.privilege) out << "  privilege " << *p.privilege;
            out << "\n";
        }
    } else {
        out << "\ntags (" << t.tags.size() << "):\n";
        for (std::size_t i = 0; i < t.tags.size(); ++i) out << "  " << i << " \"" << t.tags[i] << "\"\n";
    }
    for (const TypeEntry* base : Ancestors(c, t)) {
        if (base->methods.empty() && base->properties.empty()) continue;
        out << "\ninherited from " << base->name << ":\n";
        for (const MethodEntry& m : base->methods) out << "  method " << m.name << "  " << m.version << "\n";
        for (const MemberEntry& p : base->properties)
            out << "  property " << p.name << ": " << p.type.value_or("none") << "  " << Flags(p.flags) << "  " << p.version << "\n";
    }
}

void WriteVersions(const Catalog& c, std::ostream& out) {
    if (c.seenBy) out << "Versions that " << *c.seenBy << " includes: " << c.versions.size() << "\n";
    else out << c.versions.size() << " versions in registration order\n";
    for (const VersionEntry& v : c.versions) {
        out << "\n" << v.name << "  namespace \"" << v.serviceNamespace << "\"  id \"" << v.versionId << "\"  flag "
            << v.flag << "\n  includes (" << v.includes.size() << "):";
        for (const std::string& name : v.includes) out << " " << name;
        out << "\n";
    }
}

}  // namespace tarncatalog
