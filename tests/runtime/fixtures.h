// The runtime's tests run on the classes generated from tests/runtime/catalogue
// (namespace "fix") and on this server-side calculator.
#pragma once

#include <thread>

#include "fix/fix.h"
#include "orbit/Loopback.h"
#include "support.h"

namespace Fixture {

using namespace TestSupport;

// A server-side calculator that remembers what the last call saw.
class CalculatorImpl : public Orbit::ManagedObjectImpl, public virtual Fix::Calculator {
public:
    explicit CalculatorImpl(std::string id) : ManagedObjectImpl(std::move(id)) {}

    std::string GetName() override { return "calc:" + GetId(); }
    int Add(int a, int b) override {
        seenContext = Orbit::LoopbackAdapter::CurrentContext();
        seenThread = std::this_thread::get_id();
        return a + b;
    }
    void Fail(const std::string& why) override {
        seenThread = std::this_thread::get_id();
        Kernite::Ref<Fix::BadRequest> fault(new Fix::BadRequest());
        fault->SetMsg(why);
        fault->Throw();
    }
    void Echo(Orbit::Any* value, Kernite::Ref<Orbit::Any>& result) override { result = value; }
    void StartJob(Kernite::Ref<Orbit::MoRef>& result) override { result = new Orbit::MoRef("fix.Task", "task-1"); }
    void _Unregistered() override { ++unregistered; }

    Orbit::RequestContext* seenContext = nullptr;
    std::thread::id seenThread;
    int unregistered = 0;
};

}  // namespace Fixture
