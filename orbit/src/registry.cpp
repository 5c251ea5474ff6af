#include <mutex>
#include <string_view>

#include "internal.h"
#include "kernite/Exception.h"
#include "orbit/Registry.h"

namespace Orbit {
namespace {

// Inclusion sets are read through Version, which does not know its map, so one
// lock guards the inclusions of every map.
std::shared_mutex& InclusionMutex() {
    static auto* mutex = new std::shared_mutex();
    return *mutex;
}

constexpr std::string_view kArraySuffix = "[]";

}  // namespace

Version::Version(std::string name, std::string serviceNamespace, std::string versionId, std::uint32_t flags,
                 std::string taskType)
    : _name(std::move(name)),
      _serviceNamespace(std::move(serviceNamespace)),
      _versionId(std::move(versionId)),
      _flags(flags),
      _taskType(std::move(taskType)) {}

bool Version::Includes(const Version* other) const {
    if (other == nullptr) return false;
    std::shared_lock<std::shared_mutex> lock(InclusionMutex());
    return _includedSet.count(other) != 0;
}

std::vector<Version*> Version::GetIncluded() const {
    std::shared_lock<std::shared_mutex> lock(InclusionMutex());
    return _included;
}

VersionMap::VersionMap() = default;
VersionMap::~VersionMap() = default;

// A repeat changes nothing (the first declaration stands), so recognising one is
// enough to return.
bool VersionMap::Repeats(const std::string& version, const std::string* included) const noexcept {
    struct Cursor {
        const VersionMap* map = nullptr;
        std::size_t next = 0;
    };
    thread_local Cursor cursor;
    if (cursor.map != this) cursor = Cursor{this, 0};
    const std::size_t count = _declaredCount.load(std::memory_order_acquire);
    // Where this thread's last match left off, or the start of another pass.
    for (std::size_t at : {cursor.next, std::size_t{0}}) {
        if (at >= count) continue;
        const Declaration& d = _declared[at / kChunk][at % kChunk];
        if ((d.included == nullptr) != (included == nullptr) || d.version->GetName() != version ||
            (included != nullptr && d.included->GetName() != *included))
            continue;
        cursor.next = at + 1;
        return true;
    }
    return false;
}

void VersionMap::Remember(const Version* version, const Version* included) {
    std::lock_guard<std::mutex> lock(_declaredMutex);
    const std::size_t at = _declaredCount.load(std::memory_order_relaxed);
    if (at >= kChunk * kChunks) return;
    if (!_declared[at / kChunk]) _declared[at / kChunk] = std::make_unique<Declaration[]>(kChunk);
    _declared[at / kChunk][at % kChunk] = Declaration{version, included};
    _declaredCount.store(at + 1, std::memory_order_release);
}

void VersionMap::AddVersion(const std::string& name, const std::string& serviceNamespace,
                            const std::string& versionId, std::uint32_t flags, const std::string& taskType,
                            std::uint32_t /*flags2*/, const std::string& /*reserved*/) {
    _addVersionCalls.fetch_add(1, std::memory_order_relaxed);
    if (Repeats(name, nullptr)) return;
    std::unique_lock<std::shared_mutex> lock(_mutex);
    if (_byName.count(name) != 0) return;  // the first declaration stands
    Version& version = _versions.emplace_back(name, serviceNamespace, versionId, flags, taskType);
    _byName.emplace(name, &version);
    Remember(&version, nullptr);
}

void VersionMap::AddIncludedVersion(const std::string& version, const std::string& included) {
    _addIncludedVersionCalls.fetch_add(1, std::memory_order_relaxed);
    if (Repeats(version, &included)) return;
    std::shared_lock<std::shared_mutex> lock(_mutex);
    auto from = _byName.find(version);
    if (from == _byName.end()) throw Kernite::InvalidArgumentException(version);
    auto to = _byName.find(included);
    if (to == _byName.end()) throw Kernite::InvalidArgumentException(included);
    std::unique_lock<std::shared_mutex> inclusions(InclusionMutex());
    if (from->second->_includedSet.insert(to->second).second) {
        from->second->_included.push_back(to->second);
        Remember(from->second, to->second);
    }
}

Version* VersionMap::GetVersion(const std::string& name) const {
    std::shared_lock<std::shared_mutex> lock(_mutex);
    auto it = _byName.find(name);
    return it == _byName.end() ? nullptr : it->second;
}

std::vector<Version*> VersionMap::GetVersions() const {
    std::shared_lock<std::shared_mutex> lock(_mutex);
    std::vector<Version*> out;
    out.reserve(_versions.size());
    for (const Version& v : _versions) out.push_back(const_cast<Version*>(&v));
    return out;
}

bool VersionMap::Includes(const std::string& version, const std::string& included) const {
    Version* from = GetVersion(version);
    Version* to = GetVersion(included);
    return from != nullptr && to != nullptr && from->Includes(to);
}

TypeMap::TypeMap() = default;
TypeMap::~TypeMap() = default;

void TypeMap::AddType(Type* type) {
    _addTypeCalls.fetch_add(1, std::memory_order_relaxed);
    if (type == nullptr) return;
    const std::string& name = type->GetName();
    std::unique_lock<std::shared_mutex> lock(_mutex);
    if (_byName.count(name) != 0) return;  // the first registration stands
    _types.emplace_back(type);
    _byName.emplace(name, type);
}

// Registered types first; then the runtime's own, which need no registration, and
// array types, named after their items.
Type* TypeMap::GetType(const std::string& name) const {
    {
        std::shared_lock<std::shared_mutex> lock(_mutex);
        auto it = _byName.find(name);
        if (it != _byName.end()) return it->second;
    }
    if (Type* own = detail::RuntimeTypeByName(name)) return own;
    if (name.size() > kArraySuffix.size() && name.ends_with(kArraySuffix)) {
        if (Type* item = GetType(name.substr(0, name.size() - kArraySuffix.size()))) return item->GetArrayType();
    }
    return nullptr;
}

std::vector<Type*> TypeMap::GetTypes() const {
    std::shared_lock<std::shared_mutex> lock(_mutex);
    std::vector<Type*> out;
    out.reserve(_types.size());
    for (const auto& type : _types) out.push_back(type.Get());
    return out;
}

// Never destroyed: type libraries may register from their static initialisers and
// use the maps from their static destructors, in any order relative to ours.
VersionMap* GetVersionMap() {
    static VersionMap* const map = new VersionMap();
    return map;
}

TypeMap* GetTypeMap() {
    static TypeMap* const map = new TypeMap();
    return map;
}

}  // namespace Orbit
