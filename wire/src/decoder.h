// Reads XML text into values, calls, results and faults: a first pass over the raw
// bytes (limits, characters, no DTD, no entity), then pugixml's parse, then a walk
// that builds only what the schema's tables describe, through the record functions.
// Everything built is held by references until it is handed out, so a fault thrown
// half-way leaves nothing behind.
#pragma once

#include <bitset>
#include <pugixml.hpp>
#include <string>
#include <string_view>
#include <vector>

#include "orbit/wire/Codec.h"
#include "schema.h"

namespace Orbit::Wire {

class Decoder {
public:
    Decoder(const Schema& schema, const Limits& limits) : _schema(schema), _limits(limits) {}

    Request DecodeRequest(std::string_view body);
    // A request in two steps: the target and the method, then the arguments (once).
    Kernite::Ref<MoRef> BeginRequest(std::string_view body, ManagedMethod*& method);
    Kernite::RefVector<Any> DecodeArguments();
    // The body's element of the request begun.
    const std::string& Operation() const noexcept { return *_operationName; }
    // A fault in the body is thrown as its own class.
    Kernite::Ref<Any> DecodeResponse(std::string_view body, const MethodTable& method);
    Kernite::Ref<MethodFault> DecodeFault(std::string_view body);
    Kernite::Ref<Any> DecodeValue(std::string_view document);

private:
    enum class Ns : unsigned char { None, Soap, Xsi, Xsd, Ours, Other };
    struct Binding {
        std::string_view prefix;
        Ns ns;
    };
    // One element entered: its local name and namespace; leaving restores the scope.
    struct Entered {
        std::string_view local;
        Ns ns;
        std::size_t bindings;
        std::string_view xsiType;  // the raw QName, empty when absent
        std::string_view moType;
        bool hasMoType;
        std::string_view otherAttribute;  // the first attribute of no meaning to us
    };

    void Parse(std::string_view text);
    // The body's one element, the envelope and body entered.
    pugi::xml_node Body(std::string_view body);
    Entered Enter(pugi::xml_node node);
    void Leave(const Entered& entered);
    // Our element (in the version's namespace, with no attribute but xsi:type and
    // moType), entered and on the path; a fault naming it otherwise.
    Entered EnterOurs(pugi::xml_node node, std::size_t index = npos);
    void LeaveOurs(const Entered& entered);
    Ns Resolve(std::string_view qname, std::string_view& local, bool attribute) const;
    Ns NamespaceOf(std::string_view uri) const;
    void SkipHeader(pugi::xml_node header);
    bool MustUnderstand(pugi::xml_node entry) const;
    void Skip(pugi::xml_node node);
    bool IsFault(pugi::xml_node element);
    Kernite::Ref<MethodFault> ReadFault(pugi::xml_node fault);

    // The members of a call, a result or a data object, from `first` on: into
    // `object`'s properties when it is given, else into `values`.
    void ReadMembers(pugi::xml_node first, const std::vector<Slot>& slots, DataObject* object,
                     Kernite::RefVector<Any>* values);
    Kernite::Ref<Any> ReadItem(pugi::xml_node node, const Entered& entered, const Slot& slot);
    Kernite::Ref<Any> ReadTyped(pugi::xml_node node, Type* type);
    Kernite::Ref<Any> ReadArray(pugi::xml_node node, const Slot& item);
    void SetScalar(const Slot& slot, DataObject* object, pugi::xml_node node);
    Kernite::Ref<Any> BoxScalar(const Slot& slot, pugi::xml_node node);
    Kernite::Ref<Any> NewArray(const Slot& slot);
    void Append(const Slot& slot, Any* array, pugi::xml_node node, const Entered& entered);
    Type* XsiType(const Entered& entered);
    // The next element from `node` on; refuses text that is not blank on the way.
    pugi::xml_node NextElement(pugi::xml_node node);

    // The element's text; refuses child elements.
    std::string_view TextOf(pugi::xml_node node);
    std::string_view Trimmed(pugi::xml_node node);
    long long Integer(pugi::xml_node node, long long low, long long high);
    double Double(pugi::xml_node node);
    bool Boolean(pugi::xml_node node);
    Kernite::System::DateTime DateTime(pugi::xml_node node);
    int EnumValue(const Slot& slot, pugi::xml_node node);

    std::string Path() const;
    template <class F>
    [[noreturn]] void Fail(const std::string& what) const;
    template <class F>
    [[noreturn]] void FailAt(std::string_view name, const std::string& what);

    static constexpr std::size_t npos = static_cast<std::size_t>(-1);

    const Schema& _schema;
    const Limits _limits;
    pugi::xml_document _document;
    std::vector<Binding> _bindings;
    int _depth = 0;
    struct Step {
        std::string_view name;
        std::size_t index;
    };
    std::vector<Step> _path;
    std::size_t _elements = 0;
    std::string _scratch;
    std::string _text;
    std::string _key;
    // Between the two steps of a request: the operation entered, where its
    // arguments start, and its table (null once they are decoded).
    Entered _operation{};
    pugi::xml_node _arguments;
    const MethodTable* _method = nullptr;
    const std::string* _operationName = nullptr;
};

}  // namespace Orbit::Wire
