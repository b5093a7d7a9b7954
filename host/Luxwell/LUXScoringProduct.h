// Vectors of small integers: the innermost loops of comparing meanings.
#pragma once

#include <cstddef>
#include <cstdint>

/// Vectors are as long as a multiple of this, filled up with zeros.
inline constexpr size_t LUXVectorBlock = 32;

/// The sum of a[i] * b[i]. `length` is a multiple of LUXVectorBlock, neither vector holds -128, and
/// both are short enough (below 100,000) for the sum to fit. Exact, so the same on every machine.
int32_t LUXInnerProduct(const int8_t* a, const int8_t* b, size_t length) noexcept;

/// The products of one vector with `count` others; quicker than one after the other.
void LUXInnerProducts(const int8_t* vector, const int8_t* const* others, size_t length,
                      size_t count, int32_t* products) noexcept;

/// The same without any instruction that not every processor has; for tests.
int32_t LUXPlainInnerProduct(const int8_t* a, const int8_t* b, size_t length) noexcept;

/// Adds weight * vector[i] to sum[i]. `length` is a multiple of LUXVectorBlock.
void LUXAddScaled(float* sum, const int8_t* vector, float weight, size_t length) noexcept;

/// Makes small integers of a sum, the largest component 127 or -127, and gives what makes their
/// vector one of length 1. 0, with nothing written, when no component is a number other than 0 that
/// is neither infinite nor too small to be divided by; of several, those that are no number count
/// as 0. `length` is a multiple of LUXVectorBlock.
float LUXQuantize(const float* sum, int8_t* vector, size_t length) noexcept;
