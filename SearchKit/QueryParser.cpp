#include "SearchKit/QueryParser.h"

#include <iterator>
#include <string>
#include <unordered_set>
#include <utility>
#include <vector>

#include "SearchKit/QueryLexer.h"
#include "SearchKit/QueryTerms.h"
#include "SearchKit/Tokenizer.h"

namespace searchkit {
namespace {

using Kind = QueryToken::Kind;

enum class Sign : uint8_t { none, plus, minus };
enum class Joiner : uint8_t { blank, conjunction, disjunction };

struct Item {
  QueryNode node;
  Sign sign = Sign::none;
};

// Items that AND joins; alternatives are joined by OR.
struct Alternative {
  std::vector<Item> items;
  bool isBesideOperator = false;
};

void append(std::vector<QueryNode>& to, std::vector<QueryNode>&& from) {
  to.insert(to.end(), std::make_move_iterator(from.begin()), std::make_move_iterator(from.end()));
}

// What tells two leaves apart: no term has these bytes.
std::string leafKey(const QueryNode& leaf) {
  std::string key;
  for (const PhraseSlot& slot : leaf.slots) {
    key += slot.pattern.isOpenAtStart ? '\x01' : '\x02';
    for (const std::string& piece : slot.pattern.pieces) {
      key += piece;
      key += '\x03';
    }
    key += slot.pattern.isOpenAtEnd ? '\x01' : '\x02';
    key += std::to_string(slot.offset);
    key += '\x04';
  }
  return key;
}

// Saying a word twice does not make it mean more.
void dropRepetitions(std::vector<QueryNode>& nodes) {
  if (nodes.size() < 2) {
    return;
  }
  std::unordered_set<std::string> seen;
  std::vector<QueryNode> kept;
  kept.reserve(nodes.size());
  for (QueryNode& node : nodes) {
    if (!node.isLeaf() || seen.insert(leafKey(node)).second) {
      kept.push_back(std::move(node));
    }
  }
  nodes.swap(kept);
}

QueryNode simplified(QueryNode clause) {
  dropRepetitions(clause.required);
  dropRepetitions(clause.optional);
  dropRepetitions(clause.excluded);
  if (clause.excluded.empty() && clause.required.size() + clause.optional.size() == 1) {
    std::vector<QueryNode>& only = clause.required.empty() ? clause.optional : clause.required;
    QueryNode child = std::move(only.front());
    return child;
  }
  return clause;
}

void addItem(QueryNode& clause, Item&& item) {
  if (item.sign == Sign::minus) {
    if (item.node.hasPositive()) {
      clause.excluded.push_back(std::move(item.node));
    } else {
      // Not without a word: with it.
      QueryNode any;
      any.optional = std::move(item.node.excluded);
      clause.required.push_back(simplified(std::move(any)));
    }
  } else if (!item.node.hasPositive()) {
    append(clause.excluded, std::move(item.node.excluded));
  } else if (item.node.mayBeLeftOut && item.sign == Sign::none) {
    clause.optional.push_back(std::move(item.node));
  } else {
    clause.required.push_back(std::move(item.node));
  }
}

// One level of parentheses while it is read.
class Group {
 public:
  explicit Group(bool blankMeansOr) : _blankMeansOr(blankMeansOr) {}

  void join(Joiner joiner) {
    _joiner = joiner;
    _sign = Sign::none;
  }

  void sign(Sign sign) { _sign = sign; }

  void add(QueryNode node) {
    const Sign sign = std::exchange(_sign, Sign::none);
    if (node.isEmpty()) {
      return;
    }
    const Joiner joiner = std::exchange(_joiner, Joiner::blank);
    const bool isConjunction =
        joiner == Joiner::conjunction || (joiner == Joiner::blank && !_blankMeansOr);
    if (_alternatives.empty() || !isConjunction) {
      if (!_alternatives.empty() && joiner == Joiner::disjunction) {
        _alternatives.back().isBesideOperator = true;
      }
      const bool isBeside = !_alternatives.empty() && joiner == Joiner::disjunction;
      _alternatives.push_back({{}, isBeside});
    }
    _alternatives.back().items.push_back({std::move(node), sign});
  }

