#include "orbit/wire/Wsdl.h"

#include <set>
#include <string>

#include "encoder.h"
#include "orbit/wire/Codec.h"
#include "orbit/wire/Faults.h"
#include "schema.h"

namespace Orbit::Wire {
namespace {

class WsdlWriter {
public:
    WsdlWriter(const Schema& schema, std::ostream& out) : _schema(schema), _out(out) {}

    void Write(std::string_view address) {
        const std::string& ns = _schema.Namespace();
        const std::string name = ns.substr(ns.find(':') + 1);
        _out << R"(<?xml version="1.0" encoding="UTF-8"?>)" << '\n'
             << R"(<definitions xmlns="http://schemas.xmlsoap.org/wsdl/" xmlns:soap="http://schemas.xmlsoap.org/wsdl/soap/")"
             << " xmlns:xsd=\"" << kXsdNamespace << "\" xmlns:t=\"" << ns << "\" targetNamespace=\"" << ns
             << "\" name=\"" << name << "\">\n<types>\n<xsd:schema targetNamespace=\"" << ns
             << "\" elementFormDefault=\"qualified\">\n";
        Types();
        Elements();
        _out << "</xsd:schema>\n</types>\n";
        Messages();
        Operations(name);
        _out << "<service name=\"" << name << "Service\"><port name=\"" << name << "Port\" binding=\"t:" << name
             << "Binding\"><soap:address location=\"";
        if (address.empty()) _out << "http://localhost/" << name;
        else _out << address;
        _out << "\"/></port></service>\n"
             << "</definitions>\n";
    }

private:
    // The schema name of a member's item type; enumerations the version does not
    // see travel as their tags.
    std::string TypeName(const Slot& slot) const {
        const std::string& name = _schema.XsiName(slot.type);
        return name.empty() ? "xsd:string" : name;
    }

    void Element(const Slot& slot) {
        _out << "<xsd:element name=\"" << slot.name << "\" type=\"" << TypeName(slot) << '"';
        if (slot.optional || slot.array) _out << " minOccurs=\"0\"";
        if (slot.array) _out << " maxOccurs=\"unbounded\"";
        _out << "/>";
    }

    void Types() {
        _out << "<xsd:simpleType name=\"methodName\"><xsd:restriction base=\"xsd:string\"/></xsd:simpleType>\n"
             << "<xsd:complexType name=\"" << GetType<MoRef>()->GetName()
             << "\"><xsd:simpleContent><xsd:extension base=\"xsd:string\">"
             << "<xsd:attribute name=\"moType\" type=\"xsd:string\" use=\"required\"/>"
             << "</xsd:extension></xsd:simpleContent></xsd:complexType>\n";
        for (const EnumType* e : _schema.Enums()) {
            _out << "<xsd:simpleType name=\"" << e->GetName() << "\"><xsd:restriction base=\"xsd:string\">";
            std::vector<std::string> tags;
            e->GetEnumTags(tags);
            for (const std::string& tag : tags) _out << "<xsd:enumeration value=\"" << tag << "\"/>";
            _out << "</xsd:restriction></xsd:simpleType>\n";
        }
        for (const DataTable* table : _schema.DataTables()) DataType(*table);
        for (Type* item : _schema.ArrayItemTypes()) {
            const Slot* slot = _schema.ValueSlot(item);
            _out << "<xsd:complexType name=\"" << item->GetArrayType()->GetWsdlName() << "\"><xsd:sequence>"
                 << "<xsd:element name=\"" << slot->name << "\" type=\"" << TypeName(*slot)
                 << "\" minOccurs=\"0\" maxOccurs=\"unbounded\"/></xsd:sequence></xsd:complexType>\n";
        }
    }

    // Own properties only; the base's come by extension.
    void DataType(const DataTable& table) {
        const DataObjectType* base = table.type->GetBaseDataType();
        const DataTable* visibleBase = base ? _schema.Data(base) : nullptr;
        _out << "<xsd:complexType name=\"" << table.type->GetName() << "\">";
        if (visibleBase != nullptr)
            _out << "<xsd:complexContent><xsd:extension base=\"t:" << visibleBase->written->GetName() << "\">";
        _out << "<xsd:sequence>";
        for (const Slot& slot : table.properties)
            if (slot.info == table.type->GetDataTypeInfo()) Element(slot);
        _out << "</xsd:sequence>";
        if (visibleBase != nullptr) _out << "</xsd:extension></xsd:complexContent>";
        _out << "</xsd:complexType>\n";
    }

