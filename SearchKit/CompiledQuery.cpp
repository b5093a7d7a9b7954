#include "SearchKit/CompiledQuery.h"

#include <algorithm>
#include <memory>
#include <utility>

#include "SearchKit/IndexFormat.h"
#include "SearchKit/QueryParser.h"

namespace searchkit {
namespace {

bool isWord(const QueryNode& node) {
  return node.slots.size() == 1 &&
         (node.slots[0].pattern.isExact() || node.slots[0].pattern.isPrefix());
}

bool areWords(const std::vector<QueryNode>& nodes) {
  return std::all_of(nodes.begin(), nodes.end(), isWord);
}

QueryWord wordOf(const QueryNode& node) {
  const TermPattern& pattern = node.slots[0].pattern;
  QueryWord word;
  word.term = pattern.pieces[0];
  word.isPrefix = pattern.isPrefix();
  word.firstKey = format::blockKey(word.term);
  const size_t bits = word.term.size() * 8;
  word.lastKey = word.firstKey | (bits < 64 ? ~uint64_t{0} >> bits : 0);
  word.mergedKey = word.isPrefix ? format::mergedKey(word.term) : 0;
  return word;
}

void append(const std::vector<QueryNode>& nodes, std::vector<QueryWord>& words) {
  const auto begin = static_cast<ptrdiff_t>(words.size());
  for (const QueryNode& node : nodes) {
    words.push_back(wordOf(node));
  }
  std::stable_sort(words.begin() + begin, words.end(), [](const QueryWord& a, const QueryWord& b) {
    return a.term.size() > b.term.size();
  });
}

}  // namespace

CompiledQuery CompiledQuery::make(std::string_view text, bool blankMeansOr,
                                  size_t minimumTermLength) {
  CompiledQuery query;
  query.root = parseQuery(text, blankMeansOr, minimumTermLength);
  const QueryNode& root = query.root;
  if (root.isLeaf()) {
    query.isWords = isWord(root);
    if (query.isWords) {
      query.words.push_back(wordOf(root));
      query.requiredCount = 1;
    }
  } else if (root.hasPositive() && root.excluded.empty() && areWords(root.required) &&
             areWords(root.optional)) {
    query.isWords = true;
    query.requiredCount = root.required.size();
    append(root.required, query.words);
    append(root.optional, query.words);
  }
  return query;
}

}  // namespace searchkit

SKQuery::~SKQuery() {
  for (Form* form = _forms.load(); form != nullptr;) {
    const std::unique_ptr<Form> last(form);
    form = form->next;
  }
}

const searchkit::CompiledQuery& SKQuery::compiled(size_t minimumTermLength) const {
  // No term is longer: beyond that all minimum lengths are alike.
  minimumTermLength = std::min(minimumTermLength, searchkit::format::maximumTermBytes + 1);
  Form* const first = _forms.load(std::memory_order_acquire);
  for (const Form* form = first; form != nullptr; form = form->next) {
    if (form->minimumTermLength == minimumTermLength) {
      return form->query;
    }
  }
  auto form = std::make_unique<Form>(
      Form{minimumTermLength,
           searchkit::CompiledQuery::make(_text, (_options & kSKSearchOptionSpaceMeansOR) != 0,
                                          minimumTermLength),
           first});
  while (!_forms.compare_exchange_weak(form->next, form.get(), std::memory_order_acq_rel)) {
  }
  return form.release()->query;
}
