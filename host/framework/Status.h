#ifndef ZRM_HOST_STATUS_H
#define ZRM_HOST_STATUS_H

namespace zrm::host {

/// The host's own status codes, beside those that the tables return. 0 is success everywhere.
enum Status : unsigned {
    STATUS_OK = 0,
    STATUS_END = 0x21070001,              ///< no further element
    STATUS_NO_MEMORY = 0x21070002,        ///< nothing was stored
    STATUS_INVALID_ARGUMENT = 0x21070003, ///< the call asks for what does not exist
    STATUS_NOT_SUPPORTED = 0x21070004,    ///< the operation has no meaning here
    STATUS_TRUNCATED = 0x21070005,        ///< the result did not fit and was cut
    STATUS_NO_CONVERSION = 0x21070006,    ///< no way from the one code page to the other
    STATUS_DUPLICATE = 0x21070007,        ///< the name is taken
};

} // namespace zrm::host

#endif
