// Plain records of a codec library, read and written by field name.
//
//     struct Settings { int gop; unsigned char levels[4]; char preset[16]; };
//     constexpr ParamSpec rows[] = {
//         {"gop",    ParamSpec::typeInt,  offsetof(Settings, gop)},
//         {"levels", ParamSpec::typeByte, offsetof(Settings, levels), 4},
//         {"preset", ParamSpec::typeStr,  offsetof(Settings, preset), 1, sizeof(Settings::preset)},
//         {nullptr},
//     };
//     QvSettingsMapper(rows).setFieldByName(&settings, "gop", 12);
#pragma once

#include <map>
#include <string>

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

struct ParamSpec {
    enum Type : int {
        typeByte = 0,   // unsigned 8-bit integer
        typeShort = 1,  // signed 16-bit integer
        typeInt = 2,    // signed 32-bit integer
        typeDbl = 3,    // double
        typeLoad = 4,   // signed 64-bit integer
        typeStr = 5,    // characters up to and including a zero
    };

    const char* name = nullptr;  // null ends the array
    int type = typeInt;
    int offset = 0;  // of the field in the record, in bytes
    int count = 0;   // elements; 0 and 1: one field, 2 and more: a vector of them
    // Of typeStr: the bytes of one character array. 0: up to the field that follows in the record, so that
    // only the last field needs it.
    int capacity = 0;
};

// Results are 0, or -1 after a line in the debug log. Integers that a field can't hold lose their upper bits,
// doubles are truncated to integers; texts are never cut: what does not fit is refused.
class QV_API QvSettingsMapper {
  public:
    // Keeps copies of the rows, of equal names the first. The names must outlive the mapper.
    explicit QvSettingsMapper(const ParamSpec* rows);

    int setFieldByName(void* record, const char* name, const Any& value) const;
    Any getFieldByName(const void* record, const char* name) const;  // invalid on failure
    // A Vector for a vector field. A row of the constructor's array may be given unchanged.
    Any getField(const void* record, const ParamSpec& row) const;
    // Every key of the dictionary; -1 if one could not be set, the others are.
    int dictToStruct(const AnyDict& dict, void* record) const;
    void structToDict(const void* record, AnyDict& dict) const;  // every row; other keys of `dict` stay
    void getNames(AnyVector& names) const;                       // replaced, in alphabetical order

    static const char* typeName(int type);  // "byte", "short", "int", "dbl", "load", "str"; else "?"

  private:
    std::map<std::string, ParamSpec, std::less<>> rows_;

    int setVector(void* record, const ParamSpec& spec, const Any& value) const;
};
