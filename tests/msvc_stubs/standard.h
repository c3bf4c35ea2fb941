#pragma once
// Stands in for every standard header: just what the public headers use, from what the compiler itself knows.
#include <stdarg.h>
#include <stddef.h>

namespace std {
using ::size_t;
using ::va_list;
using nullptr_t = decltype(nullptr);
using int32_t = int;
using uint8_t = unsigned char;
using uint16_t = unsigned short;
using uint32_t = unsigned int;
using uint64_t = unsigned long long;
using intptr_t = long long;

extern "C" int memcmp(const void* first, const void* second, size_t size);

template <class T, T Value> struct integral_constant { static constexpr T value = Value; };
template <bool Value> using bool_constant = integral_constant<bool, Value>;
template <bool, class A, class B> struct conditional { using type = A; };
template <class A, class B> struct conditional<false, A, B> { using type = B; };
template <bool Condition, class A, class B> using conditional_t = typename conditional<Condition, A, B>::type;
template <bool, class T = void> struct enable_if {};
template <class T> struct enable_if<true, T> { using type = T; };
template <bool Condition, class T = void> using enable_if_t = typename enable_if<Condition, T>::type;
template <class A, class B> struct is_same : bool_constant<__is_same(A, B)> {};
template <class T> struct is_integral : bool_constant<__is_integral(T)> {};
template <class T> struct is_floating_point : bool_constant<__is_floating_point(T)> {};
template <class T> struct is_signed : bool_constant<__is_signed(T)> {};
template <class T> struct is_unsigned : bool_constant<__is_unsigned(T)> {};
template <class T> struct is_arithmetic : bool_constant<__is_arithmetic(T)> {};
template <class T> struct is_enum : bool_constant<__is_enum(T)> {};
template <class From, class To> struct is_convertible : bool_constant<__is_convertible_to(From, To)> {};
template <class T> struct is_standard_layout : bool_constant<__is_standard_layout(T)> {};

template <class T, class U> constexpr T&& forward(U& value) noexcept { return static_cast<T&&>(value); }
template <class T, class U = T> constexpr T exchange(T& object, U&& value) noexcept {
    T old = static_cast<T&&>(object);
    object = static_cast<U&&>(value);
    return old;
}

enum memory_order { memory_order_relaxed };
template <class T> struct atomic {
    constexpr atomic(T value) noexcept : m_value(value) {}
    T load(memory_order) const noexcept { return m_value; }
    T fetch_add(T more) noexcept { return (m_value += more) - more; }
    T fetch_sub(T less) noexcept { return (m_value -= less) + less; }
    T m_value;
};
} // namespace std

inline void* operator new(std::size_t, void* where) noexcept { return where; }
inline void operator delete(void*, void*) noexcept {}
