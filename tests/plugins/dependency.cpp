// A library that needy_plugin needs.
const char* qvTestDependencyName() { return "needy from its own folder"; }
