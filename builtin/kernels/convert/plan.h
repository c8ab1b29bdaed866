// Everything about a conversion that does not depend on the pictures' memory: made when a call is met for the
// first time, kept for those that follow.
#pragma once

#include <array>
#include <memory>
#include <mutex>
#include <vector>

#include "builtin/kernels/convert/route.h"
#include "builtin/kernels/convert/stages.h"

namespace srk {

class Workspace;

struct Plan {
    Route route;
    ChangeRows rows;
    std::array<StageList, 2> lists;  // of each field
    unsigned rewritten = 0;          // bit i: the rewrite of row i found something

    // Memory of the bands that are at work, kept between pictures.
    // Makes what so many threads take at once, so that none of them has to later.
    void provideWorkspaces(int threads) const;
    std::unique_ptr<Workspace> takeWorkspace() const;
    void giveBack(std::unique_ptr<Workspace> workspace) const noexcept;
    void keepWorkspaces();  // makes room for those that come back

    Plan();
    ~Plan();
    Plan(const Plan&) = delete;
    Plan& operator=(const Plan&) = delete;

  private:
    static constexpr size_t mostKept = 16;  // as many threads as share a picture

    mutable std::mutex lock_;
    mutable std::vector<std::unique_ptr<Workspace>> idle_;
};

// Null: there is no path. `without`: bit i leaves out the rewrite of row i.
std::shared_ptr<const Plan> makePlan(const Request& request, unsigned without = 0);
// The plan with all rewrites, made or remembered.
std::shared_ptr<const Plan> planOf(const Request& request);

// Converts target lines first to last - 1 of a field's part of the target rectangle.
void runBand(const Plan& plan, Workspace& workspace, const Picture& source, const Picture& target, int field,
             int first, int last);

}  // namespace srk
