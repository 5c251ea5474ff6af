// Every registered value and every managed member through the codec and back, for
// every API version that sees it; faults come back as their own class.
#include <gtest/gtest.h>

#include "orbit/Orbit.h"
#include "orbit/wire/Codec.h"
#include "orbit/wire/Faults.h"
#include "samples.h"
#include "tarn/fault.h"
#include "tarn/tarn.h"

namespace {

using Kernite::Ref;
using Orbit::Any;
using Orbit::Version;
using Orbit::Wire::Codec;

std::vector<Version*> TarnVersions() {
    std::vector<Version*> found;
    for (Version* v : Orbit::GetVersionMap()->GetVersions())
        if (v->GetServiceNamespace() == "tarnd3") found.push_back(v);
    return found;
}

TEST(WireValues, EveryDataTypeRoundTripsInEveryVersionThatSeesIt) {
    int checked = 0;
    for (Version* version : Orbit::GetVersionMap()->GetVersions()) {
        const Codec codec(*version);
        for (Orbit::Type* type : Orbit::GetTypeMap()->GetTypes()) {
            auto* data = dynamic_cast<Orbit::DataObjectType*>(type);
            if (data == nullptr || !type->IsVisible(version)) continue;
            for (bool optionals : {true, false}) {
                Ref<Orbit::DataObject> source = Roundtrip::MakeFullObject(data, 3, optionals, version);
                const std::string xml = codec.EncodeValue(source.Get());
                Ref<Any> back = codec.DecodeValue(xml);
                ASSERT_EQ(Roundtrip::Difference(source.Get(), back.Get()), "")
                    << version->GetName() << " " << type->GetName() << "\n" << xml;
                ++checked;
            }
        }
    }
    EXPECT_GT(checked, 1000);
}

// What a version does not see is dropped: the members, and the class itself in
// favour of its nearest visible base.
TEST(WireValues, WhatAVersionDoesNotSeeIsDropped) {
    Version* version1 = Orbit::GetVersionMap()->GetVersion("tarn.version.version1");
    Version* dev = Orbit::GetVersionMap()->GetVersion("tarn.version.dev");
    auto* context = Kernite::NarrowToType<Orbit::DataObjectType, Orbit::Type>(
        Orbit::GetTypeMap()->GetType("tarn.vmprov.FtSyncContext"));
    Ref<Orbit::DataObject> full = Roundtrip::MakeFullObject(context, 5, true, dev);
    Ref<Orbit::DataArray<Any>> holder(new Orbit::DataArray<Any>{full.Get()});

    for (Version* version : TarnVersions()) {
        const Codec codec(*version);
        Ref<Any> back = codec.DecodeValue(codec.EncodeValue(holder.Get()));
        auto* item = Kernite::NarrowToType<Orbit::DataArray<Any>, Any>(back.Get())->GetAt(0);
        auto* seen = dynamic_cast<Orbit::DataObject*>(item)->_GetDataType();
        EXPECT_TRUE(seen->IsVisible(version)) << version->GetName();
        EXPECT_TRUE(context->IsA(seen));
        // Exactly what the version sees survives.
        Ref<Orbit::DataObject> expected = Roundtrip::MakeFullObject(context, 5, true, version);
        EXPECT_TRUE(expected->_IsEqual(item, false)) << version->GetName();
        if (version == version1) {
            EXPECT_NE(seen, context);
        }
    }
}

// anyType holds anything: arrays in arrays, enumerations and their arrays, data
// objects of any class, references, infinities, text that needs escaping.
TEST(WireValues, AnyTypeCarriesNestedArraysAndEveryKindOfValue) {
    const Codec codec(*Orbit::GetVersionMap()->GetVersion("tarn.version.dev"));
    auto* lockMode = Kernite::NarrowToType<Orbit::EnumType, Orbit::Type>(
        Orbit::GetTypeMap()->GetType("tarn.LockStresser.LockMode"));
    Ref<Any> mode, modes;
    lockMode->StringToEnum("sall", mode);
    Ref<Orbit::Array<std::string>> tags(new Orbit::Array<std::string>{"xall", "s"});
    lockMode->StringArrayToEnumArray(tags.Get(), modes);
    Ref<Orbit::DataArray<Any>> inner(new Orbit::DataArray<Any>{
        new Orbit::Array<int>{-1, 2147483647}, modes.Get(), new Orbit::Array<std::string>{"a & b", " <c> ", ""}});
    Ref<Orbit::DataArray<Any>> outer(new Orbit::DataArray<Any>{
        inner.Get(), mode.Get(), new Orbit::Primitive<double>(-1.0 / 0.0), new Orbit::Primitive<double>(0.1),
        new Orbit::MoRef("tarn.LockStresser", "ls \"1\""),
        new Orbit::KeyAnyValue("line\r\nbreak\ttab", new Orbit::Array<bool>{true, false}),
        new Orbit::Array<Kernite::System::DateTime>{Kernite::System::DateTime::FromMicroseconds(-1)}});
    const std::string xml = codec.EncodeValue(outer.Get());
    Ref<Any> back = codec.DecodeValue(xml);
    EXPECT_EQ(Roundtrip::Difference(outer.Get(), back.Get()), "") << xml;
}

TEST(WireCalls, EveryMemberOfEveryManagedTypeRoundTrips) {
    int calls = 0;
    for (Version* version : TarnVersions()) {
        const Codec codec(*version);
        for (Orbit::ManagedObjectType* type : Roundtrip::TarnManagedTypes()) {
            if (!type->IsVisible(version)) continue;
            const Orbit::MoRef target(type->GetName(), "obj-" + std::to_string(calls));
            for (Orbit::ManagedMethod* member : Roundtrip::AllMembers(type)) {
                if (!member->IsVisible(version)) continue;
                const auto& params = member->GetParameters();
                Kernite::RefVector<Any> args(static_cast<unsigned>(params.size()));
                for (std::size_t i = 0; i < params.size(); ++i)
                    if (params[i].IsVisible(version))
                        args[i] = Roundtrip::MakeFullSample(params[i], static_cast<int>(i), true, version);

                const std::string request = codec.EncodeRequest(target, *member, args);
                Orbit::Wire::Request decoded = codec.DecodeRequest(request);
                ASSERT_EQ(decoded.method, member) << request;
                EXPECT_TRUE(decoded.target->_IsEqual(const_cast<Orbit::MoRef*>(&target)));
                ASSERT_EQ(decoded.args.size(), args.size());
                for (std::size_t i = 0; i < args.size(); ++i)
                    EXPECT_EQ(Roundtrip::Difference(args[i].Get(), decoded.args[i].Get()), "")
                        << member->GetName() << " argument " << i << "\n" << request;

                Ref<Any> result;
                if (member->IsTask()) result = Roundtrip::MakeTaskReference(calls);
                else if (!Roundtrip::IsVoid(member))
                    result = Roundtrip::MakeFullSample(member->GetResult(), 9, true, version);
                const std::string response = codec.EncodeResponse(*member, result.Get());
                EXPECT_EQ(Roundtrip::Difference(result.Get(), codec.DecodeResponse(response, *member).Get()), "")
                    << member->GetName() << "\n" << response;
                ++calls;
            }
        }
    }
    EXPECT_GT(calls, 500);
}

TEST(WireFaults, FaultsComeBackAsTheirOwnClass) {
    const Codec codec(*Orbit::GetVersionMap()->GetVersion("tarn.version.version6"));
    Ref<Tarn::Fault::SecurityConfigFault> fault(new Tarn::Fault::SecurityConfigFault());
    fault->SetMsg("certificate store <locked>");
    fault->SetFaultCause(new Orbit::MethodFault("disk full", nullptr, nullptr));
    fault->GetFaultData()->Append(new Orbit::KeyAnyValue("attempt", new Orbit::Primitive<int>(3)));

    const std::string body = codec.EncodeFault(*fault);
    EXPECT_NE(body.find("<faultcode>e:Server</faultcode>"), std::string::npos) << body;
    Ref<Orbit::MethodFault> back = codec.DecodeFault(body);
    EXPECT_EQ(typeid(*back), typeid(Tarn::Fault::SecurityConfigFault));
    EXPECT_TRUE(fault->_IsEqual(back.Get()));

    auto* reload = Kernite::NarrowToType<Orbit::ManagedObjectType, Orbit::Type>(
                       Orbit::GetType<Tarn::SecurityManager>())->FindMember("reloadSslCertificate");
    EXPECT_THROW(codec.DecodeResponse(body, *reload), Tarn::Fault::SecurityConfigFault::Exception);

    // The wire's own faults travel the same way, as client faults.
    try {
        codec.DecodeRequest("<not-xml");
        FAIL() << "a malformed request was accepted";
    } catch (const Orbit::Wire::MalformedMessage::Exception& e) {
        const std::string wire = codec.EncodeFault(*e.GetFault());
        EXPECT_NE(wire.find("<faultcode>e:Client</faultcode>"), std::string::npos);
        EXPECT_THROW(codec.DecodeResponse(wire, *reload), Orbit::Wire::MalformedMessage::Exception);
    }

    // A version that does not see the class hears of its nearest base.
    const Codec older(*Orbit::GetVersionMap()->GetVersion("cairn.version.version8"));
    Ref<Orbit::MethodFault> base = older.DecodeFault(older.EncodeFault(*fault));
    EXPECT_EQ(typeid(*base), typeid(Orbit::MethodFault));
    EXPECT_EQ(base->GetMsg(), fault->GetMsg());
}

}  // namespace
