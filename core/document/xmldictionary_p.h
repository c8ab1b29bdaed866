// Dictionaries as whole documents.
#pragma once

#include "core/document/xmldom.h"

// Whether a document of so many bytes holds more dictionaries than XmlParser::maxObjects and bytesPerObject
// allow.
bool qvHoldsTooManyObjects(const XmlNode& root, long long bytes);
// As XmlParser::storeDict.
int qvStoreXmlDict(const Any& path, const AnyDict& dict, const char* className, const Any& version);
// Adds what a document holds to `dict`, with the root's name as "__class__".
void qvDictOfXml(XmlNode& root, AnyDict& dict);
