// From syntax trees to the validated model.
#include "model.h"

#include <algorithm>
#include <functional>
#include <set>

#include "names.h"

namespace tarngen {
namespace {

const char* KindWord(Kind kind) {
    switch (kind) {
    case Kind::Data: return "data object";
    case Kind::Fault: return "fault";
    case Kind::Managed: return "managed type";
    case Kind::Enum: return "enumeration";
    }
    return "";
}

class Resolver {
public:
    // Each step reports every error it meets; a step runs only when the steps it
    // builds on went through, so that one mistake is not reported again as its echoes.
    Model Run(std::vector<FileSyntax>& files) {
        AddRuntimeTypes();
        for (FileSyntax& f : files) ReadVersions(f);
        if (_model.versions.empty() && _diagnostics.Empty()) throw CatalogueError({"idl", 0}, "no versions are catalogued");
        _diagnostics.Check();
        Try([&] { CloseVersions(); });
        Try([&] { ReadLoaders(files); });
        _diagnostics.Check();
        for (FileSyntax& f : files) Try([&] { DeclareTypes(f); });
        _diagnostics.Check();
        for (auto& [type, syntax] : _declared) ResolveType(*type, *syntax);
        _diagnostics.Check();
        for (const auto& declared : _declared) Try([&] { CheckBaseChain(*declared.first, *declared.second); });
        for (const auto& declared : _declared)
            if (declared.first->kind == Kind::Managed) Try([&] { CheckMemberNames(*declared.first); });
        _diagnostics.Check();
        return std::move(_model);
    }

private:
    template <class Step>
    void Try(Step step) {
        try {
            step();
        } catch (const CatalogueError& e) {
            _diagnostics.Add(e);
        }
    }

    // The runtime's own types that a catalogue may name but not redeclare, from the
    // runtime's table; primitives are keywords instead (see Primitives()).
    void AddRuntimeTypes() {
        for (const Orbit::RuntimeRecord& row : Orbit::kRuntimeRecords) {
            if (row.kind == Orbit::Kind::Primitive) continue;
            auto type = std::make_unique<Type>();
            type->kind = static_cast<Kind>(row.kind);
            type->runtime = true;
            type->wireName = row.wireName;
            type->name = names::Segments(row.wireName).back();
            type->flatName = row.symbol;
            type->className = "Orbit::" + type->name;
            type->record = names::RuntimeRecord(row.symbol);
            type->version = Orbit::kNoneVersion;
            if (row.root) _roots[type->kind] = type.get();
            _model.byWireName[row.wireName] = type.get();
            _model.types.push_back(std::move(type));
        }
    }

    void ReadVersions(const FileSyntax& file) {
        for (const VersionSyntax& v : file.versions) {
            if (auto it = _versionIndex.find(v.name); it != _versionIndex.end()) {
                _diagnostics.Add(CatalogueError(v.where, "version '" + v.name + "' is declared twice (first at " +
                                                             _model.versions[it->second].where.ToString() + ")"));
                continue;
            }
            _versionIndex[v.name] = static_cast<int>(_model.versions.size());
            Version version;
            version.where = v.where;
            version.name = v.name;
            version.serviceNamespace = v.serviceNamespace;
            version.versionId = v.versionId;
            version.flag = v.flag;
            _model.versions.push_back(version);
            _versionIncludes.push_back(&v);
        }
    }

    void CloseVersions() {
        for (std::size_t i = 0; i < _model.versions.size(); ++i) {
            for (const std::string& name : _versionIncludes[i]->includes) {
                auto it = _versionIndex.find(name);
                if (it == _versionIndex.end())
                    throw CatalogueError(_model.versions[i].where, "unknown version '" + name + "' in includes");
                _model.versions[i].direct.push_back(it->second);
            }
        }
        std::vector<int> state(_model.versions.size(), 0);  // 0 new, 1 on the path, 2 closed
        std::function<std::set<int>(int)> close = [&](int i) {
            Version& v = _model.versions[i];
            if (state[i] == 1) throw CatalogueError(v.where, "version '" + v.name + "' includes itself through a cycle");
            std::set<int> all = {i};
            if (state[i] == 2) {
                all.insert(v.included.begin(), v.included.end());
                return all;
            }
            state[i] = 1;
            for (int d : v.direct) {
                std::set<int> sub = close(d);
                all.insert(sub.begin(), sub.end());
            }
            state[i] = 2;
            v.included.assign(all.begin(), all.end());  // indexes sort into registration order
            return all;
        };
        for (std::size_t i = 0; i < _model.versions.size(); ++i) close(static_cast<int>(i));
    }

