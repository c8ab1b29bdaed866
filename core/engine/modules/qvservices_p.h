// What the engine offers to plug-in code with a plain C interface: a function by its name, or null.
#pragma once

// QvCodec::get_rc and get_rc_ex.
void* qvPlainService(const char* name);
void* qvContextService(const char* name);
