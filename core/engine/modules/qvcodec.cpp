#include "core/engine/modules/qvcodec.h"

#include <cstring>
#include <new>

#include "core/arch/formattext_p.h"
#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/params.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/modules/qvservices_p.h"
#include "core/engine/qvutil.h"
#include "core/engine/status.h"

namespace {

constexpr std::size_t maxErrorText = 1023;

// Without a registry, late in the process, there is no configuration to turn exceptions off.
bool throwsParamException() {
    const QvRegistry* registry = qv_registry();
    return !registry || registry->throwParamException();
}

bool tracesParams() {
    const QvRegistry* registry = qv_registry();
    return registry && registry->getDbgOption("log_setparam").isTrue();
}

bool isParamRows(const char* name) { return name && std::strcmp(name, qvParamRowsName) == 0; }

}  // namespace

QvCodec::QvCodec(const QvModule* module) : module_(module) {
    if (module_) module_->codecCreated(this);
}

QvCodec::QvCodec(const QvCodec& other)
    : errorText_(other.errorText_),
      errorCode_(other.errorCode_),
      state_(other.state_),
      module_(other.module_) {}

QvCodec& QvCodec::operator=(const QvCodec& other) {
    if (this == &other) return *this;
    // An instance that goes over to another module leaves the list of its own, which would outlive it.
    if (listed_ && module_ != other.module_) module_->codecDeleted(this);
    errorText_ = other.errorText_;
    errorCode_ = other.errorCode_;
    state_ = other.state_;
    module_ = other.module_;
    return *this;
}

QvCodec::~QvCodec() {
    if (listed_) module_->codecDeleted(this);
}

int QvCodec::init() {
    if (state_ != stateCreated) return setError(QvStatus::failed, "Already initialized");
    state_ = stateInitialised;
    return QvStatus::ok;
}

int QvCodec::setParam(const char* name, const Any& value) {
    _traceParam(name, value);
    return _raiseInvalidParam(name);
}

void QvCodec::getParam(const char* name, Any& value) const {
    if (Any(name ? name : "") == "displayName") {
        value = displayName();
        qv_dbg()->warning("QvCodec::displayName should be used instead of getParam 'displayName'");
    } else if (value.isValid() && !isParamRows(name)) {
        qv_dbg()->warning("%s: module possibly not implementing getParam('%s') correctly?", this->name(),
                          name ? name : "");
    }
}

Any QvCodec::getParam(const char* name) const {
    Any value;
    getParam(name, value);
    return value;
}

int QvCodec::setParamDict(const AnyDict& params) {
    int result = QvStatus::ok;
    for (const auto& [key, value] : params) {
        try {
            result |= setParam(key, *value);
        } catch (const QvParamException&) {
            // A name unknown to this codec doesn't keep the others from it.
        }
    }
    return result;
}

int QvCodec::process() { return QvStatus::ok; }

const char* QvCodec::name() const { return module_ ? module_->name() : "unnamed"; }
const char* QvCodec::displayName() const { return module_ ? module_->displayName() : name(); }

Any QvCodec::getAttr(const char* key) const {
    QV_ASSERT(module_);
    return module_->getAttr(key);
}

void QvCodec::store(AnyDict& state) const {
    state.clear();
    state.set("name", name());
    const Any settings = getParam("settings");
    if (settings.isValid()) state.set("settings", settings);
}

int QvCodec::restore(const AnyDict& state) {
    if (state.get("name") != name()) return setError(QvStatus::failed, "restore - invalid name");
    if (!state.isSet("settings")) return QvStatus::ok;
    try {
        setParam("settings", state.get("settings"));
    } catch (const QvParamException&) {
        // A state may come from a version of the codec that had settings.
    }
    return QvStatus::ok;
}

const char* QvCodec::errorDesc() const { return errorText_.asString(""); }

int QvCodec::setError(int code) {
    errorCode_ = code;
    if (code == QvStatus::ok)
        errorText_ = "";
    else
        qv_dbg()->error("[%s] Error (%d)", displayName(), code);
    return code;
}

int QvCodec::storeError(int code, const char* format, va_list args) {
    errorCode_ = code;
    try {
        errorText_ = QvFormattedText<maxErrorText>(format, args).text();
    } catch (const std::bad_alloc&) {
        errorText_.invalidate();  // a failure is returned, never thrown
    }
    if (code != QvStatus::ok) qv_dbg()->error("[%s] %s (%d)", displayName(), errorDesc(), code);
    return code;
}

int QvCodec::setError(int code, const char* format, ...) {
    va_list args;
    va_start(args, format);
    storeError(code, format, args);
    va_end(args);
    return code;
}

int QvCodec::_setErr(int code, const char* format, ...) {
    va_list args;
    va_start(args, format);
    storeError(code, format, args);
    va_end(args);
    return code;
}

int QvCodec::_raiseInvalidParam(const char* name) const {
    const Any text = Any::sprintf("%s::setParam - invalid parameter \"%s\"", this->name(), name ? name : "");
    qv_dbg()->debug("Exception: %s", text.asString());
    if (!throwsParamException()) return QvStatus::invalidParam;
    throw QvParamException(text.asString());
}

void QvCodec::_traceParam(const char* name, const Any& value) const {
    if (state_ != stateCreated && qv_dbg()->hasTarget() && tracesParams())
        QvUtil::debugOutSetParam(this, name, value);
}

void* QvCodec::get_rc(const char* name) { return qvPlainService(name); }
void* QvCodec::get_rc_ex(void*, const char* name) { return qvContextService(name); }
