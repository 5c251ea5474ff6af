#include <gtest/gtest.h>

#include <vector>

#include "support.h"
#include "kernite/Kernite.h"

using Kernite::ObjectImpl;
using Kernite::Optional;
using Kernite::Ref;
using TestSupport::MessageOf;

namespace {

// Counts its hooks in storage that outlives it.
class Probe : public ObjectImpl {
public:
    struct Hooks {
        int first = 0;
        int final = 0;
    };
    explicit Probe(Hooks* hooks) : _hooks(hooks) {}
    Probe(const Probe&) = default;

protected:
    void FirstIncRef(const std::type_info& type) override {
        EXPECT_EQ(type, typeid(Probe));
        ++_hooks->first;
    }
    void FinalDecRef(const std::type_info&) override { ++_hooks->final; }

private:
    Probe::Hooks* _hooks;
};

TEST(ObjectTest, ReferencesBalanceAndHooksRunOnFirstAndLast) {
    const long before = ObjectImpl::LiveObjects();
    Probe::Hooks hooks;
    {
        Ref<Probe> a(new Probe(&hooks));
        EXPECT_EQ(ObjectImpl::LiveObjects(), before + 1);
        EXPECT_EQ(a->GetRefCount(), 1);

        Ref<Probe> b = a;
        a = a;  // the new reference is taken before the old is released
        a = b.Get();
        EXPECT_EQ(a->GetRefCount(), 2);

        Ref<Probe> c(std::move(b));
        EXPECT_FALSE(b);
        EXPECT_EQ(c->GetRefCount(), 2);

        Probe* raw = c.Release();
        EXPECT_EQ(raw->GetRefCount(), 2);
        Ref<Probe> d = Ref<Probe>::Adopt(raw);
        EXPECT_EQ(d->GetRefCount(), 2);

        a.Reset();
        EXPECT_EQ(d->GetRefCount(), 1);
        EXPECT_EQ(hooks.final, 0);
    }
    EXPECT_EQ(hooks.first, 1);
    EXPECT_EQ(hooks.final, 1);
    EXPECT_EQ(ObjectImpl::LiveObjects(), before);
}

TEST(ObjectTest, CopyIsANewUnreferencedObject) {
    const long before = ObjectImpl::LiveObjects();
    Probe::Hooks hooks;
    {
        Ref<Probe> original(new Probe(&hooks));
        Ref<Probe> extra = original;
        auto* copy = new Probe(*original);
        EXPECT_EQ(copy->GetRefCount(), 0);
        EXPECT_EQ(ObjectImpl::LiveObjects(), before + 2);
        Ref<Probe> held(copy);
        EXPECT_EQ(held->GetRefCount(), 1);
        EXPECT_NE(held->ToString().find("Probe"), std::string::npos);
    }
    EXPECT_EQ(hooks.first, 2);
    EXPECT_EQ(hooks.final, 2);
    EXPECT_EQ(ObjectImpl::LiveObjects(), before);
}

TEST(ObjectTest, ContainersHoldReferences) {
    const long before = ObjectImpl::LiveObjects();
    Probe::Hooks hooks;
    {
        Kernite::RefVector<Probe> args(3);
        ASSERT_EQ(args.size(), 3u);
        for (const auto& arg : args) EXPECT_FALSE(arg);
        args[1] = new Probe(&hooks);

        Kernite::SingletonRef<Probe> single;
        EXPECT_EQ(single.Get(), nullptr);
        single.Set(args[1].Get());
        EXPECT_EQ(args[1]->GetRefCount(), 2);
        args.clear();
        EXPECT_EQ(single->GetRefCount(), 1);
    }
    EXPECT_EQ(hooks.final, 1);
    EXPECT_EQ(ObjectImpl::LiveObjects(), before);
}

TEST(OptionalTest, UnsetScalarRefusesReadsUntilSet) {
    Optional<long long> value;
    EXPECT_FALSE(value.IsSet());
    EXPECT_EQ(MessageOf<Kernite::NotInitializedException>([&] { value.GetValue(); }), "optional value not set");

    value = 0;
    EXPECT_TRUE(value.IsSet());
    EXPECT_EQ(value.GetValue(), 0);
    EXPECT_FALSE(value == Optional<long long>());  // set to zero is not unset
    EXPECT_TRUE(value == Optional<long long>(0));
    EXPECT_FALSE(value == Optional<long long>(1));

    value.Reset();
    EXPECT_FALSE(value.IsSet());
    EXPECT_TRUE(value == Optional<long long>());
    EXPECT_THROW(value.GetValue(), Kernite::NotInitializedException);
}

TEST(OptionalTest, StringLivesApartAndCopiesAreSeparate) {
    static_assert(sizeof(Optional<std::string>) == sizeof(void*));
    Optional<std::string> unset;
    EXPECT_EQ(MessageOf<Kernite::NotInitializedException>([&] { unset.GetValue(); }), "Not initialized");

    Optional<std::string> a("text");
    Optional<std::string> b(a);
    EXPECT_TRUE(a == b);
    EXPECT_NE(&a.GetValue(), &b.GetValue());
    b.SetValue("other");
    EXPECT_EQ(a.GetValue(), "text");
    EXPECT_FALSE(a == b);

    Optional<std::string> moved(std::move(a));
    EXPECT_FALSE(a.IsSet());  // NOLINT(bugprone-use-after-move): the moved-from state is specified
    EXPECT_EQ(moved.GetValue(), "text");

    moved = unset;
    EXPECT_FALSE(moved.IsSet());
    EXPECT_TRUE(moved == unset);
    EXPECT_FALSE(Optional<std::string>("") == unset);  // empty is not absent
}

TEST(FunctorTest, NilPlaceholdersDropFromTheCallSignature) {
    Kernite::Functor<int, int, int> add = [](int a, int b) { return a + b; };
    EXPECT_EQ(add(2, 3), 5);

    int calls = 0;
    std::string seen;
    Kernite::Functor<void, const std::string&, int, Kernite::Nil, Kernite::Nil, Kernite::Nil, Kernite::Nil,
                     Kernite::Nil>
        record = [&](const std::string& text, int times) {
            ++calls;
            for (int i = 0; i < times; ++i) seen += text;
        };
    auto copy = record;
    copy("ab", 2);
    record("c", 1);
    EXPECT_EQ(calls, 2);
    EXPECT_EQ(seen, "ababc");

    Kernite::Functor<void, Kernite::System::ScheduledItem*, Kernite::Exception*> empty;
    EXPECT_FALSE(empty);
    EXPECT_TRUE(record);
}

}  // namespace
