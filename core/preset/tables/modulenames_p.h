// Names of modules in tables, and which of them are installed.
#pragma once

#include <string>
#include <string_view>
#include <unordered_set>

// In the order of preference; what is left of the row is null.
struct ModuleRow {
    const char* names[8];

    const char* const* begin() const { return names; }
    const char* const* end() const {
        const char* const* last = names;
        while (last != names + 8 && *last) ++last;
        return last;
    }
    bool empty() const { return !names[0]; }
    bool contains(std::string_view name) const;
};

// The modules of the registry at the time of the construction. One pass over them answers many questions; the
// registry itself walks through all modules for each.
class InstalledModules {
  public:
    InstalledModules();
    bool has(const char* name) const { return names_.contains(name); }

  private:
    std::unordered_set<std::string> names_;
};
