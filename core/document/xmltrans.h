// Values and dictionaries as XML elements and back.
//
// The element's name is the type; numbers are decimal text that ignores the locale:
//
//     inv                empty: Invalid, and what has no form of its own
//     i32 i64 fl         data; a float has six decimal places
//     str wstr           data, in UTF-8
//     gen                data: bytes "1A ", runs "10x AB "; a borrowed pointer comes back as null
//     vec                one child an element
//     framerate          num denom df interlaced pulldown
//     pt rect            x y; top bottom left right
//     bitrate            type ("cbr", "vbr", "cqt", "cqt_strict" or a number) target min max mode
//     pair               first second
//     mediatime          ticks scale
//     dict, or its class: children in turn a `key` element and the value; "__version__" and "name" are
//                        attributes, "__class__" is the element's name; keys that begin with "#" are left out
//
// Reading never fails: what is missing or damaged gives an invalid value or a default. Integers beyond their
// range become the nearest limit.
#pragma once

#include "core/arch/api.h"
#include "core/document/xmldom.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

// Holds no data. A translator that derives from it is used for the elements inside elements, too.
class QV_API XmlTrans {
  public:
    virtual void XmlToAny(const XmlNode* from, Any& to);
    // Adds the entries of a dictionary's element to `to`.
    virtual void XmlToDict(const XmlNode* from, AnyDict& to);
    // These fill a new node, without name, attributes and data; DictToXml also one that has its name. There
    // "__class__" goes to the attribute "class" if it differs from that name or can't be one.
    virtual void AnyToXml(const Any& from, XmlNode* to);
    virtual void DictToXml(const AnyDict& from, XmlNode* to);

    // The steps for each type.
    void fromInvalid(const Any& from, XmlNode* to);
    void fromInt32(const Any& from, XmlNode* to);
    void fromInt64(const Any& from, XmlNode* to);
    void fromFloat(const Any& from, XmlNode* to);
    void fromString(const Any& from, XmlNode* to);
    void fromWString(const Any& from, XmlNode* to);
    void fromGeneric(const Any& from, XmlNode* to);
    void fromVector(const Any& from, XmlNode* to);
    void fromFramerate(const Any& from, XmlNode* to);
    void fromPoint(const Any& from, XmlNode* to);
    void fromRect(const Any& from, XmlNode* to);
    void fromBitrate(const Any& from, XmlNode* to);
    void fromPair(const Any& from, XmlNode* to);
    void fromMediaTime(const Any& from, XmlNode* to);

    void parseInt32(const XmlNode* from, Any& to);
    void parseInt64(const XmlNode* from, Any& to);
    void parseFloat(const XmlNode* from, Any& to);
    void parseString(const XmlNode* from, Any& to);
    void parseWString(const XmlNode* from, Any& to);
    // At most XmlParser::maxExpanded bytes; a text that describes more gives an invalid value.
    void parseGeneric(const XmlNode* from, Any& to);
    void parseVector(const XmlNode* from, Any& to);
    // A missing attribute is noted in the debug log and counts as its part of 25/1 progressive.
    void parseFramerate(const XmlNode* from, Any& to);
    void parsePoint(const XmlNode* from, Any& to);      // invalid unless all attributes are there
    void parseRect(const XmlNode* from, Any& to);       // likewise
    void parseBitrate(const XmlNode* from, Any& to);    // invalid without a type
    void parsePair(const XmlNode* from, Any& to);       // a missing attribute counts as 0
    void parseMediaTime(const XmlNode* from, Any& to);  // invalid unless the scale is at least 1
    // A dictionary under its class name; invalid if the element holds no dictionary.
    void parseObject(const XmlNode* from, Any& to);

  protected:
    // By the type, a value of Any::Type. False if it has no element: `to` is unchanged.
    bool parseTyped(int type, const XmlNode* from, Any& to);
};

// The compact form of dictionaries, a child an entry: <width type="i32">720</width>. Keys must be XML names;
// all of them are written. It also reads the form of XmlTrans. An element that is not named `dict` gives its
// name as "__class__", so a nested dictionary comes back with its key as its class; and the kind of a bit
// rate, which the type's name takes the place of, comes back as 0.
class QV_API XmlTransCustomDict : public XmlTrans {
  public:
    void XmlToDict(const XmlNode* from, AnyDict& to) override;
    void AnyToXml(const Any& from, XmlNode* to) override;
    void DictToXml(const AnyDict& from, XmlNode* to) override;

    // Reads a value by the name of its type; an unknown one leaves `to` as it is.
    void parseItem(const XmlNode* from, Any& to, const char* type);
};