    void Elements() {
        for (const MethodTable* method : _schema.Methods()) {
            _out << "<xsd:element name=\"" << method->element << "\"><xsd:complexType><xsd:sequence>"
                 << "<xsd:element name=\"target\" type=\"t:" << GetType<MoRef>()->GetName() << "\"/>";
            for (const Slot& param : method->params)
                if (param.visible) Element(param);
            _out << "</xsd:sequence></xsd:complexType></xsd:element>\n"
                 << "<xsd:element name=\"" << method->element << "Response\"><xsd:complexType><xsd:sequence>";
            for (const Slot& result : method->results) Element(result);
            _out << "</xsd:sequence></xsd:complexType></xsd:element>\n";
        }
        for (const std::string& fault : Faults())
            _out << "<xsd:element name=\"" << fault << "\" type=\"t:" << fault << "\"/>\n";
    }

    // Every fault class the version sees, by wire name.
    std::set<std::string> Faults() const {
        std::set<std::string> names;
        for (const DataTable* table : _schema.DataTables())
            if (table->type->IsA(GetType<MethodFault>())) names.insert(table->type->GetName());
        return names;
    }

    // The faults an operation declares, as the version names them, and the wire's.
    std::set<std::string> FaultsOf(const MethodTable& method) const {
        std::set<std::string> names{GetType<InvalidRequest>()->GetName(), GetType<NotAuthenticated>()->GetName(),
                                    GetType<ServerFault>()->GetName()};
        if (method.method->GetPrivilege() != nullptr) names.insert(GetType<NotAuthorized>()->GetName());
        for (const TypeInfo* fault : method.method->GetFaults())
            if (const DataTable* table = _schema.Data(FindType(fault))) names.insert(table->written->GetName());
        return names;
    }

    void Messages() {
        for (const MethodTable* method : _schema.Methods())
            _out << "<message name=\"" << method->element << "Request\"><part name=\"parameters\" element=\"t:"
                 << method->element << "\"/></message>\n<message name=\"" << method->element
                 << "Response\"><part name=\"parameters\" element=\"t:" << method->element
                 << "Response\"/></message>\n";
        for (const std::string& fault : Faults())
            _out << "<message name=\"" << fault << "Fault\"><part name=\"fault\" element=\"t:" << fault
                 << "\"/></message>\n";
    }

    void Operations(const std::string& name) {
        _out << "<portType name=\"" << name << "PortType\">\n";
        for (const MethodTable* method : _schema.Methods()) {
            _out << "<operation name=\"" << method->element << "\"><input message=\"t:" << method->element
                 << "Request\"/><output message=\"t:" << method->element << "Response\"/>";
            for (const std::string& fault : FaultsOf(*method))
                _out << "<fault name=\"" << fault << "\" message=\"t:" << fault << "Fault\"/>";
            _out << "</operation>\n";
        }
        _out << "</portType>\n<binding name=\"" << name << "Binding\" type=\"t:" << name << "PortType\">"
             << "<soap:binding style=\"document\" transport=\"http://schemas.xmlsoap.org/soap/http\"/>\n";
        const std::string action = SoapAction(_schema.GetVersion());
        for (const MethodTable* method : _schema.Methods()) {
            _out << "<operation name=\"" << method->element << "\"><soap:operation soapAction=\"" << action
                 << "\" style=\"document\"/><input><soap:body use=\"literal\"/></input>"
                 << "<output><soap:body use=\"literal\"/></output>";
            for (const std::string& fault : FaultsOf(*method))
                _out << "<fault name=\"" << fault << "\"><soap:fault name=\"" << fault << "\" use=\"literal\"/></fault>";
            _out << "</operation>\n";
        }
        _out << "</binding>\n";
    }

    const Schema& _schema;
    std::ostream& _out;
};

}  // namespace

void WriteWsdl(const Version& version, std::ostream& out, std::string_view address) {
    WsdlWriter(Schema::For(version), out).Write(address);
}

}  // namespace Orbit::Wire
