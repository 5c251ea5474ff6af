// Kernite's objects take their memory from an allocator library that, as Debian
// ships it, also defines malloc and the global operator new. Using it must not hand
// the process those: a program that links libtarn-types keeps the C and C++
// libraries', and the allocator's names stay out of the process's symbol scope.
#include <dlfcn.h>
#include <gtest/gtest.h>

#include <string>

#include "kernite/Memory.h"
#include "tarn/tarn.h"

namespace {

TEST(ProcessAllocator, MallocAndOperatorNewStayTheSystemLibraries) {
    ASSERT_NE(Orbit::GetType<Tarn::ServiceInstance>(), nullptr);  // the loaders ran and made objects
    const std::string allocator = Kernite::Memory::AllocatorName();
    // Sanitizer builds replace malloc themselves and leave the allocator library out.
    if (allocator == "operator new") GTEST_SKIP() << "objects take the global operator new";
    const std::string library = "lib" + allocator + ".so.2";
    void* handle = dlopen(library.c_str(), RTLD_LAZY | RTLD_NOLOAD);
    ASSERT_NE(handle, nullptr) << library << " is not loaded";
    dlclose(handle);
    EXPECT_EQ(dlsym(RTLD_DEFAULT, allocator == "mimalloc" ? "mi_malloc" : "mallocx"), nullptr);

    const struct {
        const char* symbol;
        const char* library;
    } expected[] = {{"malloc", "libc.so"},     {"free", "libc.so"},       {"calloc", "libc.so"},
                    {"realloc", "libc.so"},    {"_Znwm", "libstdc++.so"}, {"_ZdlPv", "libstdc++.so"},
                    {"_Znam", "libstdc++.so"}, {"_ZdaPv", "libstdc++.so"}};
    for (const auto& e : expected) {
        // What every library of the process binds to: the first definition in the global scope.
        Dl_info info{};
        ASSERT_NE(dladdr(dlsym(RTLD_DEFAULT, e.symbol), &info), 0) << e.symbol;
        EXPECT_NE(std::string(info.dli_fname).find(e.library), std::string::npos)
            << e.symbol << " comes from " << info.dli_fname;
    }
}

}  // namespace