    void CheckVersion(const Location& where, const std::string& name) {
        if (!_versionIndex.count(name)) throw CatalogueError(where, "version '" + name + "' is not among the catalogued versions");
    }

    void ReadLoaders(const std::vector<FileSyntax>& files) {
        const FileSyntax* listing = nullptr;
        for (const FileSyntax& f : files) {
            if (f.loaders.empty()) continue;
            if (listing) throw CatalogueError(f.loadersWhere, "the loader order is stated twice");
            listing = &f;
        }
        if (!listing) throw CatalogueError({"idl", 0}, "no 'loaders' statement gives the loader order");
        _model.root = names::Segments(listing->loaders.front()).front();
        std::set<std::string> namespaces;
        for (const FileSyntax& f : files)
            if (!f.standin && !f.unit.empty()) namespaces.insert(f.unit);
        for (std::size_t i = 0; i < listing->loaders.size(); ++i) {
            const std::string& ns = listing->loaders[i];
            if (!namespaces.count(ns)) throw CatalogueError(listing->loadersWhere, "no catalogue file declares namespace '" + ns + "'");
            if (!_loadOrder.emplace(ns, static_cast<int>(i)).second)
                throw CatalogueError(listing->loadersWhere, "namespace '" + ns + "' is listed twice");
        }
        for (const std::string& ns : namespaces)
            if (!_loadOrder.count(ns)) throw CatalogueError(listing->loadersWhere, "namespace '" + ns + "' is missing from the loader order");
    }

    Unit* MakeUnit(const FileSyntax& file) {
        for (auto& unit : _model.units)
            if (unit->name == file.unit)
                throw CatalogueError({file.path, 1}, "'" + file.unit + "' is also catalogued in " + unit->file);
        auto unit = std::make_unique<Unit>();
        unit->file = file.path;
        unit->source = file.source.empty() ? file.path : file.source;
        unit->name = file.unit;
        unit->standin = file.standin;
        unit->flatName = names::Flat(file.unit);
        unit->outputDir = names::SourceDir(file.unit);
        unit->header = names::Header(file.unit);
        unit->detailHeader = names::DetailHeader(unit->header);
        unit->sourcePath = unit->outputDir;
        unit->loaderClass = names::Loader(file.unit);
        unit->loadOrder = file.standin ? 0 : _loadOrder.at(file.unit);
        Unit* raw = unit.get();
        // Catalogue units in load order first, stand-ins after, each group stable.
        auto at = std::find_if(_model.units.begin(), _model.units.end(), [&](const std::unique_ptr<Unit>& u) {
            if (raw->standin) return false;
            return u->standin || u->loadOrder > raw->loadOrder;
        });
        _model.units.insert(at, std::move(unit));
        return raw;
    }

    void DeclareTypes(FileSyntax& file) {
        if (file.unit.empty()) return;
        Unit* unit = MakeUnit(file);
        for (TypeSyntax& syntax : file.types) Try([&] { DeclareType(unit, syntax); });
    }

    void DeclareType(Unit* unit, TypeSyntax& syntax) {
        {
            auto type = std::make_unique<Type>();
            type->where = syntax.where;
            type->doc = syntax.doc;
            type->kind = syntax.kind;
            type->unit = unit;
            type->wireName = syntax.ns + "." + syntax.name;
            type->name = names::Segments(syntax.name).back();
            type->flatName = names::Flat(type->wireName);
            type->className = names::ClassPath(type->wireName);
            type->record = names::Record(type->wireName);
            for (const std::string& segment : names::Segments(syntax.ns)) type->classNamespaces.push_back(names::Capitalise(segment));
            type->version = syntax.version;
            CheckVersion(syntax.where, syntax.version);
            if (type->name[0] < 'A' || type->name[0] > 'Z')
                throw CatalogueError(syntax.where, "type name '" + type->name + "' must start with a capital letter");
            auto [it, fresh] = _model.byWireName.emplace(type->wireName, type.get());
            if (!fresh) {
                std::string first = it->second->runtime ? "the runtime" : it->second->where.ToString();
                throw CatalogueError(syntax.where, "type '" + type->wireName + "' is already declared (" + first + ")");
            }
            unit->types.push_back(type.get());
            _declared.emplace_back(type.get(), &syntax);
            _model.types.push_back(std::move(type));
        }
    }

