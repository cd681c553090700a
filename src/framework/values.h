#ifndef ZRM_FRAMEWORK_VALUES_H
#define ZRM_FRAMEWORK_VALUES_H

/// Copies a filter value of `length` bytes, removes its blank padding, and terminates it. The
/// destination must have room for `length` + 1 bytes.
void AGF_CopyUnpad(char* destination, const char* source, int length);

/// Releases the pin taken by ctreq::UseHandle. Any thread.
void RSC1_Drop(unsigned handle);

#endif
