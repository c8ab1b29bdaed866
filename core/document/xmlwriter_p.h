// Trees as documents.
#pragma once

#include <cstdio>

#include "core/document/xmldom.h"

// As XmlNode::write. The node has a name.
int qvWriteXml(const XmlNode& root, std::FILE* stream, int indent);
// As XmlParser::storeXmlTree.
void qvStoreXml(const Any& path, const XmlNode& root, const char* doctype);
