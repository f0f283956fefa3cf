// What a budget says about a limit that was exceeded.
#ifndef ZANBASE_SNAPSHOT_BUDGET_TEXT_H
#define ZANBASE_SNAPSHOT_BUDGET_TEXT_H

#include <string>
#include <utility>
#include <vector>

// A call site or file, and its share of the figure.
using BudgetShare = std::pair<std::string, long long>;

// "WHAT: FIGURE, limit LIMIT" and a line for each of the largest shares above 0; empty if the limit is kept.
std::string ExceededText(const char* what, long long figure, long long limit,
                         std::vector<BudgetShare> shares);

#endif
