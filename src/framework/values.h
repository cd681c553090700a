#ifndef ZRM_FRAMEWORK_VALUES_H
#define ZRM_FRAMEWORK_VALUES_H

/// Copies a filter value of `length` bytes without its blank padding and terminates it; the
/// destination holds at least `length` + 1 bytes.
void AGF_CopyUnpad(char* destination, const char* source, int length);

/// Releases the pin that ctreq::UseHandle took. Any thread.
void RSC1_Drop(unsigned handle);

#endif
