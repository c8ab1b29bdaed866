// QvModule: the factory of one kind of codec, with the attributes of that kind and the codecs alive.
#pragma once

#include <mutex>

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"
#include "core/value/ptrlist.h"

class QvCodec;
class QvPlugin;

// Values of the attribute "type", which are also the numbers of QvCodec::getInterface.
namespace QvModuleType {
constexpr int decoder = 2;
constexpr int encodePipe = 3;
constexpr int sink = 5;
constexpr int audioEncoder = 6;
constexpr int videoEncoder = 7;
constexpr int muxer = 10;
constexpr int videoFilter = 12;
constexpr int audioFilter = 13;
constexpr int videoPipe = 14;  // its codecs answer getInterface(12)
constexpr int audioPipe = 16;  // its codecs answer getInterface(13)
}  // namespace QvModuleType

// A plug-in derives its modules from this class and implements create. Texts that the operations return live
// as long as the module, displayName() until that attribute changes.
//
// Attributes that the registry reads: "type" (Int32), "displayName" (String), "disabled" (Int32, not 0: the
// module is passed over), and of decoders "exts" (Vector of Strings without dot; "*" takes any file),
// "priority" (Int32, the smallest is tried first, 99 if absent) and "skipAuto" (true: never chosen by
// extension).
//
// The list of instances has its own lock, so codecs of one module can be made and destroyed on several
// threads; attributes have none and are set before processing starts.
class QV_API QvModule {
  public:
    QvModule() = default;  // no attributes, name "<unnamed>", description ""
    // Logs how many codecs are still alive; these live on as codecs without a module.
    virtual ~QvModule();
    // Makes a codec, which the caller owns, or null. QvRegistry::newCodec calls this and then its init().
    virtual QvCodec* create() = 0;
    virtual const char* desc() const;
    virtual const char* name() const;
    virtual const char* displayName() const;     // the attribute if it is a String, else name()
    virtual Any getAttr(const char* key) const;  // invalid if there is none
    virtual void setAttr(const char* key, const Any& value);
    virtual void getAttrs(AnyDict& attributes) const;
    virtual void setAttrs(const AnyDict& attributes);  // setAttr of each entry in key order; keeps others

    // Enters and removes an instance; a codec's constructor and destructor call them. They assert if the
    // codec is of another module, or already listed, or not listed.
    void codecCreated(QvCodec* codec) const;
    void codecDeleted(QvCodec* codec) const;
    TPtrList<QvCodec> codecList() const;          // the codecs alive at this moment
    QvPlugin* plugin() const { return plugin_; }  // the plug-in it was added to, or null

    QvModule(const QvModule&) = delete;
    QvModule& operator=(const QvModule&) = delete;

  protected:
    // Sets the attributes "type" and, unless it is null, "displayName".
    QvModule(int type, const char* name, const char* desc, const char* displayName);
    // Links a codec that was made without a module, as the last act of create, and returns it.
    QvCodec* _setAttrs(QvCodec* codec) const;

  private:
    friend class QvPlugin;

    void enlist(QvCodec* codec) const;

    AnyDict attributes_;
    Any name_ = "<unnamed>";
    Any description_ = "";
    QvPlugin* plugin_ = nullptr;
    mutable TPtrList<QvCodec> instances_;
    mutable std::mutex instancesLock_;
};
