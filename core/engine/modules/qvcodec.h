// QvCodec: base of every processing object, from decoders and filters to multiplexers and sinks.
#pragma once

#include <cstdarg>
#include <optional>
#include <span>

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QvModule;
template <class T>
struct QvParamRow;

// A codec is set up by name and value, reports failures as a status with a text that stays in it, and can
// write its configuration to a dictionary and read it back. It belongs to the thread that drives it.
//
// Operations return QvStatus::ok or another status of "core/engine/status.h". Three kinds of failure are
// kept apart: an expected one is a status after setError; a parameter that the codec doesn't know is a
// QvParamException (or QvStatus::invalidParam if the configuration has "disable_exceptions"); a broken
// contract is a QvAssertFailure.
class QV_API QvCodec {
  public:
    // The core compares with these two only; a codec may use more values of its own.
    enum State : int { stateCreated = 1, stateInitialised = 2 };

    // State 1, no error. Joins the instances of `module` (borrowed, may be null).
    explicit QvCodec(const QvModule* module = nullptr);
    // Copies error, state and module; the copy isn't counted among the module's instances.
    QvCodec(const QvCodec& other);
    QvCodec& operator=(const QvCodec& other);
    // Leaves the instances of its module.
    virtual ~QvCodec();

    // State 1 becomes 2. In any other state -1 with the text "Already initialized".
    virtual int init();
    // An implementation traces and takes the names it knows and gives all others to its base, so that each
    // call is traced once. This one knows none: the invalid parameter failure.
    virtual int setParam(const char* name, const Any& value) = 0;
    // `value` comes in invalid; an implementation writes it if it knows the name and otherwise asks its base.
    // This one knows "displayName", which is deprecated, and warns if `value` has been written already.
    virtual void getParam(const char* name, Any& value) const;
    // setParam of each entry in key order. A name that the codec doesn't know stops nothing. The bitwise OR
    // of the results of the calls that returned.
    virtual int setParamDict(const AnyDict& params);
    virtual int open() = 0;
    virtual int close() = 0;
    virtual int process();
    // `this` as a pointer to the contract class of that number (QvModuleType), or null.
    virtual void* getInterface(int number) const = 0;
    virtual const char* name() const;  // the module's name, or "unnamed"
    // Replaces `state` with "name" and, if there is one, the parameter "settings".
    virtual void store(AnyDict& state) const;
    // Sets the parameter "settings" from what store wrote. -1 if the dictionary is of another module.
    virtual int restore(const AnyDict& state);

    Any getParam(const char* name) const;  // invalid if the codec doesn't know the name
    const char* errorDesc() const;         // "" if there is none; valid until the next error
    const char* getErrorDesc() const { return errorDesc(); }
    int errorCode() const { return errorCode_; }
    int getErrorCode() const { return errorCode_; }
    State getState() const { return state_; }
    const QvModule* module() const { return module_; }
    const char* displayName() const;
    Any getAttr(const char* key) const;  // of the module, which must exist

    // Services for plug-in code with a plain C interface: a function pointer by name ("malloc", "free",
    // "err_printf", "wrn_printf", "inf_printf", "prg_printf", "yield", "prompt_index_mode"), or null.
    static void* get_rc(const char* name);
    // The variants whose first argument is a context, which is ignored; here the printing functions are also
    // known with the ending "_ex", and "malloc", "free" and "yield" are not.
    static void* get_rc_ex(void* context, const char* name);

  protected:
    void setState(State state) { state_ = state; }
    // Stores the code. 0 clears the text; any other keeps it and logs the code. Both return `code`.
    int setError(int code);
    // Stores code and text (at most 1,023 characters) and logs both unless `code` is 0.
    int setError(int code, const char* format, ...) QV_PRINTF(3, 4);
    int _setErr(int code) { return setError(code); }
    int _setErr(int code, const char* format, ...) QV_PRINTF(3, 4);
    // The invalid parameter failure: throws QvParamException, or returns QvStatus::invalidParam.
    int _raiseInvalidParam(const char* name) const;
    // First act of the setParam that takes a name (_setRow does it too): logs name and value, unless the
    // codec is still in state 1 or the debug option "log_setparam" is off.
    void _traceParam(const char* name, const Any& value) const;
    // For parameters that are rows over typed fields ("core/engine/modules/params.h", which defines it):
    // traces the call and sets the row's field. nullopt: no row takes this name. A refused value leaves its
    // field alone and is an error with a text.
    template <class T>
    std::optional<int> _setRow(std::span<const QvParamRow<T>> rows, T& object, const char* name,
                               const Any& value);
    // Sets every stored row that `dict` holds. A refused value leaves its field alone; the result and the
    // error text are those of the first one.
    template <class T>
    int _restoreRows(std::span<const QvParamRow<T>> rows, T& object, const AnyDict& dict);

  private:
    friend class QvModule;

    int storeError(int code, const char* format, va_list args) QV_PRINTF(3, 0);

    Any errorText_ = "";
    int errorCode_ = 0;
    State state_ = stateCreated;
    const QvModule* module_ = nullptr;
    bool listed_ = false;  // among the instances of module_; a copy never is
};
