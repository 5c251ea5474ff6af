// Every registered type's records, field by field, against what the catalogue says:
// the library's catalogue (catalog-tests) and the runtime's test catalogue
// (fixture-records-tests), the same test on each.
// The catalogue is read with the generator's own parser; the defaults the catalogue
// format gives (wsdl name, a parameter's version, a missing result) are applied
// here from idl/README.md, so that a wrong default in the generator shows.
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <map>
#include <set>
#include <sstream>

#include "model.h"
#include "orbit/Orbit.h"
#include "values.h"

namespace {

using namespace tarngen;

// Counters taken while this program starts: the loaders have run, no test has yet.
const long kAddVersion = Orbit::GetVersionMap()->AddVersionCalls();
const long kAddIncludedVersion = Orbit::GetVersionMap()->AddIncludedVersionCalls();
const long kAddType = Orbit::GetTypeMap()->AddTypeCalls();

struct Catalogue {
    std::vector<FileSyntax> files;
    Model model;
};

const Catalogue& Read() {
    static const Catalogue catalogue = [] {
        Catalogue c;
        std::vector<std::filesystem::path> paths;
        for (const auto& entry : std::filesystem::recursive_directory_iterator(TARN_IDL_DIR))
            if (entry.path().extension() == ".idl") paths.push_back(entry.path());
        std::sort(paths.begin(), paths.end());
        for (const auto& path : paths) {
            std::ifstream in(path);
            std::stringstream text;
            text << in.rdbuf();
            c.files.push_back(ParseFile(path.generic_string(), text.str()));
        }
        c.model = Resolve(c.files);
        return c;
    }();
    return catalogue;
}

// The wire name a type reference of namespace `ns` names: a keyword, a name within
// the namespace, or a full wire name.
std::string Referenced(const std::string& ns, const std::string& name) {
    for (const Primitive& p : Primitives())
        if (p.keyword == name) return name;
    return Read().model.byWireName.count(ns + "." + name) ? ns + "." + name : name;
}

std::string Flat(const std::string& wire) {
    std::string out;
    bool start = true;
    for (char c : wire) {
        if (c == '.') start = true;
        else out += start ? static_cast<char>(std::toupper(static_cast<unsigned char>(c))) : c;
        if (c != '.') start = false;
    }
    return out;
}

std::string OrNull(const char* text) { return text ? text : "(null)"; }
std::string OrNull(const std::optional<std::string>& text) { return text.value_or("(null)"); }

void ExpectProperties(const std::string& ns, const std::vector<PropertySyntax>& syntax, const Orbit::PropertyInfo* list) {
    std::size_t i = 0;
    for (; list[i].flags != Orbit::Flag::End && i < syntax.size(); ++i) {
        const PropertySyntax& p = syntax[i];
        SCOPED_TRACE(p.where.ToString());
        EXPECT_STREQ(list[i].name, p.name.c_str());
        EXPECT_EQ(list[i].type->name, Referenced(ns, p.type));
        EXPECT_EQ(list[i].flags, p.flags);
        EXPECT_STREQ(list[i].version, p.version.c_str());
        EXPECT_EQ(OrNull(list[i].privilege), OrNull(p.privilege));
    }
    EXPECT_EQ(i, syntax.size());
    EXPECT_EQ(list[i].flags, Orbit::Flag::End);
}

void ExpectMethods(const std::string& ns, const TypeSyntax& t, const Orbit::ManagedObjectType* type) {
    const Orbit::ManagedTypeInfo* info = type->GetManagedTypeInfo();
    std::size_t i = 0;
    for (; info->methods[i].name != nullptr && i < t.methods.size(); ++i) {
        const MethodSyntax& m = t.methods[i];
        const Orbit::MethodInfo& r = info->methods[i];
        SCOPED_TRACE(m.where.ToString());
        EXPECT_STREQ(r.name, m.name.c_str());
        EXPECT_EQ(r.wsdlName, m.wsdlName.value_or(m.name));
        EXPECT_EQ(OrNull(r.privilege), OrNull(m.privilege));
        EXPECT_EQ(r.flags, m.task ? Orbit::MethodFlag::Task : 0u);
        EXPECT_STREQ(r.version, m.version.c_str());
        EXPECT_STREQ(r.result.name, "result");
        EXPECT_EQ(r.result.type ? r.result.type->name : "(none)", m.result ? Referenced(ns, m.result->type) : "(none)");
        EXPECT_EQ(r.result.flags, m.result ? m.result->flags : 0u);
        EXPECT_STREQ(r.result.version, m.result ? m.result->version.c_str() : Orbit::kNoneVersion);
        std::size_t j = 0;
        for (; r.params[j].flags != Orbit::Flag::End && j < m.params.size(); ++j) {
            EXPECT_STREQ(r.params[j].name, m.params[j].name.c_str());
            EXPECT_EQ(r.params[j].type->name, Referenced(ns, m.params[j].type));
            EXPECT_EQ(r.params[j].flags, m.params[j].flags);
            EXPECT_EQ(r.params[j].version, m.params[j].version.value_or(m.version));
        }
        EXPECT_EQ(j, m.params.size());
        EXPECT_EQ(r.params[j].flags, Orbit::Flag::End);
        std::vector<std::string> faults;
        for (const Orbit::TypeInfo* const* f = r.faults; *f; ++f) faults.push_back((*f)->name);
        std::vector<std::string> declared;
        for (const auto& [where, name] : m.faults) declared.push_back(Referenced(ns, name));
        EXPECT_EQ(faults, declared);
    }
    EXPECT_EQ(i, t.methods.size());
    EXPECT_EQ(info->methods[i].name, nullptr);
    ExpectProperties(ns, t.properties, info->properties);

    // Members by number: own methods, then own properties, each with its method object.
    const auto& members = type->GetMembers();
    ASSERT_EQ(members.size(), t.methods.size() + t.properties.size());
    for (std::size_t k = 0; k < members.size(); ++k) {
        const bool getter = k >= t.methods.size();
        EXPECT_EQ(members[k]->GetName(), getter ? t.properties[k - t.methods.size()].name : t.methods[k].name);
        EXPECT_EQ(members[k]->IsPropertyGetter(), getter);
        EXPECT_EQ(members[k]->GetMemberNumber(), static_cast<int>(k));
        EXPECT_EQ(info->methodObjects[k], members[k].Get());
    }
    EXPECT_EQ(info->methodObjects[members.size()], nullptr);
}

TEST(Records, EveryFieldOfEveryTypeIsWhatTheCatalogueSays) {
    std::size_t types = 0;
    for (const FileSyntax& file : Read().files) {
        for (const TypeSyntax& t : file.types) {
            const std::string wire = t.ns + "." + t.name;
            SCOPED_TRACE(t.where.ToString() + " " + wire);
            Orbit::Type* type = Orbit::GetTypeMap()->GetType(wire);
            ASSERT_NE(type, nullptr);
            ++types;
            const Orbit::TypeInfo* header = dynamic_cast<Orbit::TypeImpl*>(type)->GetRecord();
            EXPECT_EQ(header->kind, static_cast<std::uint32_t>(t.kind));
            EXPECT_EQ(header->name, wire);
            EXPECT_EQ(header->flatName, Flat(wire));
            EXPECT_EQ(header->version, t.version);
            if (t.kind == Kind::Enum) {
                std::vector<std::string> tags;
                dynamic_cast<Orbit::EnumType*>(type)->GetEnumTags(tags);
                EXPECT_EQ(tags, t.tags);
                continue;
            }
            std::string root;  // the runtime's root of the kind
            for (const Orbit::RuntimeRecord& row : Orbit::kRuntimeRecords)
                if (row.root && row.kind == static_cast<std::uint32_t>(t.kind)) root = row.wireName;
            ASSERT_NE(type->GetBaseType(), nullptr);
            EXPECT_EQ(type->GetBaseType()->GetName(), t.base ? Referenced(t.ns, *t.base) : root);
            if (t.kind == Kind::Managed) {
                ExpectMethods(t.ns, t, dynamic_cast<Orbit::ManagedObjectType*>(type));
            } else {
                const Orbit::DataTypeInfo* info = dynamic_cast<Orbit::DataObjectType*>(type)->GetDataTypeInfo();
                EXPECT_EQ(info->header, header);
                EXPECT_EQ(info->base->name, type->GetBaseType()->GetName());
                ExpectProperties(t.ns, t.properties, info->properties);
            }
        }
    }
    EXPECT_EQ(types, Orbit::GetTypeMap()->GetTypes().size()) << "a registered type the catalogue does not have";
}

// A fresh object's properties are set when required and held by value; a value
// written makes one set; unset clears only the optional ones.
TEST(Records, SetAndUnsetFollowEachPropertysFlags) {
    std::vector<Orbit::DataObjectType*> types = Reliability::RegisteredDataTypes();
    types.push_back(Orbit::GetDoType<Orbit::MethodFault>());  // the runtime's own records too
    types.push_back(Orbit::GetDoType<Orbit::KeyAnyValue>());
    for (Orbit::DataObjectType* type : types) {
        const Orbit::DataTypeInfo* info = type->GetDataTypeInfo();
        for (int i = 0; info->properties[i].flags != Orbit::Flag::End; ++i) {
            const Orbit::PropertyInfo& p = info->properties[i];
            SCOPED_TRACE(type->GetName() + "." + p.name);
            const bool optional = p.flags & Orbit::Flag::Optional, array = p.flags & Orbit::Flag::Array;
            const bool byReference = array || (p.type->kind != Orbit::Kind::Enum &&
                                                   (p.type->kind != Orbit::Kind::Primitive || p.type == &Orbit::gAnyTypeInfo));
            Kernite::Ref<Orbit::DataObject> object = type->CreateInstance();
            EXPECT_EQ(info->isPropertySet(object.Get(), i), !optional && !byReference);
            Reliability::Chooser choose(static_cast<std::uint32_t>(i) + 1);
            Reliability::SetChosen(object.Get(), type, i, choose, 1, 2);
            EXPECT_TRUE(info->isPropertySet(object.Get(), i));
            info->unsetProperty(object.Get(), i);
            EXPECT_EQ(info->isPropertySet(object.Get(), i), !optional);
        }
    }
}

TEST(Records, TheLoadersRegisteredEveryTypeOnceInLoaderOrder) {
    const Model& model = Read().model;
    std::vector<std::string> expected, registered;
    std::set<std::string> all, standins;
    long units = 0;
    for (const auto& unit : model.units) {
        units += unit->standin ? 0 : 1;
        for (const Type* t : unit->RegistrationOrder()) {
            if (unit->standin) standins.insert(t->wireName);
            else expected.push_back(t->wireName);
            all.insert(t->wireName);
        }
    }
    for (Orbit::Type* t : Orbit::GetTypeMap()->GetTypes()) {
        EXPECT_EQ(all.erase(t->GetName()), 1u) << t->GetName() << " registered twice, or not catalogued";
        if (!standins.count(t->GetName())) registered.push_back(t->GetName());
    }
    EXPECT_TRUE(all.empty()) << all.size() << " catalogued types are not registered, " << *all.begin();
    EXPECT_EQ(registered, expected);
    EXPECT_EQ(kAddType, static_cast<long>(Orbit::GetTypeMap()->GetTypes().size()));
    EXPECT_EQ(kAddVersion, units * static_cast<long>(model.versions.size()));
    EXPECT_EQ(kAddIncludedVersion, units * model.InclusionCount());
}

TEST(Records, VersionsAndTheirInclusionsAreTheCatalogues) {
    const Model& model = Read().model;
    std::vector<std::string> names;
    for (const Orbit::Version* v : Orbit::GetVersionMap()->GetVersions()) names.push_back(v->GetName());
    ASSERT_EQ(names.size(), model.versions.size());
    for (std::size_t i = 0; i < model.versions.size(); ++i) {
        const Version& m = model.versions[i];
        SCOPED_TRACE(m.where.ToString());
        const Orbit::Version* v = Orbit::GetVersionMap()->GetVersion(m.name);
        ASSERT_NE(v, nullptr);
        EXPECT_EQ(names[i], m.name);
        EXPECT_EQ(v->GetServiceNamespace(), m.serviceNamespace);
        EXPECT_EQ(v->GetVersionId(), m.versionId);
        EXPECT_EQ(v->GetFlags(), m.flag);
        std::set<std::string> included;
        for (const Orbit::Version* other : v->GetIncluded()) included.insert(other->GetName());
        std::set<std::string> expected;
        for (int j : m.included) expected.insert(model.versions[j].name);
        EXPECT_EQ(included, expected);
        // Reflexive and transitive, whatever the catalogue wrote.
        EXPECT_TRUE(v->Includes(v));
        for (const Orbit::Version* other : v->GetIncluded())
            for (const Orbit::Version* further : other->GetIncluded()) EXPECT_TRUE(v->Includes(further));
    }
}

}  // namespace
