// The arithmetic of relevance: how results of two searches and many books become one list.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

class ZEBResult;

/// By what the relevance of a result is multiplied: the weight of its book, else of its book's
/// model group, else 1; always 1 for the primary book. Weights of 0 count as not given.
double weightOfResult(const ZEBResult& result, const std::optional<std::string>& primaryBookID);

/// Multiplies the relevance by the weight, as a new real number. A result of the primary book keeps
/// its number as it is.
void weightResult(ZEBResult& result, const std::optional<std::string>& primaryBookID);

/// Highest relevance first; equal ones keep their order.
void sortByRelevance(std::vector<std::shared_ptr<ZEBResult>>& results);

/// Where the best keyword result goes, before 0.0001 is taken off: 1 without semantic results, else
/// the relevance of the first semantic one; but where that is 0.99 or more, and so a page that the
/// user named, the first relevance below 0.99 further down, or the last one if there is none.
double keywordScale(const std::vector<std::shared_ptr<ZEBResult>>& semantic);

/// The keyword results, rescaled to lie just below the best semantic ones and weighted by book, and
/// the semantic results as they are, best first. `keyword` is not empty; its best relevance may be
/// 0, which is divided by as it stands.
std::vector<std::shared_ptr<ZEBResult>> mergedResults(
    const std::vector<std::shared_ptr<ZEBResult>>& semantic,
    std::vector<std::shared_ptr<ZEBResult>> keyword,
    const std::optional<std::string>& primaryBookID);
