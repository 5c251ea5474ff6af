#include "encoder.h"

#include <charconv>
#include <cmath>

#include "kernite/Exception.h"
#include "kernite/System.h"
#include "orbit/Primitive.h"
#include "orbit/wire/Faults.h"
#include "text.h"

namespace Orbit::Wire {
namespace {

template <class T>
const T& Unbox(Any* value) {
    return Kernite::NarrowToType<Primitive<T>, Any>(value)->GetValue();
}

template <class T>
const std::vector<T>& ItemsOf(Any* array) {
    return Kernite::NarrowToType<Array<T>, Any>(array)->GetItems();
}

}  // namespace

void Encoder::OpenEnvelope(std::string_view element) {
    _out += R"(<?xml version="1.0" encoding="UTF-8"?>)";
    _out += "<e:Envelope xmlns:e=\"";
    _out += kSoapNamespace;
    _out += "\" xmlns:xsd=\"";
    _out += kXsdNamespace;
    _out += "\" xmlns:xsi=\"";
    _out += kXsiNamespace;
    _out += "\" xmlns:t=\"";
    _out += _schema.Namespace();
    _out += "\"><e:Body>";
    if (element.empty()) return;
    _out += '<';
    _out += element;
    _out += " xmlns=\"";
    _out += _schema.Namespace();
    _out += "\">";
    _path.push_back(element);
}

void Encoder::CloseEnvelope(std::string_view element) {
    if (!element.empty()) Close(element);
    _out += "</e:Body></e:Envelope>";
}

void Encoder::Document(std::string_view element, Any* value) {
    if (value == nullptr) Refuse("no value");
    _out += R"(<?xml version="1.0" encoding="UTF-8"?>)";
    std::string attributes = " xmlns=\"" + _schema.Namespace() + "\" xmlns:t=\"" + _schema.Namespace() +
                             "\" xmlns:xsd=\"" + std::string(kXsdNamespace) + "\" xmlns:xsi=\"" +
                             std::string(kXsiNamespace) + "\"";
    _rootAttributes = attributes;
    TypedValue(element, value);
}

void Encoder::Target(const MoRef& target) {
    OpenReference("target", target, nullptr);
    Text(target.GetId());
    Close("target");
}

void Encoder::Member(const Slot& slot, Any* value) {
    if (value == nullptr) {
        if (slot.Required()) {
            _path.push_back(slot.name);
            Refuse("a required member is null");
        }
        return;
    }
    if (slot.array) Items(slot, value);
    else Item(slot.name, slot, value, false);
}

void Encoder::Properties(const DataTable& table, DataObject* object) {
    for (const Slot& slot : table.properties) Property(slot, object);
}

void Encoder::Fault(MethodFault& fault, bool client) {
    const DataTable* table = _schema.Data(fault._GetDataType());
    if (table == nullptr) Refuse("fault class " + fault._GetType()->GetName() + " is not registered");
    _out += client ? "<e:Fault><faultcode>e:Client</faultcode><faultstring>"
                   : "<e:Fault><faultcode>e:Server</faultcode><faultstring>";
    Text(fault.GetMsg().empty() ? table->written->GetName() : fault.GetMsg());
    _out += "</faultstring><detail><";
    _out += table->written->GetName();
    _out += " xmlns=\"";
    _out += _schema.Namespace();
    _out += "\">";
    _path.push_back(table->written->GetName());
    Properties(*table, &fault);
    Close(table->written->GetName());
    _out += "</detail></e:Fault>";
}

void Encoder::Property(const Slot& slot, DataObject* object) {
    const DataTypeInfo* info = slot.info;
    if (!info->isPropertySet(object, slot.index)) {
        if (slot.Required()) {
            _path.push_back(slot.name);
            Refuse("a required member is not set");
        }
        return;
    }
    if (slot.array || slot.shape == Shape::Data || slot.shape == Shape::MoRef || slot.shape == Shape::AnyValue) {
        Kernite::Ref<Any> held;
        info->getProperty(object, slot.index, &held);
        Member(slot, held.Get());
        return;
    }
    Open(slot.name);
    switch (slot.shape) {
    case Shape::String:
        info->getProperty(object, slot.index, &_scratch);
        Text(_scratch);
        break;
    case Shape::Bool: {
        bool value = false;
        info->getProperty(object, slot.index, &value);
        Boolean(value);
        break;
    }
    case Shape::Int: {
        int value = 0;
        info->getProperty(object, slot.index, &value);
        Number(value);
        break;
    }
    case Shape::Long: {
        long long value = 0;
        info->getProperty(object, slot.index, &value);
        Number(value);
        break;
    }
    case Shape::Double: {
        double value = 0;
        info->getProperty(object, slot.index, &value);
        Double(value);
        break;
    }
    case Shape::DateTime: {
        Kernite::System::DateTime value;
        info->getProperty(object, slot.index, &value);
        DateTime(value);
        break;
    }
    case Shape::MethodName: {
        MethodName value;
        info->getProperty(object, slot.index, &value);
        Text(value.GetName());
        break;
    }
    case Shape::Enum: {
        int value = 0;
        info->getProperty(object, slot.index, &value);
        Text(slot.enumType->GetTag(value));
        break;
    }
    default: break;
    }
    Close(slot.name);
}

void Encoder::Item(std::string_view name, const Slot& slot, Any* value, bool typed) {
    _path.push_back(name);
    switch (slot.shape) {
    case Shape::Data: {
        auto* object = Kernite::NarrowToType<DataObject, Any>(value);
        const DataTable* table = _schema.Data(object->_GetDataType());
        if (table == nullptr) Refuse("class " + object->_GetType()->GetName() + " is not registered");
        if (!table->written->IsA(slot.type))
            Refuse("a " + object->_GetType()->GetName() + " where a " + slot.type->GetName() + " belongs");
        Open(name, typed || table->written != slot.type ? &_schema.XsiName(table->written) : nullptr);
        Properties(*table, object);
        break;
    }
    case Shape::AnyValue:
        _path.pop_back();
        return TypedValue(name, value);
    case Shape::MoRef: {
        const MoRef* ref = Kernite::NarrowToType<MoRef, Any>(value);
        OpenReference(name, *ref, typed ? &_schema.XsiName(slot.type) : nullptr);
        Text(ref->GetId());
        break;
    }
    default:
        Open(name, typed ? &_schema.XsiName(slot.type) : nullptr);
        ScalarText(slot, value);
        break;
    }
    Close(name);
    _path.pop_back();
}

void Encoder::TypedValue(std::string_view name, Any* value) {
    Type* type = value->_GetType();
    if (auto* array = dynamic_cast<ArrayType*>(type)) {
        const Slot* item = _schema.ValueSlot(array->GetItemType());
        _path.push_back(name);
        if (item == nullptr) Refuse("the version does not see " + type->GetName());
        Open(name, &_schema.XsiName(type));
        Items(*item, value);
        Close(name);
        _path.pop_back();
        return;
    }
    const Slot* slot = nullptr;
    if (auto* object = dynamic_cast<DataObject*>(value)) {
        const DataTable* table = _schema.Data(object->_GetDataType());
        if (table != nullptr) slot = _schema.ValueSlot(table->written);
    } else {
        slot = _schema.ValueSlot(type);
    }
    if (slot == nullptr) {
        _path.push_back(name);
        Refuse("the version does not see " + type->GetName());
    }
    Item(name, *slot, value, true);
}

void Encoder::Items(const Slot& slot, Any* array) {
    auto each = [&](const auto& items, auto write) {
        for (const auto& item : items) {
            Open(slot.name);
            write(item);
            Close(slot.name);
        }
    };
    switch (slot.shape) {
    case Shape::Data:
    case Shape::MoRef:
    case Shape::AnyValue: {
        auto* items = Kernite::NarrowToType<DataObjectArrayBase, Any>(array);
        for (int i = 0, n = items->GetLength(); i < n; ++i) {
            Any* item = items->GetItem(i);
            if (item == nullptr) {
                _path.push_back(slot.name);
                Refuse("an array holds null");
            }
            Item(slot.name, slot, item, false);
        }
        break;
    }
    case Shape::String: each(ItemsOf<std::string>(array), [&](const std::string& v) { Text(v); }); break;
    case Shape::Bool: each(ItemsOf<bool>(array), [&](bool v) { Boolean(v); }); break;
    case Shape::Int: each(ItemsOf<int>(array), [&](int v) { Number(v); }); break;
    case Shape::Long: each(ItemsOf<long long>(array), [&](long long v) { Number(v); }); break;
    case Shape::Double: each(ItemsOf<double>(array), [&](double v) { Double(v); }); break;
    case Shape::DateTime:
        each(ItemsOf<Kernite::System::DateTime>(array), [&](const Kernite::System::DateTime& v) { DateTime(v); });
        break;
    case Shape::MethodName: each(ItemsOf<MethodName>(array), [&](const MethodName& v) { Text(v.GetName()); }); break;
    case Shape::Enum: {
        Kernite::Ref<Array<std::string>> tags;
        slot.enumType->EnumArrayToStringArray(array, tags);
        each(tags->GetItems(), [&](const std::string& v) { Text(v); });
        break;
    }
    }
}

void Encoder::ScalarText(const Slot& slot, Any* value) {
    switch (slot.shape) {
    case Shape::String: Text(Unbox<std::string>(value)); break;
    case Shape::Bool: Boolean(Unbox<bool>(value)); break;
    case Shape::Int: Number(Unbox<int>(value)); break;
    case Shape::Long: Number(Unbox<long long>(value)); break;
    case Shape::Double: Double(Unbox<double>(value)); break;
    case Shape::DateTime: DateTime(Unbox<Kernite::System::DateTime>(value)); break;
    case Shape::MethodName: Text(Unbox<MethodName>(value).GetName()); break;
    case Shape::Enum: Text(slot.enumType->EnumToString(value)); break;
    default: break;
    }
}

void Encoder::Open(std::string_view name, const std::string* xsiType) {
    _out += '<';
    _out += name;
    if (!_rootAttributes.empty()) {
        _out += _rootAttributes;
        _rootAttributes = {};
    }
    if (xsiType != nullptr) {
        _out += " xsi:type=\"";
        _out += *xsiType;
        _out += '"';
    }
    _out += '>';
}

void Encoder::OpenReference(std::string_view name, const MoRef& ref, const std::string* xsiType) {
    _out += '<';
    _out += name;
    if (xsiType != nullptr) {
        _out += " xsi:type=\"";
        _out += *xsiType;
        _out += '"';
    }
    _out += " moType=\"";
    Attribute(ref.GetType());
    _out += "\">";
}

void Encoder::Close(std::string_view name) {
    _out += "</";
    _out += name;
    _out += '>';
}

// Escapes markup and carriage returns (which parsers would fold into line feeds);
// refuses what XML 1.0 cannot carry.
void Encoder::Text(std::string_view text) {
    const auto* p = reinterpret_cast<const unsigned char*>(text.data());
    const auto* end = p + text.size();
    const auto* run = p;
    auto flush = [&] { _out.append(reinterpret_cast<const char*>(run), static_cast<std::size_t>(p - run)); };
    while (p < end) {
        const unsigned char c = *p;
        if (c >= 0x20 && c < 0x80 && c != '<' && c != '&' && c != '>') {
            ++p;
            continue;
        }
        if (c >= 0x80) {
            const std::size_t n = Utf8Sequence(p, end);
            if (n == 0) Refuse("a string that is not UTF-8 text XML can carry");
            p += n;
            continue;
        }
        flush();
        switch (c) {
        case '<': _out += "&lt;"; break;
        case '&': _out += "&amp;"; break;
        case '>': _out += "&gt;"; break;
        case '\r': _out += "&#13;"; break;
        case '\t':
        case '\n': _out += static_cast<char>(c); break;
        default: Refuse("a string with a control character XML cannot carry");
        }
        run = ++p;
    }
    flush();
}

void Encoder::Attribute(std::string_view text) {
    std::size_t start = 0;
    for (std::size_t i = 0; i < text.size(); ++i) {
        const char* escaped = nullptr;
        switch (text[i]) {
        case '"': escaped = "&quot;"; break;
        case '\t': escaped = "&#9;"; break;
        case '\n': escaped = "&#10;"; break;
        default: continue;
        }
        Text(text.substr(start, i - start));
        _out += escaped;
        start = i + 1;
    }
    Text(text.substr(start));
}

void Encoder::Number(long long value) {
    char buffer[24];
    auto [end, error] = std::to_chars(buffer, buffer + sizeof buffer, value);
    _out.append(buffer, end);
}

void Encoder::Double(double value) {
    if (std::isnan(value)) {
        _out += "NaN";
    } else if (std::isinf(value)) {
        _out += value > 0 ? "INF" : "-INF";
    } else {
        char buffer[32];
        auto [end, error] = std::to_chars(buffer, buffer + sizeof buffer, value);
        _out.append(buffer, end);
    }
}

void Encoder::DateTime(const Kernite::System::DateTime& value) { _out += value.ToString(); }

void Encoder::Refuse(const std::string& what) const {
    std::string path;
    for (std::string_view name : _path) {
        path += '/';
        path += name;
    }
    throw Kernite::InvalidArgumentException(path + ": " + what);
}

}  // namespace Orbit::Wire
