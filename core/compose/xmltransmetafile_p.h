// Elements of metafiles as values and back. File names in an "AudioInterleave" become absolute.
#pragma once

#include <string>

#include "core/document/xmltrans.h"

class XmlTransMetafile : public XmlTrans {
  public:
    // `basePath`: the folder of the metafile, for names in it. With `fault` nothing is logged or asserted:
    // the first damage that is an assertion otherwise becomes a text there, and reading continues.
    explicit XmlTransMetafile(const Any& basePath = Any(), std::string* fault = nullptr)
        : basePath_(basePath), fault_(fault) {}

    void XmlToAny(const XmlNode* from, Any& to) override;
    // The root gives the Vectors "names" and "elements".
    void XmlToDict(const XmlNode* from, AnyDict& to) override;
    void AnyToXml(const Any& from, XmlNode* to) override;

  private:
    Any basePath_;
    std::string* fault_;

    void readRoot(const XmlNode& root, AnyDict& to);
    void readMono(const XmlNode& node, AnyDict& to);
    void readAudio(const XmlNode& node, AnyDict& to);
    void readAudioChannel(const XmlNode& node, AnyDict& to);
    void readSource(const XmlNode& node, AnyVector& to);
    void readDecoders(const XmlNode& node, AnyDict& to);
    void readFilters(const XmlNode& node, AnyDict& to);
    void writeAudio(const AnyDict& from, XmlNode& to);

    Any resolved(const Any& name) const;
    void warn(const std::string& text) const;
    // An assertion, or the fault.
    void damaged(int line, const char* reason) const;
};
