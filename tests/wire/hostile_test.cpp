// Hostile and broken input: every kind of refusal with its fault class and the path
// it names, each limit at its boundary, and nothing left allocated after a refusal.
#include <gtest/gtest.h>

#include <functional>
#include <typeinfo>

#include "orbit/Orbit.h"
#include "orbit/wire/Codec.h"
#include "orbit/wire/Faults.h"
#include "samples.h"
#include "tarn/tarn.h"

namespace {

using Kernite::Ref;
using namespace Orbit::Wire;

Orbit::Version* VersionNamed(const std::string& name) { return Orbit::GetVersionMap()->GetVersion(name); }

Orbit::ManagedMethod* AcquireLock() {
    return Kernite::NarrowToType<Orbit::ManagedObjectType, Orbit::Type>(Orbit::GetType<Tarn::LockStresser>())
        ->FindMember("AcquireLock");
}

// <DebugAcquireLock> with two objects, mode "x", 100, 3 and 50: ten elements, four deep.
std::string GoodRequest() {
    Kernite::RefVector<Orbit::Any> args(5);
    Ref<Orbit::DataArray<Orbit::MoRef>> objects(
        new Orbit::DataArray<Orbit::MoRef>{new Orbit::MoRef("tarn.vmprov.Action", "a-1"),
                                           new Orbit::MoRef("tarn.vmprov.Action", "a-2")});
    args[0] = objects.Get();
    args[1] = new Orbit::Primitive<std::string>("x");
    args[2] = new Orbit::Primitive<long long>(100);
    args[3] = new Orbit::Primitive<int>(3);
    args[4] = new Orbit::Primitive<long long>(50);
    return Codec(*VersionNamed("tarn.version.version6"))
        .EncodeRequest(Orbit::MoRef("tarn.LockStresser", "ls-1"), *AcquireLock(), args);
}

std::string Replace(std::string text, const std::string& from, const std::string& to) {
    const std::size_t at = text.find(from);
    EXPECT_NE(at, std::string::npos) << from;
    return at == std::string::npos ? text : text.replace(at, from.size(), to);
}

std::string Value(const std::string& inner) {
    return R"(<value xmlns="urn:tarnd3" xmlns:t="urn:tarnd3" xmlns:xsd="http://www.w3.org/2001/XMLSchema" )"
           R"(xmlns:xsi="http://www.w3.org/2001/XMLSchema-instance" )" + inner + "</value>";
}

// A data property of a type that version1 sees, introduced later than version1.
std::pair<Orbit::DataObjectType*, std::string> PropertyUnseenBy(Orbit::Version* version) {
    for (Orbit::Type* type : Orbit::GetTypeMap()->GetTypes()) {
        auto* data = dynamic_cast<Orbit::DataObjectType*>(type);
        if (data == nullptr || !type->IsVisible(version)) continue;
        for (const Orbit::Member& p : data->GetProperties())
            if (!p.IsVisible(version)) return {data, p.name};
    }
    return {nullptr, {}};
}

struct Case {
    const char* what;
    std::function<std::string()> body;
    const std::type_info& fault;
    std::string path;
    enum { Request, Value } as = Request;
    const char* version = "tarn.version.version6";
};

TEST(WireHostile, EachRefusalIsItsFaultNamingThePathAndLeavesNothing) {
    const std::string good = GoodRequest();
    const auto [unseenType, unseenProperty] = PropertyUnseenBy(VersionNamed("tarn.version.version1"));
    ASSERT_NE(unseenType, nullptr);
    const Case cases[] = {
        {"not well-formed", [&] { return good.substr(0, good.size() - 9); }, typeid(MalformedMessage), ""},
        {"a DOCTYPE", [&] { return Replace(good, "?>", "?><!DOCTYPE e:Envelope [<!ENTITY x \"y\">]>"); },
         typeid(MalformedMessage), ""},
        {"an entity", [&] { return Replace(good, ">x<", ">&ext;<"); }, typeid(MalformedMessage), ""},
        {"bad UTF-8", [&] { return Replace(good, ">x<", ">\xC0\xAF<"); }, typeid(MalformedMessage), ""},
        {"no envelope", [&] { return Replace(good, "http://schemas.xmlsoap.org/soap/envelope/", "urn:other"); },
         typeid(MalformedMessage), ""},
        {"a header entry that must be understood",
         [&] { return Replace(good, "<e:Body>", "<e:Header><audit xmlns=\"urn:elsewhere\" e:mustUnderstand=\"1\"/></e:Header><e:Body>"); },
         typeid(UnknownElement), "/Header/audit"},
        {"an unknown element", [&] { return Replace(good, "<mode>", "<color>red</color><mode>"); },
         typeid(UnknownElement), "/DebugAcquireLock/color"},
        {"a repeated member", [&] { return Replace(good, "<mode>", "<mode>s</mode><mode>"); },
         typeid(UnknownElement), "/DebugAcquireLock/mode"},
        {"an unknown attribute", [&] { return Replace(good, "<iters>", "<iters color=\"red\">"); },
         typeid(UnknownElement), "/DebugAcquireLock/iters"},
        {"a missing member", [&] { return Replace(good, "<iters>3</iters>", ""); }, typeid(MissingElement),
         "/DebugAcquireLock/iters"},
        {"a missing target", [&] { return Replace(good, "<target moType=\"tarn.LockStresser\">ls-1</target>", ""); },
         typeid(MissingElement), "/DebugAcquireLock/objects"},
        {"a word for an int", [&] { return Replace(good, ">3<", ">three<"); }, typeid(InvalidValue),
         "/DebugAcquireLock/iters"},
        {"an int out of range", [&] { return Replace(good, ">3<", ">2147483648<"); }, typeid(InvalidValue),
         "/DebugAcquireLock/iters"},
        {"a long out of range", [&] { return Replace(good, ">100<", ">9223372036854775808<"); },
         typeid(InvalidValue), "/DebugAcquireLock/holdDurationMillis"},
        {"an element in a value", [&] { return Replace(good, ">x<", "><b>x</b><"); }, typeid(InvalidValue),
         "/DebugAcquireLock/mode/b"},
        {"a reference without moType", [&] { return Replace(good, "<objects moType=\"tarn.vmprov.Action\">a-2",
                                                             "<objects>a-2"); },
         typeid(InvalidValue), "/DebugAcquireLock/objects[1]"},
        {"an unknown operation", [&] { return Replace(Replace(good, "<DebugAcquireLock ", "<DebugAcquire "),
                                                      "</DebugAcquireLock>", "</DebugAcquire>"); },
         typeid(UnknownMethod), "/DebugAcquire"},
        {"a target without the method", [&] { return Replace(good, "\"tarn.LockStresser\"", "\"tarn.SecurityManager\""); },
         typeid(UnknownMethod), "/DebugAcquireLock/target"},
        {"a method version1 does not see", [&] { return Replace(Replace(good, "<DebugAcquireLock ", "<DebugClearAlerts "),
                                                                "</DebugAcquireLock>", "</DebugClearAlerts>"); },
         typeid(UnknownMethod), "/DebugClearAlerts", Case::Request, "tarn.version.version1"},
        {"an unknown tag", [] { return Value(R"(xsi:type="t:tarn.LockStresser.LockMode">exclusive)"); },
         typeid(InvalidValue), "/value", Case::Value},
        {"a bad dateTime", [] { return Value(R"(xsi:type="xsd:dateTime">2026-13-01T00:00:00Z)"); },
         typeid(InvalidValue), "/value", Case::Value},
        {"anyType without xsi:type", [] { return Value(R"(xsi:type="t:strata.KeyAnyValue"><key>k</key><value>v</value>)"); },
         typeid(InvalidValue), "/value/value", Case::Value},
        {"an xsi:type that is no subtype",
         [] { return Value(R"(xsi:type="t:tarn.DebugManager.TraceResult"><nonTaskError xsi:type="t:strata.KeyAnyValue"/>)"); },
         typeid(InvalidValue), "/value/nonTaskError", Case::Value, "tarn.version.dev"},
        {"a member version1 does not see",
         [&] {
             const Codec dev(*VersionNamed("tarn.version.dev"));
             return dev.EncodeValue(Roundtrip::MakeFullObject(unseenType, 1, true).Get());
         },
         typeid(UnknownElement), "/value/" + unseenProperty, Case::Value, "tarn.version.version1"},
    };
    for (const Case& c : cases) {
        const Codec codec(*VersionNamed(c.version));
        const std::string body = c.body();
        const long live = Kernite::ObjectImpl::LiveObjects();
        try {
            if (c.as == Case::Request) codec.DecodeRequest(body);
            else codec.DecodeValue(body);
            ADD_FAILURE() << c.what << ": accepted\n" << body;
        } catch (const InvalidRequest::Exception& e) {
            auto* fault = dynamic_cast<InvalidRequest*>(e.GetFault());
            EXPECT_EQ(typeid(*fault), c.fault) << c.what << ": " << fault->GetMsg();
            EXPECT_EQ(fault->GetPath(), c.path) << c.what << ": " << fault->GetMsg();
            EXPECT_EQ(fault->GetMsg().rfind(c.path, 0), 0u) << c.what << ": " << fault->GetMsg();
        }
        EXPECT_EQ(Kernite::ObjectImpl::LiveObjects(), live) << c.what;
    }
    EXPECT_THROW(RequireVersion("urn:tarnd3/9.9"), UnknownVersion::Exception);
    EXPECT_EQ(&RequireVersion("\"urn:tarnd3/2.0\""), VersionNamed("tarn.version.version6"));
}

// A request as another SOAP client writes it: its own prefixes, layout, a header,
// xsi:type where it is not needed, CDATA and character references.
TEST(WireHostile, ARequestInAnotherClientsStyleIsRead) {
    const std::string body = R"(<?xml version='1.0' encoding='utf-8'?>
<soap-env:Envelope xmlns:soap-env="http://schemas.xmlsoap.org/soap/envelope/">
  <soap-env:Header><trace xmlns="urn:elsewhere"><hop>1</hop></trace>
    <relay xmlns="urn:elsewhere" soap-env:mustUnderstand="1" soap-env:actor="urn:another-hop"/></soap-env:Header>
  <soap-env:Body>
    <ns0:DebugAcquireLock xmlns:ns0="urn:tarnd3">
      <ns0:target moType="tarn.LockStresser">stresser-1</ns0:target>
      <ns0:objects xmlns:xsi="http://www.w3.org/2001/XMLSchema-instance" moType="tarn.vmprov.Action"
                   xsi:type="ns0:ManagedObjectReference">vm-7</ns0:objects>
      <mode xmlns="urn:tarnd3"><![CDATA[x&]]>&#x61;ll</mode>
      <ns0:holdDurationMillis> +250 </ns0:holdDurationMillis>
      <ns0:iters>3</ns0:iters>
      <ns0:durationBetweenItersMillis>40</ns0:durationBetweenItersMillis>
    </ns0:DebugAcquireLock>
  </soap-env:Body>
</soap-env:Envelope>)";
    Request request = Codec(*VersionNamed("tarn.version.version8")).DecodeRequest(body);
    EXPECT_EQ(request.method, AcquireLock());
    EXPECT_EQ(request.target->GetId(), "stresser-1");
    auto* objects = Kernite::NarrowToType<Orbit::DataArray<Orbit::MoRef>, Orbit::Any>(request.args[0].Get());
    ASSERT_EQ(objects->GetLength(), 1);
    EXPECT_EQ(objects->GetAt(0)->GetType(), "tarn.vmprov.Action");
    using Text = Orbit::Primitive<std::string>;
    using Long = Orbit::Primitive<long long>;
    EXPECT_EQ((Kernite::NarrowToType<Text, Orbit::Any>(request.args[1].Get())->GetValue()), "x&all");
    EXPECT_EQ((Kernite::NarrowToType<Long, Orbit::Any>(request.args[2].Get())->GetValue()), 250);
}

