// What the engine calls itself in logs and attributes.
#pragma once

constexpr char qvEngineVersion[] = "2.5.10.7839";
constexpr char qvEngineDate[] = "2011-10-12";
