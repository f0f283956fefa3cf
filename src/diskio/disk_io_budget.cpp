// Budgets over the disk ledger.
#include <string>
#include <utility>
#include <vector>

#include "snapshot/budget_text.h"
#include "zanbase/budget.h"

namespace {

using Row = HDiskIOSnapshot::Row;
using Operation = HDiskIOSnapshot::Operation;

std::string TextFor(const char* what, const HDiskIOSnapshot& scope, Operation Row::*operation,
                    long long Operation::*figure, long long limit) {
    long long sum = 0;
    std::vector<BudgetShare> shares;
    shares.reserve(scope.maRows.size());
    for (const Row& row : scope.maRows) {
        const long long share = row.*operation.*figure;
        sum += share;
        shares.emplace_back(row.moName, share);
    }
    return ExceededText(what, sum, limit, std::move(shares));
}

}  // namespace

HDiskIOBudget::HDiskIOBudget() : moStart(HDiskIOSnapshot::Take()) {}

HDiskIOBudget& HDiskIOBudget::LimitOpens(long long limit) {
    mnOpensLimit = limit;
    return *this;
}

HDiskIOBudget& HDiskIOBudget::LimitReads(long long limit) {
    mnReadsLimit = limit;
    return *this;
}

HDiskIOBudget& HDiskIOBudget::LimitBytesRead(long long limit) {
    mnBytesReadLimit = limit;
    return *this;
}

bool HDiskIOBudget::Check() {
    const HDiskIOSnapshot scope = HDiskIOSnapshot::Take().Since(moStart);
    moText = TextFor("files opened", scope, &Row::moOpen, &Operation::mnCount, mnOpensLimit) +
             TextFor("reads", scope, &Row::moRead, &Operation::mnCount, mnReadsLimit) +
             TextFor("bytes read", scope, &Row::moRead, &Operation::mnBytes, mnBytesReadLimit);
    return moText.empty();
}
