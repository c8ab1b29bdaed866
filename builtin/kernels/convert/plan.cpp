#include "builtin/kernels/convert/plan.h"

#include <algorithm>
#include <utility>

#include "builtin/kernels/convert/basicstages.h"
#include "builtin/kernels/convert/rewrites.h"
#include "builtin/kernels/convert/workspace.h"

namespace srk {

namespace {

bool rewriteOne(const Rewrite& rewrite, const Route& route, StageList& list) {
    if (!rewrite.apply(route, list)) return false;
    list.sweep();
    return true;
}

bool rewriteFields(const Rewrite& rewrite, Plan& plan) {
    const auto fields = static_cast<size_t>(plan.route.fields);
    if (!rewrite.together || fields == 1) {
        bool any = false;
        for (size_t f = 0; f < fields; ++f) any |= rewriteOne(rewrite, plan.route, plan.lists[f]);
        return any;
    }
    auto lists = plan.lists;
    for (auto& list : lists)
        if (!rewriteOne(rewrite, plan.route, list)) return false;
    plan.lists = std::move(lists);
    return true;
}

}  // namespace

Plan::Plan() = default;
Plan::~Plan() = default;

void Plan::provideWorkspaces(int threads) const {
    const std::lock_guard guard(lock_);
    const auto wanted = std::min(static_cast<size_t>(threads), idle_.capacity());
    while (idle_.size() < wanted) idle_.push_back(std::make_unique<Workspace>(*this));
}

std::unique_ptr<Workspace> Plan::takeWorkspace() const {
    {
        const std::lock_guard guard(lock_);
        if (!idle_.empty()) {
            auto workspace = std::move(idle_.back());
            idle_.pop_back();
            return workspace;
        }
    }
    return std::make_unique<Workspace>(*this);
}

void Plan::keepWorkspaces() { idle_.reserve(mostKept); }

void Plan::giveBack(std::unique_ptr<Workspace> workspace) const noexcept {
    const std::lock_guard guard(lock_);
    if (idle_.size() < idle_.capacity()) idle_.push_back(std::move(workspace));
}

std::shared_ptr<const Plan> makePlan(const Request& request, unsigned without) {
    auto plan = std::make_shared<Plan>();
    plan->route = routeOf(request);
    if (!plan->route.possible()) return nullptr;
    plan->rows = rowsOf(plan->route);
    const auto fields = static_cast<size_t>(plan->route.fields);
    for (size_t f = 0; f < fields; ++f) plan->lists[f] = basicStages(plan->route, static_cast<int>(f));
    unsigned row = 1;
    for (const auto& rewrite : rewrites()) {
        if (!(without & row) && rewriteFields(rewrite, *plan)) plan->rewritten |= row;
        row <<= 1;
    }
    for (size_t f = 0; f < fields; ++f) plan->lists[f].place();
    plan->keepWorkspaces();
    return plan;
}

namespace {

// The plans of the latest conversions: a chain of filters, or several, meet the same ones for each picture.
class Plans {
  public:
    std::shared_ptr<const Plan> of(const Request& request) {
        {
            const std::lock_guard guard(lock_);
            for (auto& entry : entries_)
                if (entry.plan && entry.plan->route.request == request) {
                    entry.used = ++clock_;
                    return entry.plan;
                }
        }
        auto made = makePlan(request);
        if (!made) return made;
        const std::lock_guard guard(lock_);
        auto& oldest = *std::min_element(entries_.begin(), entries_.end(),
                                         [](const Entry& a, const Entry& b) { return a.used < b.used; });
        oldest = {made, ++clock_};
        return made;
    }

  private:
    struct Entry {
        std::shared_ptr<const Plan> plan;
        unsigned long long used = 0;
    };
    std::mutex lock_;
    std::array<Entry, 16> entries_;
    unsigned long long clock_ = 0;
};

}  // namespace

std::shared_ptr<const Plan> planOf(const Request& request) {
    static Plans plans;
    return plans.of(request);
}

}  // namespace srk
