#include "decoder.h"

#include <array>
#include <charconv>
#include <climits>
#include <cmath>
#include <limits>
#include <new>

#include "encoder.h"
#include "kernite/Exception.h"
#include "orbit/wire/Faults.h"
#include "text.h"

namespace Orbit::Wire {
namespace {

constexpr std::size_t kMaxSlots = 128;

// pugixml allocates through operator new, so that allocation failures reach it
// the way they reach the rest of the library.
void* Allocate(std::size_t size) { return ::operator new(size, std::nothrow); }
void Deallocate(void* p) { ::operator delete(p); }
struct ParserMemory {
    ParserMemory() { pugi::set_memory_management_functions(Allocate, Deallocate); }
} gParserMemory;

constexpr unsigned kParseOptions = pugi::parse_cdata | pugi::parse_escapes | pugi::parse_wconv_attribute |
                                   pugi::parse_eol | pugi::parse_ws_pcdata_single;

bool IsBlank(std::string_view text) {
    return text.find_first_not_of(" \t\r\n") == std::string_view::npos;
}

// "lt;" and the others, or a character reference to an XML character.
bool IsAllowedReference(std::string_view rest) {
    for (std::string_view name : {"lt;", "gt;", "amp;", "quot;", "apos;"})
        if (rest.starts_with(name)) return true;
    if (!rest.starts_with("#")) return false;
    const bool hex = rest.size() > 1 && rest[1] == 'x';
    const std::size_t start = hex ? 2 : 1;
    const std::size_t end = rest.find(';');
    if (end == std::string_view::npos || end == start || end > start + 8) return false;
    std::uint32_t code = 0;
    auto [ptr, error] = std::from_chars(rest.data() + start, rest.data() + end, code, hex ? 16 : 10);
    return error == std::errc() && ptr == rest.data() + end && IsXmlChar(code);
}

// Bytes that mean nothing to the first pass in any mode.
constexpr auto kPlain = [] {
    std::array<bool, 256> plain{};
    for (int c = 0x20; c < 0x80; ++c) plain[c] = c != '<' && c != '&' && c != '-' && c != ']';
    plain['\t'] = plain['\n'] = plain['\r'] = true;
    return plain;
}();

// The first pass: size, characters, and nothing that would make the parser read a
// DTD or an entity. Also bounds the parser's work: every element takes a '<'.
void Prescan(std::string_view text, const Limits& limits) {
    if (text.size() > limits.maxBodyBytes)
        ThrowFault<LimitExceeded>("", "a message of " + std::to_string(text.size()) + " bytes exceeds the limit of " +
                                          std::to_string(limits.maxBodyBytes));
    const auto* begin = reinterpret_cast<const unsigned char*>(text.data());
    const auto* end = begin + text.size();
    enum class Mode { Markup, Comment, CData } mode = Mode::Markup;
    std::size_t openings = 0;
    auto rest = [&](const unsigned char* p) {
        return std::string_view(reinterpret_cast<const char*>(p), static_cast<std::size_t>(end - p));
    };
    auto fail = [&](const unsigned char* p, const std::string& what) {
        ThrowFault<MalformedMessage>("", what + " at byte " + std::to_string(p - begin));
    };
    for (const unsigned char* p = begin; p < end;) {
        // Most bytes need no thought: skip them in a tight loop.
        while (p < end && kPlain[*p]) ++p;
        if (p == end) break;
        const unsigned char c = *p;
        if (c >= 0x80) {
            const std::size_t n = Utf8Sequence(p, end);
            if (n == 0) fail(p, "not UTF-8 text of XML characters");
            p += n;
            continue;
        }
        if (c < 0x20 && c != '\t' && c != '\n' && c != '\r') fail(p, "a control character");
        if (mode == Mode::Comment) {
            if (c == '-' && rest(p).starts_with("-->")) mode = Mode::Markup;
        } else if (mode == Mode::CData) {
            if (c == ']' && rest(p).starts_with("]]>")) mode = Mode::Markup;
        } else if (c == '<') {
            ++openings;
            if (p + 1 < end && p[1] == '!') {
                if (rest(p).starts_with("<!--")) {
                    mode = Mode::Comment;
                    p += 4;
                    continue;
                }
                if (rest(p).starts_with("<![CDATA[")) {
                    mode = Mode::CData;
                    p += 9;
                    continue;
                }
                fail(p, "a document type declaration");
            }
        } else if (c == '&' && !IsAllowedReference(rest(p + 1))) {
            fail(p, "an entity reference");
        }
        ++p;
    }
    if (openings / 2 > limits.maxElements + 4)
        ThrowFault<LimitExceeded>("", "more elements than the limit of " + std::to_string(limits.maxElements));
}

std::string_view TrimBlanks(std::string_view text) {
    const std::size_t first = text.find_first_not_of(" \t\r\n");
    if (first == std::string_view::npos) return {};
    return text.substr(first, text.find_last_not_of(" \t\r\n") - first + 1);
}

const char* NameOf(Shape shape) {
    switch (shape) {
    case Shape::Int: return "an int";
    case Shape::Long: return "a long";
    case Shape::Double: return "a double";
    case Shape::Bool: return "a boolean";
    default: return "a value";
    }
}

}  // namespace

// ---- the document ----

void Decoder::Parse(std::string_view text) {
    Prescan(text, _limits);
    pugi::xml_parse_result result =
        _document.load_buffer(text.data(), text.size(), kParseOptions, pugi::encoding_utf8);
    if (result.status == pugi::status_out_of_memory) throw std::bad_alloc();
    if (!result)
        ThrowFault<MalformedMessage>("", std::string("not well-formed XML at byte ") + std::to_string(result.offset) +
                                             ": " + result.description());
    pugi::xml_node root = _document.document_element();
    if (!root) ThrowFault<MalformedMessage>("", "no element");
    for (pugi::xml_node n = _document.first_child(); n; n = n.next_sibling())
        if (n != root && (n.type() == pugi::node_element || n.type() == pugi::node_pcdata ||
                          n.type() == pugi::node_cdata))
            ThrowFault<MalformedMessage>("", "content after the document's element");
}

pugi::xml_node Decoder::Body(std::string_view body) {
    Parse(body);
    pugi::xml_node root = _document.document_element();
    Entered envelope = Enter(root);
    if (envelope.ns != Ns::Soap || envelope.local != "Envelope")
        ThrowFault<MalformedMessage>("", "not a SOAP 1.1 envelope");
    pugi::xml_node child = NextElement(root.first_child());
    if (!child) ThrowFault<MalformedMessage>("", "an envelope without a body");
    Entered part = Enter(child);
    if (part.ns == Ns::Soap && part.local == "Header") {
        SkipHeader(child);
        Leave(part);
        child = NextElement(child.next_sibling());
        if (!child) ThrowFault<MalformedMessage>("", "an envelope without a body");
        part = Enter(child);
    }
    if (part.ns != Ns::Soap || part.local != "Body")
        ThrowFault<MalformedMessage>("", "an envelope whose second part is not the body");
    if (NextElement(child.next_sibling())) ThrowFault<MalformedMessage>("", "content after the body");
    pugi::xml_node content = NextElement(child.first_child());
    if (!content) ThrowFault<MalformedMessage>("", "an empty body");
    if (NextElement(content.next_sibling())) ThrowFault<MalformedMessage>("", "a body of more than one element");
    return content;
}

// Header entries are not ours to read, but they count against the limits. We
// understand none, so an entry meant for us that must be understood is refused:
// skipping it would answer as if its condition had been met.
void Decoder::SkipHeader(pugi::xml_node header) {
    for (pugi::xml_node entry = header.first_child(); entry; entry = entry.next_sibling()) {
        if (entry.type() != pugi::node_element) continue;
        const Entered entered = Enter(entry);
        if (MustUnderstand(entry))
            ThrowFault<UnknownElement>("/Header/" + std::string(entered.local),
                                       "a header entry that must be understood; none is understood here");
        Skip(entry);
        Leave(entered);
    }
}

bool Decoder::MustUnderstand(pugi::xml_node entry) const {
    bool must = false;
    bool forUs = true;
    for (pugi::xml_attribute a = entry.first_attribute(); a; a = a.next_attribute()) {
        const std::string_view name = a.name();
        if (name.starts_with("xmlns") && (name.size() == 5 || name[5] == ':')) continue;
        std::string_view local;
        if (Resolve(name, local, true) != Ns::Soap) continue;
        const std::string_view value = a.value();
        if (local == "mustUnderstand") must = value == "1" || value == "true";
        else if (local == "actor") forUs = value == kNextActor;
    }
    return must && forUs;
}

void Decoder::Skip(pugi::xml_node node) {
    for (pugi::xml_node child = node.first_child(); child; child = child.next_sibling()) {
        if (child.type() != pugi::node_element) continue;
        Entered entered = Enter(child);
        Skip(child);
        Leave(entered);
    }
}

pugi::xml_node Decoder::NextElement(pugi::xml_node node) {
    for (; node; node = node.next_sibling()) {
        if (node.type() == pugi::node_element) return node;
        if ((node.type() == pugi::node_pcdata || node.type() == pugi::node_cdata) && !IsBlank(node.value()))
            Fail<InvalidValue>("text where elements belong");
    }
    return {};
}

Decoder::Ns Decoder::NamespaceOf(std::string_view uri) const {
    if (uri == _schema.Namespace()) return Ns::Ours;
    if (uri == kSoapNamespace) return Ns::Soap;
    if (uri == kXsiNamespace) return Ns::Xsi;
    if (uri == kXsdNamespace) return Ns::Xsd;
    if (uri.empty()) return Ns::None;
    return Ns::Other;
}

Decoder::Entered Decoder::Enter(pugi::xml_node node) {
    if (++_elements > _limits.maxElements)
        Fail<LimitExceeded>("more elements than the limit of " + std::to_string(_limits.maxElements));
    if (++_depth > _limits.maxDepth)
        Fail<LimitExceeded>("nesting deeper than the limit of " + std::to_string(_limits.maxDepth));
    Entered entered{};
    entered.bindings = _bindings.size();
    for (pugi::xml_attribute a = node.first_attribute(); a; a = a.next_attribute()) {
        std::string_view name = a.name();
        if (!name.starts_with("xmlns")) continue;
        if (name.size() == 5) _bindings.push_back({{}, NamespaceOf(a.value())});
        else if (name[5] == ':') _bindings.push_back({name.substr(6), NamespaceOf(a.value())});
    }
    for (pugi::xml_attribute a = node.first_attribute(); a; a = a.next_attribute()) {
        std::string_view name = a.name();
        if (name.starts_with("xmlns") && (name.size() == 5 || name[5] == ':')) continue;
        std::string_view local;
        const Ns ns = Resolve(name, local, true);
        if (ns == Ns::Xsi && local == "type") {
            entered.xsiType = a.value();
        } else if (ns == Ns::None && local == "moType") {
            entered.moType = a.value();
            entered.hasMoType = true;
        } else if (entered.otherAttribute.empty()) {
            entered.otherAttribute = name;
        }
    }
    entered.ns = Resolve(node.name(), entered.local, false);
    return entered;
}

void Decoder::Leave(const Entered& entered) {
    _bindings.resize(entered.bindings);
    --_depth;
}

Decoder::Entered Decoder::EnterOurs(pugi::xml_node node, std::size_t index) {
    Entered entered = Enter(node);
    _path.push_back({entered.local, index});
    if (entered.ns != Ns::Ours)
        Fail<UnknownElement>("an element outside the namespace " + _schema.Namespace());
    if (!entered.otherAttribute.empty())
        Fail<UnknownElement>("an unexpected attribute '" + std::string(entered.otherAttribute) + "'");
    return entered;
}

void Decoder::LeaveOurs(const Entered& entered) {
    _path.pop_back();
    Leave(entered);
}

Decoder::Ns Decoder::Resolve(std::string_view qname, std::string_view& local, bool attribute) const {
    const std::size_t colon = qname.find(':');
    std::string_view prefix;
    if (colon == std::string_view::npos) {
        local = qname;
        if (attribute) return Ns::None;
    } else {
        prefix = qname.substr(0, colon);
        local = qname.substr(colon + 1);
    }
    for (auto it = _bindings.rbegin(); it != _bindings.rend(); ++it)
        if (it->prefix == prefix) return it->ns;
    if (prefix.empty()) return Ns::None;
    if (prefix == "xml") return Ns::Other;  // bound by XML itself
    Fail<MalformedMessage>("the undeclared namespace prefix '" + std::string(prefix) + "'");
}

// ---- calls, results, faults, values ----

Request Decoder::DecodeRequest(std::string_view body) {
    Request request;
    request.target = BeginRequest(body, request.method);
    request.args = DecodeArguments();
    return request;
}

Kernite::Ref<MoRef> Decoder::BeginRequest(std::string_view body, ManagedMethod*& method) {
    pugi::xml_node operation = Body(body);
    _operation = EnterOurs(operation);
    _method = _schema.MethodByElement(_operation.local);
    if (_method == nullptr)
        Fail<UnknownMethod>("no operation of that name in " + _schema.GetVersion().GetName());
    pugi::xml_node first = NextElement(operation.first_child());
    if (!first) FailAt<MissingElement>("target", "the target is missing");
    Entered target = EnterOurs(first);
    if (target.local != "target") Fail<MissingElement>("the target must come first");
    ManagedObjectType* type = _schema.ManagedType(target.moType);
    if (type == nullptr)
        Fail<UnknownMethod>("no managed type '" + std::string(target.moType) + "' in " +
                            _schema.GetVersion().GetName());
    if (!type->IsA(_method->owner))
        Fail<UnknownMethod>(type->GetName() + " has no operation " + _method->element);
    Kernite::Ref<MoRef> ref(new MoRef(target.moType, std::string(TextOf(first))));
    LeaveOurs(target);
    _arguments = first.next_sibling();
    _operationName = &_method->element;
    method = _method->method;
    return ref;
}

Kernite::RefVector<Any> Decoder::DecodeArguments() {
    if (_method == nullptr) throw Kernite::Exception("the arguments of a request were decoded twice");
    Kernite::RefVector<Any> args(static_cast<unsigned>(_method->params.size()));
    ReadMembers(_arguments, _method->params, nullptr, &args);
    LeaveOurs(_operation);
    _method = nullptr;
    return args;
}

Kernite::Ref<Any> Decoder::DecodeResponse(std::string_view body, const MethodTable& method) {
    pugi::xml_node response = Body(body);
    if (IsFault(response)) ReadFault(response)->Throw();
    Entered entered = EnterOurs(response);
    if (entered.local.size() != method.element.size() + 8 || !entered.local.starts_with(method.element) ||
        !entered.local.ends_with("Response"))
        Fail<UnknownElement>("not the response to " + method.element);
    Kernite::RefVector<Any> values(1);
    ReadMembers(response.first_child(), method.results, nullptr, &values);
    LeaveOurs(entered);
    return std::move(values[0]);
}

Kernite::Ref<MethodFault> Decoder::DecodeFault(std::string_view body) {
    pugi::xml_node fault = Body(body);
    if (!IsFault(fault)) ThrowFault<MalformedMessage>("", "a body without a fault");
    return ReadFault(fault);
}

Kernite::Ref<Any> Decoder::DecodeValue(std::string_view document) {
    Parse(document);
    pugi::xml_node root = _document.document_element();
    Entered entered = EnterOurs(root);
    if (entered.xsiType.empty()) Fail<InvalidValue>("a value without xsi:type");
    Kernite::Ref<Any> value = ReadTyped(root, XsiType(entered));
    LeaveOurs(entered);
    return value;
}

bool Decoder::IsFault(pugi::xml_node element) {
    Entered entered = Enter(element);
    Leave(entered);
    --_elements;  // counted again when it is read
    return entered.ns == Ns::Soap && entered.local == "Fault";
}

// faultcode, faultstring and detail are unqualified; the detail's element is ours,
// named by the fault's wire name. Anything else makes a plain MethodFault.
Kernite::Ref<MethodFault> Decoder::ReadFault(pugi::xml_node fault) {
    Entered entered = Enter(fault);
    std::string message;
    pugi::xml_node detail;
    for (pugi::xml_node part = NextElement(fault.first_child()); part; part = NextElement(part.next_sibling())) {
        std::string_view name = part.name();
        if (name == "faultstring") message = TextOf(part);
        if (name == "detail") detail = part;
    }
    pugi::xml_node content = detail ? NextElement(detail.first_child()) : pugi::xml_node();
    Kernite::Ref<MethodFault> made;
    if (content) {
        Entered inner = EnterOurs(content);
        _key.assign("t:");
        _key.append(inner.local);
        auto* type = dynamic_cast<DataObjectType*>(_schema.TypeByXsiName(_key));
        if (type != nullptr && type->IsA(GetType<MethodFault>())) {
            Kernite::Ref<DataObject> object = type->CreateInstance();
            ReadMembers(content.first_child(), _schema.Data(type)->properties, object.Get(), nullptr);
            made = Kernite::NarrowToType<MethodFault, DataObject>(object.Get());
        }
        LeaveOurs(inner);
    }
    if (!made) {
        made = new MethodFault();
        made->SetMsg(message);
    }
    Leave(entered);
    return made;
}

// ---- members ----

void Decoder::ReadMembers(pugi::xml_node first, const std::vector<Slot>& slots, DataObject* object,
                          Kernite::RefVector<Any>* values) {
    if (slots.size() > kMaxSlots) Fail<UnknownElement>("a type with too many members");
    std::bitset<kMaxSlots> seen;
    std::size_t cursor = 0;
    std::size_t arraySlot = kMaxSlots;
    Any* array = nullptr;
    std::vector<std::pair<std::size_t, Kernite::Ref<Any>>> enumArrays;
    for (pugi::xml_node child = NextElement(first); child; child = NextElement(child.next_sibling())) {
        Entered entered = EnterOurs(child);
        std::size_t k = cursor < slots.size() && slots[cursor].name == entered.local ? cursor : slots.size();
        if (k == slots.size())
            for (k = 0; k < slots.size() && slots[k].name != entered.local; ++k) {
            }
        if (k == slots.size()) Fail<UnknownElement>("no member of that name here");
        const Slot& slot = slots[k];
        if (!slot.visible) Fail<UnknownElement>(_schema.GetVersion().GetName() + " does not see this member");
        if (slot.array) {
            if (k != arraySlot) {
                arraySlot = k;
                Kernite::Ref<Any> held;
                if (slot.shape == Shape::Enum) {
                    auto it = enumArrays.begin();
                    while (it != enumArrays.end() && it->first != k) ++it;
                    if (it == enumArrays.end()) it = enumArrays.insert(it, {k, NewArray(slot)});
                    held = it->second;
                } else if (!seen[k]) {
                    held = NewArray(slot);
                    if (object != nullptr) slot.info->setProperty(object, slot.index, held.Get());
                    else (*values)[k] = held;
                } else if (object != nullptr) {
                    slot.info->getProperty(object, slot.index, &held);
                } else {
                    held = (*values)[k];
                }
                array = held.Get();  // held by the object, the values or enumArrays
            }
            _path.back().index = static_cast<std::size_t>(static_cast<Collection*>(array)->GetLength());
            Append(slot, array, child, entered);
        } else {
            if (seen[k]) Fail<UnknownElement>("a member that is not an array, repeated");
            if (object == nullptr) {
                (*values)[k] = ReadItem(child, entered, slot);
            } else if (slot.shape == Shape::Data || slot.shape == Shape::MoRef || slot.shape == Shape::AnyValue) {
                Kernite::Ref<Any> value = ReadItem(child, entered, slot);
                slot.info->setProperty(object, slot.index, value.Get());
            } else {
                SetScalar(slot, object, child);
            }
        }
        seen[k] = true;
        cursor = slot.array ? k : k + 1;
        LeaveOurs(entered);
    }
    for (auto& [k, tags] : enumArrays) {
        Kernite::Ref<Any> converted;
        slots[k].enumType->StringArrayToEnumArray(static_cast<Array<std::string>*>(tags.Get()), converted);
        if (object != nullptr) slots[k].info->setProperty(object, slots[k].index, converted.Get());
        else (*values)[k] = converted;
    }
    for (std::size_t k = 0; k < slots.size(); ++k)
        if (slots[k].visible && slots[k].Required() && !seen[k])
            FailAt<MissingElement>(slots[k].name, "a required member is missing");
}

Kernite::Ref<Any> Decoder::ReadItem(pugi::xml_node node, const Entered& entered, const Slot& slot) {
    switch (slot.shape) {
    case Shape::Data: {
        const DataTable* table = slot.data;
        if (!entered.xsiType.empty()) {
            auto* type = dynamic_cast<DataObjectType*>(XsiType(entered));
            if (type == nullptr || !type->IsA(slot.declared))
                Fail<InvalidValue>("xsi:type '" + std::string(entered.xsiType) + "' is no " +
                                   slot.declared->GetName() + " that " + _schema.GetVersion().GetName() + " sees");
            table = _schema.Data(type);
        }
        Kernite::Ref<DataObject> object = table->type->CreateInstance();
        ReadMembers(node.first_child(), table->properties, object.Get(), nullptr);
        return Kernite::Ref<Any>(std::move(object));
    }
    case Shape::AnyValue:
        if (entered.xsiType.empty()) Fail<InvalidValue>("an anyType value without xsi:type");
        return ReadTyped(node, XsiType(entered));
    case Shape::MoRef:
        if (!entered.xsiType.empty() && XsiType(entered) != slot.type)
            Fail<InvalidValue>("xsi:type '" + std::string(entered.xsiType) + "' on a managed object reference");
        if (entered.moType.empty()) Fail<InvalidValue>("a managed object reference without moType");
        return Kernite::Ref<Any>(new MoRef(entered.moType, std::string(TextOf(node))));
    default:
        if (!entered.xsiType.empty() && XsiType(entered) != slot.type)
            Fail<InvalidValue>("xsi:type '" + std::string(entered.xsiType) + "' where " + slot.type->GetName() +
                               " belongs");
        return BoxScalar(slot, node);
    }
}

Kernite::Ref<Any> Decoder::ReadTyped(pugi::xml_node node, Type* type) {
    if (type == nullptr) Fail<InvalidValue>("an xsi:type that " + _schema.GetVersion().GetName() + " does not see");
    if (auto* array = dynamic_cast<ArrayType*>(type)) {
        const Slot* item = _schema.ValueSlot(array->GetItemType());
        if (item == nullptr) Fail<InvalidValue>("an array type that the version does not see");
        return ReadArray(node, *item);
    }
    const Slot* slot = _schema.ValueSlot(type);
    if (slot == nullptr) Fail<InvalidValue>("an xsi:type that " + _schema.GetVersion().GetName() + " does not see");
    Entered plain{};
    if (slot->shape == Shape::MoRef) {
        // The moType attribute was read with the element.
        std::string_view local;
        for (pugi::xml_attribute a = node.first_attribute(); a; a = a.next_attribute())
            if (Resolve(a.name(), local, true) == Ns::None && local == "moType") plain.moType = a.value();
    }
    return ReadItem(node, plain, *slot);
}

// An array as an anyType value: its items are elements named after the item type.
Kernite::Ref<Any> Decoder::ReadArray(pugi::xml_node node, const Slot& item) {
    Kernite::Ref<Any> array = NewArray(item);
    std::size_t index = 0;
    for (pugi::xml_node child = NextElement(node.first_child()); child; child = NextElement(child.next_sibling())) {
        Entered entered = EnterOurs(child, index++);
        if (entered.local != item.name) Fail<UnknownElement>("an array item not named " + item.name);
        Append(item, array.Get(), child, entered);
        LeaveOurs(entered);
    }
    if (item.shape != Shape::Enum) return array;
    Kernite::Ref<Any> converted;
    item.enumType->StringArrayToEnumArray(static_cast<Array<std::string>*>(array.Get()), converted);
    return converted;
}

Kernite::Ref<Any> Decoder::NewArray(const Slot& slot) {
    switch (slot.shape) {
    case Shape::Data: return Kernite::NarrowToType<DataObjectType, Type>(slot.declared)->CreateArray();
    case Shape::MoRef: return Kernite::Ref<Any>(new DataArray<MoRef>());
    case Shape::AnyValue: return Kernite::Ref<Any>(new DataArray<Any>());
    case Shape::String:
    case Shape::Enum: return Kernite::Ref<Any>(new Array<std::string>());  // enumerations: tags, converted last
    case Shape::Bool: return Kernite::Ref<Any>(new Array<bool>());
    case Shape::Int: return Kernite::Ref<Any>(new Array<int>());
    case Shape::Long: return Kernite::Ref<Any>(new Array<long long>());
    case Shape::Double: return Kernite::Ref<Any>(new Array<double>());
    case Shape::DateTime: return Kernite::Ref<Any>(new Array<Kernite::System::DateTime>());
    case Shape::MethodName: return Kernite::Ref<Any>(new Array<MethodName>());
    }
    return nullptr;
}

void Decoder::Append(const Slot& slot, Any* array, pugi::xml_node node, const Entered& entered) {
    if (!entered.xsiType.empty() && slot.shape != Shape::Data && slot.shape != Shape::AnyValue &&
        XsiType(entered) != slot.type)
        Fail<InvalidValue>("xsi:type '" + std::string(entered.xsiType) + "' on an item of " + slot.type->GetName());
    switch (slot.shape) {
    case Shape::Data:
    case Shape::MoRef:
    case Shape::AnyValue: {
        Kernite::Ref<Any> item = ReadItem(node, entered, slot);
        static_cast<DataObjectArrayBase*>(array)->CheckedAppend(item.Get());
        break;
    }
    case Shape::String: static_cast<Array<std::string>*>(array)->Append(std::string(TextOf(node))); break;
    case Shape::Enum: {
        const std::string_view tag = TextOf(node);
        _scratch.assign(tag);
        if (!slot.enumType->HasValue(_scratch))
            Fail<InvalidValue>("'" + _scratch + "' is no tag of " + slot.type->GetName());
        static_cast<Array<std::string>*>(array)->Append(_scratch);
        break;
    }
    case Shape::Bool: static_cast<Array<bool>*>(array)->Append(Boolean(node)); break;
    case Shape::Int: static_cast<Array<int>*>(array)->Append(static_cast<int>(Integer(node, INT_MIN, INT_MAX))); break;
    case Shape::Long: static_cast<Array<long long>*>(array)->Append(Integer(node, LLONG_MIN, LLONG_MAX)); break;
    case Shape::Double: static_cast<Array<double>*>(array)->Append(Double(node)); break;
    case Shape::DateTime: static_cast<Array<Kernite::System::DateTime>*>(array)->Append(DateTime(node)); break;
    case Shape::MethodName:
        static_cast<Array<MethodName>*>(array)->Append(MethodName(std::string(TextOf(node))));
        break;
    }
}

void Decoder::SetScalar(const Slot& slot, DataObject* object, pugi::xml_node node) {
    const DataTypeInfo* info = slot.info;
    switch (slot.shape) {
    case Shape::String:
        _scratch.assign(TextOf(node));
        info->setProperty(object, slot.index, &_scratch);
        break;
    case Shape::Bool: {
        const bool value = Boolean(node);
        info->setProperty(object, slot.index, &value);
        break;
    }
    case Shape::Int: {
        const int value = static_cast<int>(Integer(node, INT_MIN, INT_MAX));
        info->setProperty(object, slot.index, &value);
        break;
    }
    case Shape::Long: {
        const long long value = Integer(node, LLONG_MIN, LLONG_MAX);
        info->setProperty(object, slot.index, &value);
        break;
    }
    case Shape::Double: {
        const double value = Double(node);
        info->setProperty(object, slot.index, &value);
        break;
    }
    case Shape::DateTime: {
        const Kernite::System::DateTime value = DateTime(node);
        info->setProperty(object, slot.index, &value);
        break;
    }
    case Shape::MethodName: {
        const MethodName value{std::string(TextOf(node))};
        info->setProperty(object, slot.index, &value);
        break;
    }
    case Shape::Enum: {
        const int value = EnumValue(slot, node);
        info->setProperty(object, slot.index, &value);
        break;
    }
    default: break;
    }
}

Kernite::Ref<Any> Decoder::BoxScalar(const Slot& slot, pugi::xml_node node) {
    switch (slot.shape) {
    case Shape::String: return Kernite::Ref<Any>(new Primitive<std::string>(std::string(TextOf(node))));
    case Shape::Bool: return Kernite::Ref<Any>(new Primitive<bool>(Boolean(node)));
    case Shape::Int: return Kernite::Ref<Any>(new Primitive<int>(static_cast<int>(Integer(node, INT_MIN, INT_MAX))));
    case Shape::Long: return Kernite::Ref<Any>(new Primitive<long long>(Integer(node, LLONG_MIN, LLONG_MAX)));
    case Shape::Double: return Kernite::Ref<Any>(new Primitive<double>(Double(node)));
    case Shape::DateTime: return Kernite::Ref<Any>(new Primitive<Kernite::System::DateTime>(DateTime(node)));
    case Shape::MethodName:
        return Kernite::Ref<Any>(new Primitive<MethodName>(MethodName(std::string(TextOf(node)))));
    case Shape::Enum: {
        EnumValue(slot, node);
        Kernite::Ref<Any> value;
        slot.enumType->StringToEnum(_scratch, value);
        return value;
    }
    default: return nullptr;
    }
}

Type* Decoder::XsiType(const Entered& entered) {
    std::string_view local;
    const Ns ns = Resolve(entered.xsiType, local, false);
    if (ns == Ns::Xsd) _key.assign("xsd:");
    else if (ns == Ns::Ours) _key.assign("t:");
    else return nullptr;
    _key.append(local);
    return _schema.TypeByXsiName(_key);
}

// ---- text ----

std::string_view Decoder::TextOf(pugi::xml_node node) {
    pugi::xml_node child = node.first_child();
    if (!child) return {};
    if (!child.next_sibling() && (child.type() == pugi::node_pcdata || child.type() == pugi::node_cdata))
        return child.value();
    _text.clear();
    for (; child; child = child.next_sibling()) {
        if (child.type() == pugi::node_element) {
            std::string_view local;
            Resolve(child.name(), local, false);
            FailAt<InvalidValue>(local, "an element inside a simple value");
        }
        if (child.type() == pugi::node_pcdata || child.type() == pugi::node_cdata) _text += child.value();
    }
    return _text;
}

std::string_view Decoder::Trimmed(pugi::xml_node node) { return TrimBlanks(TextOf(node)); }

long long Decoder::Integer(pugi::xml_node node, long long low, long long high) {
    std::string_view text = Trimmed(node);
    const std::string_view digits = text.starts_with('+') && !text.starts_with("+-") ? text.substr(1) : text;
    long long value = 0;
    auto [ptr, error] = std::from_chars(digits.data(), digits.data() + digits.size(), value);
    const Shape shape = low == INT_MIN ? Shape::Int : Shape::Long;
    if (digits.empty() || ptr != digits.data() + digits.size() || error == std::errc::invalid_argument)
        Fail<InvalidValue>("'" + std::string(text) + "' is not " + NameOf(shape));
    if (error == std::errc::result_out_of_range || value < low || value > high)
        Fail<InvalidValue>(std::string(text) + " is out of range for " + NameOf(shape));
    return value;
}

double Decoder::Double(pugi::xml_node node) {
    std::string_view text = Trimmed(node);
    if (text == "INF" || text == "+INF") return std::numeric_limits<double>::infinity();
    if (text == "-INF") return -std::numeric_limits<double>::infinity();
    if (text == "NaN") return std::numeric_limits<double>::quiet_NaN();
    const std::string_view digits = text.starts_with('+') ? text.substr(1) : text;
    const bool lexical = !digits.empty() && digits.find_first_not_of("0123456789.eE+-") == std::string_view::npos;
    double value = 0;
    auto [ptr, error] = std::from_chars(digits.data(), digits.data() + digits.size(), value);
    if (!lexical || ptr != digits.data() + digits.size() || error == std::errc::invalid_argument)
        Fail<InvalidValue>("'" + std::string(text) + "' is not a double");
    if (error == std::errc::result_out_of_range && std::abs(value) > 1)
        Fail<InvalidValue>(std::string(text) + " is out of range for a double");
    return value;
}

bool Decoder::Boolean(pugi::xml_node node) {
    std::string_view text = Trimmed(node);
    if (text == "true" || text == "1") return true;
    if (text == "false" || text == "0") return false;
    Fail<InvalidValue>("'" + std::string(text) + "' is not a boolean");
}

Kernite::System::DateTime Decoder::DateTime(pugi::xml_node node) {
    _scratch.assign(Trimmed(node));
    try {
        return Kernite::System::DateTime::Parse(_scratch);
    } catch (const Kernite::InvalidArgumentException&) {
        Fail<InvalidValue>("'" + _scratch + "' is not an ISO 8601 dateTime");
    }
}

int Decoder::EnumValue(const Slot& slot, pugi::xml_node node) {
    _scratch.assign(TextOf(node));
    if (!slot.enumType->HasValue(_scratch))
        Fail<InvalidValue>("'" + _scratch + "' is no tag of " + slot.type->GetName());
    return slot.enumType->GetValue(_scratch);
}

// ---- faults ----

std::string Decoder::Path() const {
    std::string path;
    for (const Step& step : _path) {
        path += '/';
        path += step.name;
        if (step.index != npos) {
            path += '[';
            path += std::to_string(step.index);
            path += ']';
        }
    }
    return path;
}

template <class F>
void Decoder::Fail(const std::string& what) const {
    ThrowFault<F>(Path(), what);
}

template <class F>
void Decoder::FailAt(std::string_view name, const std::string& what) {
    _path.push_back({name, npos});
    ThrowFault<F>(Path(), what);
}

}  // namespace Orbit::Wire
