// Double arithmetic that rounds as x86_64's SSE2 does, on both targets.
//
// i386 computes doubles on the x87 unit, whose registers keep 64 significand
// bits: a result is rounded once to that width and again when stored as a
// double, and an expression's intermediates may skip the second rounding
// altogether. Each operation here is done with the x87 precision control set
// to 53 bits and its result stored as a double, so it rounds exactly once, as
// SSE2 does. (The x87 exponent range stays wider, which only matters for
// results in the subnormal range; none of the callers comes near it.)
#pragma once

#include <cstdint>

namespace zv::time_double {

#if defined(__i386__) && !defined(__SSE2_MATH__)

template <class Op>
inline double round_once(double a, double b, Op op)
{
    uint16_t saved;
    asm volatile("fnstcw %0" : "=m"(saved));
    const uint16_t double_precision = static_cast<uint16_t>((saved & ~0x300u) | 0x200u);
    asm volatile("fldcw %0" : : "m"(double_precision));
    // The operands are read, and the result stored, between the two fldcw.
    asm volatile("" : "+m"(a), "+m"(b));
    double result = op(a, b);
    asm volatile("fldcw %1" : "+m"(result) : "m"(saved));
    return result;
}

// An integer converted with the default precision control is exact in the
// register; the store rounds it once.
template <class Integer>
inline double to_double(Integer value)
{
    double result = static_cast<double>(value);
    asm volatile("" : "+m"(result));
    return result;
}

#else

template <class Op>
inline double round_once(double a, double b, Op op)
{
    return op(a, b);
}

template <class Integer>
inline double to_double(Integer value)
{
    return static_cast<double>(value);
}

#endif

inline double add(double a, double b)
{
    return round_once(a, b, [](double x, double y) { return x + y; });
}

inline double subtract(double a, double b)
{
    return round_once(a, b, [](double x, double y) { return x - y; });
}

inline double multiply(double a, double b)
{
    return round_once(a, b, [](double x, double y) { return x * y; });
}

inline double divide(double a, double b)
{
    return round_once(a, b, [](double x, double y) { return x / y; });
}

}  // namespace zv::time_double
