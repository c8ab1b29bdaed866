// Values of the engine as text.
#pragma once

#include <string>

#include <qvplugcore/qvplugcore.h>

// Numbers, texts in quotes, rates as parseRate reads them, "X,Y", "WxH+X+Y"; "" for what has no short form.
std::string valueText(const Any& value);
