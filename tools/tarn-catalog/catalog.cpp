#include "catalog.h"

#include <algorithm>
#include <cctype>

#include "names.h"
#include "orbit/Orbit.h"

namespace tarncatalog {
namespace {

constexpr const char* kTarnPrefix = "tarn.";

// No version chosen: everything is shown.
bool Sees(Orbit::Version* seenBy, Orbit::Version* introducedIn) {
    return seenBy == nullptr || seenBy->Sees(introducedIn);
}

std::optional<std::string> Text(const char* s) {
    if (s == nullptr) return std::nullopt;
    return std::string(s);
}

std::optional<std::string> FlatName(const Orbit::TypeInfo* record) {
    if (record == nullptr) return std::nullopt;
    return Text(record->flatName);
}

MemberEntry ReadMember(const Orbit::Member& m, const char* privilege) {
    MemberEntry e;
    e.name = m.name;
    e.privilege = Text(privilege);
    e.type = FlatName(m.typeRecord);
    if (m.typeRecord != nullptr) e.typeWireName = Text(m.typeRecord->name);
    e.flags = m.flags;
    e.version = m.version;
    return e;
}

// The base as the type object resolves it; the record's base header while the
// runtime has not made that type.
std::optional<std::string> BaseName(Orbit::Type* base, const Orbit::TypeInfo* record) {
    if (base != nullptr) return base->GetWsdlName();
    return FlatName(record);
}

std::string VersionName(Orbit::Type* type) {
    if (Orbit::Version* v = type->GetVersion()) return v->GetName();
    if (auto* impl = dynamic_cast<Orbit::TypeImpl*>(type); impl && impl->GetVersionName())
        return impl->GetVersionName();
    return {};
}

void ReadData(Orbit::DataObjectType* type, Orbit::Version* seenBy, TypeEntry& out) {
    out.base = BaseName(type->GetBaseType(), type->GetDataTypeInfo()->base);
    const auto& properties = type->GetProperties();
    for (std::size_t i = 0; i < properties.size(); ++i) {
        if (seenBy != nullptr && !properties[i].IsVisible(seenBy)) {
            ++out.hiddenMembers;
            continue;
        }
        MemberEntry e = ReadMember(properties[i], properties[i].privilege);
        e.memberNumber = static_cast<int>(i);
        out.properties.push_back(std::move(e));
    }
}

void ReadManaged(Orbit::ManagedObjectType* type, Orbit::Version* seenBy, TypeEntry& out) {
    out.base = BaseName(type->GetBaseType(), type->GetManagedTypeInfo()->base);
    for (const auto& member : type->GetMembers()) {
        if (seenBy != nullptr && !member->IsVisible(seenBy)) {
            ++out.hiddenMembers;
            continue;
        }
        if (member->IsPropertyGetter()) {
            // A getter's result is the property as its record describes it.
            MemberEntry e = ReadMember(member->GetResult(), member->GetPrivilege());
            e.name = member->GetName();
            e.memberNumber = member->GetMemberNumber();
            out.properties.push_back(std::move(e));
            continue;
        }
        MethodEntry m;
        m.name = member->GetName();
        m.wsdlName = member->GetWsdlName();
        m.privilege = Text(member->GetPrivilege());
        m.version = member->GetVersionName();
        m.task = member->IsTask();
        m.memberNumber = member->GetMemberNumber();
        m.result = ReadMember(member->GetResult(), nullptr);
        for (const Orbit::Member& p : member->GetParameters()) m.params.push_back(ReadMember(p, nullptr));
        for (const Orbit::TypeInfo* f : member->GetFaults()) m.faults.push_back(FlatName(f).value_or(""));
        out.methods.push_back(std::move(m));
    }
}

TypeEntry ReadType(Orbit::Type* type, Orbit::Version* seenBy) {
    TypeEntry e;
    e.name = type->GetName();
    e.flatName = type->GetWsdlName();
    e.kind = type->GetKind();
    e.version = VersionName(type);
    e.ns = NamespaceOf(e.name);
    e.className = tarngen::names::ClassPath(e.name);
    for (Orbit::Type* base = type->GetBaseType(); base != nullptr; base = base->GetBaseType()) e.baseChain.push_back(base->GetName());
    if (auto* managed = dynamic_cast<Orbit::ManagedObjectType*>(type)) {
        ReadManaged(managed, seenBy, e);
    } else if (auto* data = dynamic_cast<Orbit::DataObjectType*>(type)) {
        ReadData(data, seenBy, e);
    } else if (auto* enumeration = dynamic_cast<Orbit::EnumType*>(type)) {
        enumeration->GetEnumTags(e.tags);
    }
    return e;
}

// The types of the runtime itself (primitives, arrays, strata roots) are neither
// tarn types nor stand-ins.
bool IsStandin(Orbit::Type* type) {
    std::uint32_t kind = type->GetKind();
    if (kind != Orbit::Kind::Data && kind != Orbit::Kind::Fault && kind != Orbit::Kind::Managed && kind != Orbit::Kind::Enum)
        return false;
    for (const Orbit::RuntimeRecord& row : Orbit::kRuntimeRecords)
        if (type->GetName() == row.wireName) return false;
    return true;
}

std::string Lower(std::string s) {
    for (char& c : s) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    return s;
}

// Edit distance, for suggestions.
std::size_t Distance(const std::string& a, const std::string& b) {
    std::vector<std::size_t> row(b.size() + 1);
    for (std::size_t j = 0; j <= b.size(); ++j) row[j] = j;
    for (std::size_t i = 1; i <= a.size(); ++i) {
        std::size_t diagonal = row[0];
        row[0] = i;
        for (std::size_t j = 1; j <= b.size(); ++j) {
            std::size_t above = row[j];
            row[j] = std::min({row[j] + 1, row[j - 1] + 1, diagonal + (a[i - 1] == b[j - 1] ? 0 : 1)});
            diagonal = above;
        }
    }
    return row[b.size()];
}

}  // namespace

std::string NamespaceOf(const std::string& wireName) {
    std::string ns;
    std::size_t start = 0;
    while (start < wireName.size()) {
        std::size_t dot = wireName.find('.', start);
        if (dot == std::string::npos) break;  // the last segment always names a type
        if (!std::islower(static_cast<unsigned char>(wireName[start]))) break;
        ns = wireName.substr(0, dot);
        start = dot + 1;
    }
    return ns;
}

Orbit::Version* FindVersion(const std::string& name) { return Orbit::GetVersionMap()->GetVersion(name); }

Catalog ReadCatalog(Orbit::Version* seenBy) {
    Orbit::VersionMap* versionMap = Orbit::GetVersionMap();
    Orbit::TypeMap* typeMap = Orbit::GetTypeMap();
    Catalog c;
    if (seenBy != nullptr) c.seenBy = seenBy->GetName();
    c.calls = {versionMap->AddVersionCalls(), versionMap->AddIncludedVersionCalls(), typeMap->AddTypeCalls()};

    std::vector<Orbit::Version*> versions = versionMap->GetVersions();
    for (Orbit::Version* v : versions) {
        if (!Sees(seenBy, v)) continue;
        VersionEntry e{v->GetName(), v->GetServiceNamespace(), v->GetVersionId(), v->GetFlags(), {}};
        // As declared: a version's own entry is there only because the loaders declared it.
        for (Orbit::Version* other : versions)
            if (v->Includes(other)) e.includes.push_back(other->GetName());
        c.versions.push_back(std::move(e));
    }

    // The runtime's own types and the stand-ins of other libraries share the map.
    for (Orbit::Type* type : typeMap->GetTypes()) {
        const std::string& name = type->GetName();
        if (!name.starts_with(kTarnPrefix)) {
            if (IsStandin(type)) {
                c.standins.push_back(ReadType(type, seenBy));
                c.standins.back().standin = true;
                // A stand-in library's one header holds all its namespaces.
                c.standins.back().header = tarngen::names::Header(tarngen::names::Segments(name).front());
            }
            continue;
        }
        ++c.registeredTypes;
        std::string ns = NamespaceOf(name);
        if (std::find(c.loaders.begin(), c.loaders.end(), ns) == c.loaders.end()) c.loaders.push_back(ns);
        if (seenBy != nullptr && !type->IsVisible(seenBy)) continue;
        c.types.push_back(ReadType(type, seenBy));
        c.types.back().header = tarngen::names::Header(ns);
    }
    return c;
}

const TypeEntry* FindType(const Catalog& catalog, const std::string& name) {
    for (const auto* list : {&catalog.types, &catalog.standins})
        for (const TypeEntry& t : *list)
            if (t.name == name || t.flatName == name || t.className == name) return &t;
    return nullptr;
}

std::vector<std::string> CloseNames(const Catalog& catalog, const std::string& name) {
    std::string wanted = Lower(name);
    std::vector<std::pair<std::size_t, std::string>> scored;
    for (const auto* list : {&catalog.types, &catalog.standins}) {
        for (const TypeEntry& t : *list) {
            std::size_t best = std::string::npos;
            for (const std::string* candidate : {&t.name, &t.flatName, &t.className}) {
                std::string lower = Lower(*candidate);
                // A name given without its namespace is close to the full one.
                if (lower.ends_with("." + wanted) || lower.ends_with("::" + wanted)) best = 0;
                best = std::min(best, Distance(lower, wanted));
            }
            if (best <= std::max<std::size_t>(2, wanted.size() / 4)) scored.emplace_back(best, t.name);
        }
    }
    std::stable_sort(scored.begin(), scored.end(), [](const auto& a, const auto& b) { return a.first < b.first; });
    std::vector<std::string> out;
    for (const auto& [score, candidate] : scored)
        if (out.size() < 3) out.push_back(candidate);
    return out;
}

std::vector<const TypeEntry*> Ancestors(const Catalog& catalog, const TypeEntry& type) {
    std::vector<const TypeEntry*> out;
    for (const std::string& base : type.baseChain)
        if (const TypeEntry* t = FindType(catalog, base)) out.push_back(t);
    return out;
}

}  // namespace tarncatalog
