// Filters that store the parameters that were changed.
#pragma once

#include "builtin/sound/soundfilter.h"
#include "core/engine/log/qvlog.h"

template <class Settings>
class StoredFilterOf : public SoundFilterOf<Settings> {
  public:
    // A value that a row with its own rules refuses is answered with the help of the row.
    int setParam(const char* name, const Any& value) override {
        const int result = SoundFilterOf<Settings>::setParam(name, value);
        const auto* row = qvFindParamRow<Settings>(this->rows_, name);
        if (result != QvStatus::invalidParam || !row || qvparam::kindOfRow(*row) != qvparam::Kind::special)
            return result;
        return this->setError(result, "'%s' takes %s", name, row->help);
    }
    // Of the rows marked qvParamStored those whose value is not that of a new filter.
    void store(AnyDict& dict) const override {
        SoundFilter::store(dict);
        const Settings initial;
        for (const auto& row : this->rows_) {
            if (!(row.flags & qvParamStored)) continue;
            Any value, before;
            qvGetParamRow<Settings>(this->rows_, this->settings_, row.name, value);
            qvGetParamRow<Settings>(this->rows_, initial, row.name, before);
            if (value != before) dict.set(row.name, value);
        }
    }
    // A restore that refuses one value changes none.
    int restore(const AnyDict& dict) override {
        Settings restored = this->settings_;
        int result = this->template _restoreRows<Settings>(this->rows_, restored, dict);
        if (result == QvStatus::ok) result = SoundFilter::restore(dict);
        if (result != QvStatus::ok) {
            qv_dbg()->error("Can not restore %s from state dict", this->name());
            return result;
        }
        this->settings_ = std::move(restored);
        return QvStatus::ok;
    }

  protected:
    using SoundFilterOf<Settings>::SoundFilterOf;
};
