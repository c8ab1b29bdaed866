// Checks a stored task before it is restored: to the restoring code damage is a programming error, which
// asserts.
#pragma once

#include <string>

class Any;

// Empty for a valid task, otherwise what is wrong and where: "streams/2/type: it is no type of stream".
// Numbers count from 1. Missing modules and files are not looked for here: restoring the task reports them.
std::string qvTaskStateFault(const Any& stored);
