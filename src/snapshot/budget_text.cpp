// Texts of exceeded limits.
#include "snapshot/budget_text.h"

#include <algorithm>
#include <cstddef>

std::string ExceededText(const char* what, long long figure, long long limit,
                         std::vector<BudgetShare> shares) {
    constexpr std::size_t kShown = 3;
    if (figure <= limit) return {};
    std::stable_sort(shares.begin(), shares.end(), [](const BudgetShare& one, const BudgetShare& other) {
        return one.second > other.second;
    });
    std::string text =
        std::string(what) + ": " + std::to_string(figure) + ", limit " + std::to_string(limit) + "\n";
    for (std::size_t index = 0; index < std::min(kShown, shares.size()); ++index) {
        const auto& [name, share] = shares[index];
        if (share > 0) text += "  " + name + ": " + std::to_string(share) + "\n";
    }
    return text;
}
