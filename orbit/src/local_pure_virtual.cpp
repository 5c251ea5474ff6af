// Compiled into each generated type library, hidden: the construction vtables of
// its interfaces and stubs hold thousands of pure-virtual slots, and with a copy of
// its own the library binds them at link time instead of looking the C++
// library's up once per slot at load. Reaching one is a broken object, as ever.
#include <cstdio>
#include <exception>

extern "C" [[noreturn, gnu::visibility("hidden")]] void __cxa_pure_virtual() {
    std::fputs("pure virtual method called\n", stderr);
    std::terminate();
}