    const Type* FindType(const std::string& ns, const std::string& name) const {
        auto it = _model.byWireName.find(ns + "." + name);
        if (it != _model.byWireName.end()) return it->second;
        it = _model.byWireName.find(name);
        return it == _model.byWireName.end() ? nullptr : it->second;
    }

    TypeRef Reference(const Location& where, const std::string& ns, const std::string& name) const {
        TypeRef ref;
        for (const Primitive& p : Primitives())
            if (p.keyword == name) ref.primitive = &p;
        if (!ref.primitive) ref.type = FindType(ns, name);
        if (!ref.primitive && !ref.type) throw CatalogueError(where, "unknown type '" + name + "'");
        if (ref.type && ref.type == _roots.at(Kind::Data))
            throw CatalogueError(where, "'" + ref.type->wireName + "' is a base, not a value type");
        return ref;
    }

    void ResolveType(Type& type, const TypeSyntax& syntax) {
        Try([&] { ResolveShape(type, syntax); });
        ResolveMembers(type, syntax);
    }

    // Outer type, base and tags.
    void ResolveShape(Type& type, const TypeSyntax& syntax) {
        const std::string& ns = syntax.ns;
        // Outer type of a nested type.
        std::vector<std::string> path = names::Segments(syntax.name);
        if (path.size() > 1) {
            std::string outerName = syntax.name.substr(0, syntax.name.rfind('.'));
            auto it = _model.byWireName.find(ns + "." + outerName);
            if (it == _model.byWireName.end() || it->second->unit != type.unit)
                throw CatalogueError(syntax.where, "outer type '" + ns + "." + outerName + "' is not declared in this file");
            if (it->second->kind == Kind::Enum) throw CatalogueError(syntax.where, "an enumeration cannot hold nested types");
            type.outer = it->second;
        }
        // Base.
        if (type.kind != Kind::Enum) {
            std::string baseName = syntax.base ? *syntax.base : _roots.at(type.kind)->wireName;
            const Type* base = FindType(ns, baseName);
            if (!base) throw CatalogueError(syntax.where, "unknown base '" + baseName + "'");
            if (base->kind != type.kind || base == &type)
                throw CatalogueError(syntax.where, "base '" + base->wireName + "' of a " + KindWord(type.kind) + " must be another " + KindWord(type.kind));
            type.base = base;
        }
        type.tags = syntax.tags;
        if (type.kind == Kind::Enum) {
            if (type.tags.empty()) throw CatalogueError(syntax.where, "enumeration '" + type.wireName + "' has no tags");
            std::set<std::string> seen, constants;
            for (const std::string& tag : type.tags) {
                if (!seen.insert(tag).second) throw CatalogueError(syntax.tagsWhere, "tag '" + tag + "' is given twice");
                if (!constants.insert(names::Upper(tag)).second)
                    throw CatalogueError(syntax.tagsWhere, "tag '" + tag + "' gives the same constant as another tag");
            }
        }
    }

    void ResolveMembers(Type& type, const TypeSyntax& syntax) {
        const std::string& ns = syntax.ns;
        std::map<std::string, Location> memberNames;
        auto claim = [&](const std::string& name, const Location& where) {
            auto [it, fresh] = memberNames.emplace(name, where);
            if (!fresh) throw CatalogueError(where, "member '" + name + "' is declared twice (first at " + it->second.ToString() + ")");
        };
        int number = 0;
        for (const MethodSyntax& m : syntax.methods) {
            Try([&] {
                claim(m.name, m.where);
                type.methods.push_back(ResolveMethod(ns, m));
                type.methods.back().memberNumber = number++;
            });
        }
        int index = 0;
        for (const PropertySyntax& p : syntax.properties) Try([&] {
            claim(p.name, p.where);
            Property property;
            property.where = p.where;
            property.doc = p.doc;
            property.name = p.name;
            property.type = Reference(p.where, ns, p.type);
            property.flags = p.flags;
            property.version = p.version;
            property.privilege = p.privilege.value_or("");
            property.index = index++;
            property.memberNumber = number++;
            CheckVersion(p.where, p.version);
            if (type.kind == Kind::Managed) CheckDelivered(p.where, property.type, p.flags, "property");
            type.properties.push_back(std::move(property));
        });
    }

