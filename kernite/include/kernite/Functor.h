// A callable wrapper whose trailing Nil parameters are placeholders: a
// Functor<void, A, B, C, Nil, Nil, Nil, Nil> is called with (a, b, c).
#pragma once

#include <functional>
#include <tuple>
#include <type_traits>
#include <utility>

namespace Kernite {

struct Nil {};

namespace detail {
template <class Done, class... Rest>
struct DropNil;
template <class... Done>
struct DropNil<std::tuple<Done...>> {
    using type = std::tuple<Done...>;
};
template <class... Done, class Head, class... Rest>
struct DropNil<std::tuple<Done...>, Head, Rest...> {
    using type = std::conditional_t<std::is_same_v<Head, Nil>, std::tuple<Done...>,
                                    typename DropNil<std::tuple<Done..., Head>, Rest...>::type>;
};
template <class R, class Tuple>
struct FunctionOf;
template <class R, class... A>
struct FunctionOf<R, std::tuple<A...>> {
    using type = std::function<R(A...)>;
};
} // namespace detail

template <class R, class A1 = Nil, class A2 = Nil, class A3 = Nil, class A4 = Nil, class A5 = Nil,
          class A6 = Nil, class A7 = Nil>
class Functor {
    using Function = typename detail::FunctionOf<
        R, typename detail::DropNil<std::tuple<>, A1, A2, A3, A4, A5, A6, A7>::type>::type;

public:
    Functor() = default;
    template <class F, class = std::enable_if_t<!std::is_same_v<std::decay_t<F>, Functor>>>
    Functor(F&& f) : _f(std::forward<F>(f)) {}

    explicit operator bool() const noexcept { return static_cast<bool>(_f); }

    template <class... Args>
    R operator()(Args&&... args) const {
        return _f(std::forward<Args>(args)...);
    }

private:
    Function _f;
};

} // namespace Kernite
