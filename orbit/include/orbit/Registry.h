// The process-wide version and type registries. Loaders fill them during static
// initialisation; afterwards they are read from any thread.
#pragma once

#include <atomic>
#include <cstdint>
#include <deque>
#include <memory>
#include <mutex>
#include <shared_mutex>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "orbit/Type.h"

namespace Orbit {

class Version {
public:
    Version(std::string name, std::string serviceNamespace, std::string versionId, std::uint32_t flags,
            std::string taskType);

    const std::string& GetName() const noexcept { return _name; }
    const std::string& GetServiceNamespace() const noexcept { return _serviceNamespace; }
    const std::string& GetVersionId() const noexcept { return _versionId; }
    std::uint32_t GetFlags() const noexcept { return _flags; }
    const std::string& GetTaskType() const noexcept { return _taskType; }

    // Whether `other` was declared as included in this version.
    bool Includes(const Version* other) const;
    // Whether this version sees what `introducedIn` introduced: its own additions and
    // those of every version it includes. The one visibility rule of the runtime;
    // types, members and tools all ask it. Null sees nothing and is seen by none.
    bool Sees(const Version* introducedIn) const {
        return introducedIn != nullptr && (introducedIn == this || Includes(introducedIn));
    }
    // The included versions in the order they were declared.
    std::vector<Version*> GetIncluded() const;

private:
    friend class VersionMap;
    std::string _name;
    std::string _serviceNamespace;
    std::string _versionId;
    std::uint32_t _flags;
    std::string _taskType;
    std::vector<Version*> _included;          // guarded by the registry's inclusion lock
    std::unordered_set<const Version*> _includedSet;
};

// Versions and the inclusion relation as declared; a repeated declaration changes
// nothing. Versions live as long as the process.
class VersionMap {
public:
    VersionMap();
    virtual ~VersionMap();

    virtual void AddVersion(const std::string& name, const std::string& serviceNamespace,
                            const std::string& versionId, std::uint32_t flags, const std::string& taskType,
                            std::uint32_t flags2, const std::string& reserved);
    // Both versions must have been added; otherwise Kernite::InvalidArgumentException.
    virtual void AddIncludedVersion(const std::string& version, const std::string& included);

    // Null when unknown.
    Version* GetVersion(const std::string& name) const;
    // In registration order.
    std::vector<Version*> GetVersions() const;
    bool Includes(const std::string& version, const std::string& included) const;

    long AddVersionCalls() const noexcept { return _addVersionCalls.load(); }
    long AddIncludedVersionCalls() const noexcept { return _addIncludedVersionCalls.load(); }

private:
    // Every declaration that changed the map, in order. Each loader of a library
    // declares the same list again; such a repeat is recognised by comparing the
    // names with the entry after the one the calling thread matched last, without
    // hashing or locking. Entries never move once published, so they are read
    // without a lock up to the published count.
    struct Declaration {
        const Version* version;
        const Version* included;  // null for AddVersion
    };
    static constexpr std::size_t kChunk = 512;
    static constexpr std::size_t kChunks = 64;  // beyond that, declarations are not remembered
    bool Repeats(const std::string& version, const std::string* included) const noexcept;
    void Remember(const Version* version, const Version* included);

    std::mutex _declaredMutex;
    std::unique_ptr<Declaration[]> _declared[kChunks];
    std::atomic<std::size_t> _declaredCount{0};

    mutable std::shared_mutex _mutex;
    std::deque<Version> _versions;
    std::unordered_map<std::string, Version*> _byName;
    std::atomic<long> _addVersionCalls{0};
    std::atomic<long> _addIncludedVersionCalls{0};
};

// Types by wire name. Adding a type twice changes nothing; a different type under a
// name already taken is ignored too (the first registration stands); null is ignored.
class TypeMap {
public:
    TypeMap();
    virtual ~TypeMap();

    virtual void AddType(Type* type);

    // Null when unknown.
    Type* GetType(const std::string& name) const;
    // In first-registration order.
    std::vector<Type*> GetTypes() const;

    long AddTypeCalls() const noexcept { return _addTypeCalls.load(); }

private:
    mutable std::shared_mutex _mutex;
    std::vector<Kernite::Ref<Type>> _types;
    std::unordered_map<std::string, Type*> _byName;
    std::atomic<long> _addTypeCalls{0};
};

VersionMap* GetVersionMap();
TypeMap* GetTypeMap();

}  // namespace Orbit