// Each limit accepts what is exactly at it and refuses one more.
TEST(WireHostile, LimitsHoldAtTheirBoundaries) {
    const std::string good = GoodRequest();
    const Orbit::Version& version = *VersionNamed("tarn.version.version6");
    struct Limit {
        Limits at;
        Limits below;
    };
    const Limit limits[] = {
        {{good.size(), 64, 1000}, {good.size() - 1, 64, 1000}},
        {{1u << 20, 4, 1000}, {1u << 20, 3, 1000}},
        {{1u << 20, 64, 10}, {1u << 20, 64, 9}},
    };
    for (const Limit& limit : limits) {
        try {
            EXPECT_EQ(Codec(version, limit.at).DecodeRequest(good).method, AcquireLock());
        } catch (const InvalidRequest::Exception& e) {
            ADD_FAILURE() << e.GetFault()->GetMsg();
        }
        EXPECT_THROW(Codec(version, limit.below).DecodeRequest(good), LimitExceeded::Exception);
    }
    // Many elements are refused before the parser builds them.
    std::string flood = Replace(good, "<mode>", std::string(3000, ' ') + "<mode>");
    for (int i = 0; i < 500; ++i) flood = Replace(flood, std::string(6, ' '), "<a/>  ");
    EXPECT_THROW(Codec(version, {1u << 20, 64, 100}).DecodeRequest(flood), LimitExceeded::Exception);
}

}  // namespace
