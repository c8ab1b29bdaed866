// The store of user presets: a list that is read from and written to one XML file. It also reads the older
// form, whose presets it converts to the profiles and modules of today, and keeps track of changes.
//
//     QvUserPresets mine;
//     if (mine.load("presets.xml", QvUserPresets::clearFirst) == 0) mine.apply("Web", &pipe);
#pragma once

#include <string>

#include "core/arch/api.h"
#include "core/preset/qvpreset.h"

class QvEncodePipe;

class QV_API QvUserPresets : public QvPresetList {
  public:
    // How load() treats what the list holds. The bits may be joined; 0 clears it.
    enum LoadMode {
        clearFirst = 0,
        overwrite = 1,  // a loaded preset replaces one of its name; without it, it gets a name "NAME (1)"
        keep = 2,       // the list stays and is added to
    };
    // What checkPresets() does. The bits may be joined.
    enum Check {
        describeInvalid = 1,  // makes the "info" of invalid presets too
        removeInvalid = 2,
        substituteModules = 8  // replaces missing modules by others that do the same
    };

    QvUserPresets() = default;

    int count() const { return size(); }
    // An index out of range is an assertion.
    QvPreset at(int index) const;
    QvPreset operator[](int index) const { return at(index); }
    const QvPresetList& list() const { return *this; }

    int indexOf(const char* name) const { return indexOfName(name); }  // -1 when absent
    bool contains(const char* name) const { return indexOf(name) >= 0; }
    QvPreset get(const char* name) const;  // an unknown name is an assertion
    AnyVector getNames() const;
    void profileNames(AnyVector& names) const { names = getNames(); }
    void profile(const char* name, AnyDict& preset) const;  // emptied if the name is unknown

    // Stores a copy under a name, in place of the preset that has it. QvPreset::setName says which names are
    // allowed.
    void set(const char* name, const QvPreset& preset);
    int append(const QvPreset& preset);                      // its index, or -1 if the name is taken
    int create(const char* name, const QvEncodePipe* pipe);  // from the pipe's settings: 0, or -1 as above
    // Applies a preset to a pipe, whose result is returned; -1 if the name is unknown. `keep` is that of
    // QvEncodePipe::applyPreset; the last two are not used.
    int apply(const char* name, QvEncodePipe* pipe, int keep = 0, int = 0, int = 0) const;
    int rename(int index, const char* name);
    // 0 also for equal names; -1 if `from` is unknown or `to` in use.
    int rename(const char* from, const char* to);
    void remove(const char* name);
    void remove(int index);
    void clear();

    // Reads a file of either form: 0; -1 if it is no file of presets, or if an element of the older form
    // could not be read; the XML reader's code if it can't be read. `version` receives 1 or 2 for the form. A
    // damaged element of the current form is an assertion, and so is one of the older form without "params";
    // the list is unchanged then. Check files of other origin with check() first.
    int load(const Any& file, int mode, int* version = nullptr);
    // Whether load() can read the file without an assertion: "", or a text that says what is wrong. Names
    // that set() does not allow are not checked.
    static std::string check(const Any& file);
    // Writes the current form: 0, or the XML writer's code. Throws as XmlParser::storeDict.
    int save(const Any& file);

    // Validates each preset and makes the "info" of the valid ones; returns how many those are.
    int checkPresets(int flags);

    bool modified() const { return modified_; }
    void setModified(bool on) { modified_ = on; }

    bool operator==(const QvUserPresets& other) const;
    bool operator!=(const QvUserPresets& other) const { return !(*this == other); }

  private:
    bool modified_ = false;
};