    Method ResolveMethod(const std::string& ns, const MethodSyntax& m) {
        Method method;
        method.where = m.where;
        method.doc = m.doc;
        method.name = m.name;
        method.operation = names::Capitalise(m.name);
        method.wsdlName = m.wsdlName.value_or(m.name);
        method.version = m.version;
        method.task = m.task;
        method.privilege = m.privilege.value_or("");
        CheckVersion(m.where, m.version);
        std::map<std::string, Location> paramNames;
        for (const ParamSyntax& p : m.params) {
            if (auto [it, fresh] = paramNames.emplace(p.name, p.where); !fresh)
                throw CatalogueError(p.where, "parameter '" + p.name + "' is declared twice (first at " + it->second.ToString() + ")");
            Param param;
            param.where = p.where;
            param.doc = p.doc;
            param.name = p.name;
            param.type = Reference(p.where, ns, p.type);
            param.flags = p.flags;
            param.version = p.version.value_or(m.version);
            CheckVersion(p.where, param.version);
            CheckParameter(param);
            method.params.push_back(std::move(param));
        }
        if (m.result) {
            method.hasResult = true;
            method.result.where = m.result->where;
            method.result.name = "result";
            method.result.type = Reference(m.result->where, ns, m.result->type);
            method.result.flags = m.result->flags;
            method.result.version = m.result->version;
            CheckVersion(m.result->where, m.result->version);
            if (!m.task) CheckDelivered(m.result->where, method.result.type, m.result->flags, "result");
        } else {
            method.result.version = Orbit::kNoneVersion;
        }
        if (m.task && !method.wsdlName.ends_with("_Task"))
            throw CatalogueError(m.where, "the wsdl name of task method '" + m.name + "' must end in \"_Task\"");
        for (const auto& [where, name] : m.faults) {
            const Type* fault = FindType(ns, name);
            if (!fault || fault->kind != Kind::Fault) throw CatalogueError(where, "'" + name + "' is not a fault");
            method.faults.push_back(fault);
        }
        return method;
    }

    // Parameters: values by value (not optional, not arrays of anything but
    // strings and ints), objects and arrays by pointer.
    void CheckParameter(const Param& p) {
        bool array = p.flags & Orbit::Flag::Array, optional = p.flags & Orbit::Flag::Optional;
        if (p.type.IsObject() || array) return;
        if (optional) throw CatalogueError(p.where, "parameter '" + p.name + "': an optional " + p.type.DisplayName() + " cannot be passed by value");
    }

    // How a managed member hands back a value: by value for required strings and
    // integers and booleans, through a Ref parameter for objects and arrays.
    void CheckDelivered(const Location& where, const TypeRef& type, std::uint32_t flags, const char* what) {
        bool array = flags & Orbit::Flag::Array, optional = flags & Orbit::Flag::Optional;
        if (array || type.IsObject()) return;
        if (optional || !type.primitive || !type.primitive->byValueResult)
            throw CatalogueError(where, std::string("a ") + what + " of type " + type.DisplayName() + " with flags " +
                                            std::to_string(flags) + " cannot be delivered by a managed member");
    }

    void CheckBaseChain(const Type& type, const TypeSyntax& syntax) {
        std::set<const Type*> seen;
        for (const Type* t = &type; t; t = t->base)
            if (!seen.insert(t).second) throw CatalogueError(syntax.where, "the base chain of '" + type.wireName + "' is a cycle");
        // A data object's accessors share one class scope with those of its bases and the runtime's.
        if (type.IsDataLike()) {
            std::map<std::string, const Property*> getters;
            for (const Property* p : type.ChainProperties()) {
                auto [it, fresh] = getters.emplace(names::Accessor("Get", p->name), p);
                if (!fresh && it->second->name == p->name)
                    throw CatalogueError(p->where, "property '" + p->name + "' is already a property of a base of '" + type.wireName + "'");
                if (!fresh)
                    throw CatalogueError(p->where, "the accessors of property '" + p->name + "' of '" + type.wireName +
                                                       "' collide with those of '" + it->second->name + "' at " + it->second->where.ToString());
                for (const char* prefix : {"Get", "Set"})
                    if (kReserved.count(names::Accessor(prefix, p->name)))
                        throw CatalogueError(p->where, "accessor '" + names::Accessor(prefix, p->name) + "' of '" + type.wireName +
                                                           "' collides with the runtime's");
            }
        }
    }

    // Names the runtime's base classes already give every object.
    inline static const std::set<std::string> kReserved = {"IncRef", "DecRef", "ToString", "GetRefCount", "_GetType", "_GetRef", "_Unregistered"};

