#include "SearchKit/DocumentSets.h"

namespace searchkit {

void unite(const HitList& a, const HitList& b, HitList& both) {
  both.clear();
  both.reserve(a.size() + b.size());
  auto left = a.begin();
  auto right = b.begin();
  while (left != a.end() && right != b.end()) {
    if (left->document < right->document) {
      both.push_back(*left++);
    } else if (right->document < left->document) {
      both.push_back(*right++);
    } else {
      both.push_back({left->document, left->score + right->score});
      ++left;
      ++right;
    }
  }
  both.insert(both.end(), left, a.end());
  both.insert(both.end(), right, b.end());
}

}  // namespace searchkit
