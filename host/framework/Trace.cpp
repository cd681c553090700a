// The host implementation of trace.h.