    // Getters and operations of an interface and of its bases share one scope.
    void CheckMemberNames(const Type& type) {
        std::map<std::string, Location> taken;
        std::vector<const Type*> chain;  // root-most first, so a clash is reported at the derived member
        for (const Type* t = &type; t && !t->runtime; t = t->base) chain.insert(chain.begin(), t);
        for (const Type* t : chain) {
            for (const Method& m : t->methods) Claim(taken, kReserved, m.operation, m.where, type);
            for (const Property& p : t->properties)
                Claim(taken, kReserved, names::Accessor(IsBoolean(p.type) && !p.IsArray() ? "Is" : "Get", p.name), p.where, type);
        }
    }

    static bool IsBoolean(const TypeRef& t) { return t.primitive && t.primitive->keyword == "boolean"; }

    static void Claim(std::map<std::string, Location>& taken, const std::set<std::string>& reserved, const std::string& name,
                      const Location& where, const Type& type) {
        if (reserved.count(name)) throw CatalogueError(where, "member '" + name + "' of '" + type.wireName + "' collides with the runtime's '" + name + "'");
        auto [it, fresh] = taken.emplace(name, where);
        if (!fresh) throw CatalogueError(where, "member '" + name + "' of '" + type.wireName + "' collides with the member at " + it->second.ToString());
    }

    Model _model;
    std::map<std::string, int> _versionIndex;
    std::vector<const VersionSyntax*> _versionIncludes;
    std::map<std::string, int> _loadOrder;
    std::map<Kind, const Type*> _roots;
    std::vector<std::pair<Type*, const TypeSyntax*>> _declared;
    Diagnostics _diagnostics;
};

}  // namespace

std::vector<const Property*> Type::ChainProperties() const {
    std::vector<const Type*> chain;
    for (const Type* t = this; t && !t->runtime; t = t->base) chain.push_back(t);
    std::vector<const Property*> out;
    for (auto it = chain.rbegin(); it != chain.rend(); ++it)
        for (const Property& p : (*it)->properties) out.push_back(&p);
    return out;
}

std::vector<const Type*> Unit::RegistrationOrder() const {
    std::vector<const Type*> out;
    for (Kind group : {Kind::Managed, Kind::Data, Kind::Enum})
        for (const Type* t : types)
            if (t->kind == group || (group == Kind::Data && t->kind == Kind::Fault)) out.push_back(t);
    return out;
}

std::vector<const Type*> Unit::DefinitionOrder() const {
    // Depth-first: a type's base and outer type (when in this unit) come before it.
    std::vector<const Type*> out;
    std::set<const Type*> done;
    std::function<void(const Type*)> visit = [&](const Type* t) {
        if (!t || t->unit != this || done.count(t)) return;
        done.insert(t);
        visit(t->outer);
        visit(t->base);
        for (const Property& p : t->properties)
            if (p.type.type && p.type.type->outer) visit(p.type.type->outer);
        out.push_back(t);
    };
    for (const Type* t : types) visit(t);
    return out;
}

std::vector<const Unit*> Unit::HeaderDependencies() const {
    std::set<const Unit*> deps;
    auto note = [&](const TypeRef& ref) {
        if (ref.type && !ref.type->runtime && ref.type->unit != this && ref.type->kind != Kind::Managed) deps.insert(ref.type->unit);
    };
    for (const Type* t : types) {
        if (t->base && !t->base->runtime && t->base->unit != this) deps.insert(t->base->unit);
        for (const Property& p : t->properties) note(p.type);
        for (const Method& m : t->methods) {
            for (const Param& p : m.params) note(p.type);
            if (m.hasResult && !m.task) note(m.result.type);
        }
    }
    std::vector<const Unit*> out(deps.begin(), deps.end());
    std::sort(out.begin(), out.end(), [](const Unit* a, const Unit* b) { return a->header < b->header; });
    return out;
}

std::vector<const Unit*> Model::Units(bool standin) const {
    std::vector<const Unit*> out;
    for (const auto& u : units)
        if (u->standin == standin) out.push_back(u.get());
    return out;
}

int Model::InclusionCount() const {
    int n = 0;
    for (const Version& v : versions) n += static_cast<int>(v.included.size());
    return n;
}

Model Resolve(std::vector<FileSyntax> files) {
    Resolver resolver;
    return resolver.Run(files);
}

}  // namespace tarngen
