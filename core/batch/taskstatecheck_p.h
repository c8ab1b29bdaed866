// What a stored task must hold before it is restored, which asserts what no stored task can hold.
#pragma once

#include <string>

class Any;

// Empty for a sound task, else what is wrong at which place: "streams/2/type: it is no type of stream".
// Numbers count from 1. Modules are not looked for and files not opened: to restore the task says that.
std::string qvTaskStateFault(const Any& stored);
