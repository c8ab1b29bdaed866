// Groups of presets, as lists show them: "PSP", "DVD", ...
#pragma once

#include <string>
#include <vector>

#include "core/arch/api.h"
#include "core/preset/qvpreset.h"
#include "core/value/anycontainer.h"

// The presets of a group by their indexes in a QvPresetList.
class QV_API PresetGroup {
  public:
    PresetGroup() = default;  // id 0, named "_root_"
    PresetGroup(int id, const char* name) : id_(id), name_(name) {}

    int id() const { return id_; }
    const char* name() const { return name_.c_str(); }
    int size() const { return static_cast<int>(presets_.size()); }
    int preset(int i) const;  // 0 <= i < size() (assertion)
    bool holds(int index) const;

    // Adds the indexes of a vector of Int32; anything else in it is an assertion, and adds nothing.
    void update(const AnyVector& indexes);

  private:
    int id_ = 0;
    std::string name_ = "_root_";
    std::vector<int> presets_;
};

// All finders answer a group's place in the list, or -1; `from` is the first place that is looked at, -1 the
// start. A profile or name that the list of presets does not hold is an assertion.
class QV_API PresetGroupList {
  public:
    int size() const { return static_cast<int>(groups_.size()); }
    const PresetGroup& at(int i) const;  // 0 <= i < size() (assertion)
    const PresetGroup& operator[](int i) const { return at(i); }

    int findById(int id) const;
    int findByName(const char* name) const;
    int findByPresetIndex(int index, int from = -1) const;
    int findByPresetProfile(const QvPresetList& presets, int profile, int from = -1) const;
    int findByPresetName(const QvPresetList& presets, const char* name, int from = -1) const;

    // Adds to the group of that id, which is made at the end of the list if there is none. A new group's name
    // must not be taken (assertion).
    void addToGroup(int id, const char* name, const AnyVector& indexes);
    void clear() { groups_.clear(); }

  private:
    template <class Match>
    int find(int from, Match match) const;

    std::vector<PresetGroup> groups_;
};
