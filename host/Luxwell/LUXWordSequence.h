// The words of a page, as the tokens of a book are found in them.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

/// The words of one page by number, in order. Books have many, so that a word takes four bytes.
struct LUXWordSequence {
  class Word {
   public:
    /// Numbers are below this.
    static constexpr uint32_t numberLimit = 1U << 31U;

    constexpr Word(uint32_t number, bool breaksChain) noexcept
        : _bits((number << 1U) | (breaksChain ? 1U : 0U)) {}

    constexpr uint32_t number() const noexcept { return _bits >> 1U; }
    /// No phrase reaches from the word before to this one.
    constexpr bool breaksChain() const noexcept { return (_bits & 1U) != 0; }

   private:
    uint32_t _bits;
  };

  std::vector<Word> words;
  /// So many words at the beginning are the title; the first after them breaks the chain.
  size_t titleLength = 0;
};
