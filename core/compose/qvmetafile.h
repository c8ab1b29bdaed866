// A metafile: a small XML document that describes an input made of other inputs. It is a list of named
// elements, each a value of its own. "AudioInterleave" (QvAudioMixDecSetup) and "MonoInterleave" (one file a
// channel, read only) are built in; others are known through a translator for their tag.
//
//     QvMetafile file("mix.mmf");
//     if (file.errorCode() == 0 && file.contains("AudioInterleave")) use(file.element("AudioInterleave"));
//
// Check files of any origin with check() first: a damaged element is an assertion in open().
#pragma once

#include <memory>
#include <string>

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QvCodec;
class XmlTrans;

class QV_API QvMetafile {
  public:
    QvMetafile();
    explicit QvMetafile(const Any& path);  // opens it; errorCode() is the result
    // Copies share their elements: what one adds, the others have too.
    QvMetafile(const QvMetafile&) = default;
    QvMetafile& operator=(const QvMetafile&) = default;
    ~QvMetafile();

    // Reads a file in place of what is there. File names in "AudioInterleave" become absolute, those of
    // "MonoInterleave" are unchanged. 0; -15 if the file can't be read or is no metafile; the XML reader's
    // code if it is not well formed. A damaged element is an assertion, see check().
    int open(const Any& path);
    // Why open() would fail or assert, with the line if it is known; "" if it would do neither.
    static std::string check(const Any& path);
    // 0. Throws QvFileException as XmlParser::storeXmlTree does.
    int save(const Any& path);
    // Writes the inputs of a decoder that is made of others ("isMeta", "metaData"). -1 if it is none. A null
    // decoder and an empty path are assertions.
    int saveDecoder(QvCodec* decoder, const Any& path);

    int nrElements() const;
    // Null, and an invalid value, for an index out of range. The references live until the elements change.
    const char* elementName(int index) const;
    const Any& element(int index) const;
    const Any& element(const char* name) const;  // the first of that name; invalid if there is none
    bool contains(const char* name) const;
    void addElement(const char* name, const Any& value);  // names may repeat

    int errorCode() const;
    const char* errorDesc() const;  // "" when there is none

    // Translators of further tags, for the whole process. They are not owned, and are registered before any
    // metafile is read: there is no lock.
    static void registerHandler(const char* tag, XmlTrans* handler);
    static void unregisterHandler(const char* tag);
    static XmlTrans* getHandler(const char* tag);  // null when there is none

  private:
    struct Private;
    std::shared_ptr<Private> p_;
};