  // All that was added, as one node; nothing is left.
  QueryNode take() {
    QueryNode group;
    const bool isOnlyOne = _alternatives.size() == 1;
    for (Alternative& alternative : _alternatives) {
      const bool isRequired = alternative.items.size() == 1 &&
                              alternative.items[0].sign == Sign::plus &&
                              !alternative.isBesideOperator;
      QueryNode clause;
      for (Item& item : alternative.items) {
        addItem(clause, std::move(item));
      }
      if (isOnlyOne) {
        group = std::move(clause);
      } else if (!clause.hasPositive()) {
        append(group.excluded, std::move(clause.excluded));
      } else {
        (isRequired ? group.required : group.optional).push_back(simplified(std::move(clause)));
      }
    }
    _alternatives.clear();
    _joiner = Joiner::blank;
    _sign = Sign::none;
    return simplified(std::move(group));
  }

 private:
  bool _blankMeansOr;
  Joiner _joiner = Joiner::blank;
  Sign _sign = Sign::none;
  std::vector<Alternative> _alternatives;
};

class Parser {
 public:
  Parser(std::string_view text, bool blankMeansOr, size_t minimumTermLength)
      : _tokens(queryTokens(text)), _blankMeansOr(blankMeansOr), _tokenizer(minimumTermLength) {
    for (size_t i = 0; i < _tokens.size(); ++i) {
      if (_isTerm(_tokens[i])) {
        _lastTerm = i;
      }
    }
  }

  QueryNode parse() {
    _groups.emplace_back(_blankMeansOr);
    for (size_t i = 0; i < _tokens.size(); ++i) {
      _take(_tokens[i], i == _lastTerm);
    }
    while (_groups.size() > 1) {
      _closeGroup();
    }
    return _groups.back().take();
  }

 private:
  static bool _isTerm(const QueryToken& token) {
    return token.kind == Kind::word || token.kind == Kind::phrase;
  }

  void _take(const QueryToken& token, bool isLastTerm) {
    Group& group = _groups.back();
    switch (token.kind) {
      case Kind::plus:
        group.sign(Sign::plus);
        break;
      case Kind::minus:
        group.sign(Sign::minus);
        break;
      case Kind::conjunction:
        group.join(Joiner::conjunction);
        break;
      case Kind::disjunction:
        group.join(Joiner::disjunction);
        break;
      case Kind::open:
        _open();
        break;
      case Kind::close:
        _close();
        break;
      case Kind::word:
      case Kind::phrase: {
        QueryNode node = queryTermsFromText(token.text, token.isOpenAtEnd, _tokenizer, _allowance);
        node.mayBeLeftOut = node.mayBeLeftOut && !isLastTerm;
        group.add(std::move(node));
        break;
      }
    }
  }

  void _open() {
    if (_groups.size() + _reopened >= maximumQueryDepth) {
      ++_ignoredOpen;
    } else {
      _groups.emplace_back(_blankMeansOr);
    }
  }

  void _close() {
    if (_ignoredOpen > 0) {
      --_ignoredOpen;
    } else if (_groups.size() > 1) {
      _closeGroup();
    } else if (_groups.size() + _reopened < maximumQueryDepth) {
      // It was opened at the start, then: all so far is what it encloses.
      ++_reopened;
      QueryNode all = _groups.back().take();
      _groups.back().add(std::move(all));
    }
  }

  void _closeGroup() {
    QueryNode node = _groups.back().take();
    _groups.pop_back();
    _groups.back().add(std::move(node));
  }

  std::vector<QueryToken> _tokens;
  bool _blankMeansOr;
  Tokenizer _tokenizer;
  size_t _lastTerm = 0;
  QueryAllowance _allowance{maximumQueryTerms, maximumQueryScans};
  // Open parentheses, outermost first; the first stands for the whole query.
  std::vector<Group> _groups;
  size_t _ignoredOpen = 0;
  size_t _reopened = 0;
};

}  // namespace

QueryNode parseQuery(std::string_view text, bool blankMeansOr, size_t minimumTermLength) {
  return Parser(text, blankMeansOr, minimumTermLength).parse();
}

}  // namespace searchkit
