// Inner products of small integers: the innermost loop of comparing meanings.
#pragma once

#include <cstddef>
#include <cstdint>

/// Vectors are as long as a multiple of this, filled up with zeros.
inline constexpr size_t LUXVectorBlock = 32;

/// The sum of a[i] * b[i]. `length` is a multiple of LUXVectorBlock, neither vector holds -128, and
/// both are short enough (below 100,000) for the sum to fit. Exact, so the same on every machine.
int32_t LUXInnerProduct(const int8_t* a, const int8_t* b, size_t length) noexcept;

/// The same without any instruction that not every processor has; for tests.
int32_t LUXPlainInnerProduct(const int8_t* a, const int8_t* b, size_t length) noexcept;
