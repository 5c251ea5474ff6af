// Writes values, calls, results and faults as XML text, walking values through the
// schema's tables and the records' functions.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "schema.h"

namespace Orbit::Wire {

inline constexpr std::string_view kSoapNamespace = "http://schemas.xmlsoap.org/soap/envelope/";
// The actor of a header entry meant for whoever receives the message first.
inline constexpr std::string_view kNextActor = "http://schemas.xmlsoap.org/soap/actor/next";
inline constexpr std::string_view kXsdNamespace = "http://www.w3.org/2001/XMLSchema";
inline constexpr std::string_view kXsiNamespace = "http://www.w3.org/2001/XMLSchema-instance";

class Encoder {
public:
    Encoder(const Schema& schema, std::string& out) : _schema(schema), _out(out) {}

    // <e:Envelope ...><e:Body> and the body's element, in our namespace.
    void OpenEnvelope(std::string_view element);
    void CloseEnvelope(std::string_view element);
    // A standalone document's root element: the value with its xsi:type.
    void Document(std::string_view element, Any* value);

    void Target(const MoRef& target);
    // One member: nothing for null when it may be absent, every item of an array.
    void Member(const Slot& slot, Any* value);
    void Properties(const DataTable& table, DataObject* object);
    void Fault(MethodFault& fault, bool client);

private:
    void Item(std::string_view name, const Slot& slot, Any* value, bool typed);
    void Items(const Slot& slot, Any* array);
    void TypedValue(std::string_view name, Any* value);
    void Property(const Slot& slot, DataObject* object);
    void ScalarText(const Slot& slot, Any* value);

    void Open(std::string_view name, const std::string* xsiType = nullptr);
    void OpenReference(std::string_view name, const MoRef& ref, const std::string* xsiType);
    void Close(std::string_view name);
    void Text(std::string_view text);
    void Attribute(std::string_view text);
    void Number(long long value);
    void Double(double value);
    void Boolean(bool value) { _out += value ? "true" : "false"; }
    void DateTime(const Kernite::System::DateTime& value);
    [[noreturn]] void Refuse(const std::string& what) const;

    const Schema& _schema;
    std::string& _out;
    std::string _scratch;
    std::string_view _rootAttributes;  // written into the next opened element
    std::vector<std::string_view> _path;
};

}  // namespace Orbit::Wire
