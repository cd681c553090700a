#ifndef ZRM_FRAMEWORK_FILTERS_H
#define ZRM_FRAMEWORK_FILTERS_H

#include <cstdint>

/// Comparison operators of filter conditions. Codes outside this list belong to the framework and
/// are passed through.
enum _IntfOper : std::int16_t {
    INTF_EQUAL = 1,
    INTF_NOT_EQUAL = 2,
    INTF_GREATER_OR_EQUAL = 3,
    INTF_LESS_OR_EQUAL = 4,
    INTF_LESS = 5,
    INTF_GREATER = 6,
};

/// Data type of an integer filter value.
inline constexpr std::int16_t SEL1_INTEGER = 496;

/// One condition of a request's filter as published by the framework. Owned by the request and
/// valid as long as the request lives.
struct SEL1_FILTERINFO {
    const char* columnName; ///< upper-case text, terminated
    _IntfOper compareOperator;
    std::int16_t dataType;    ///< SEL1_INTEGER for integers
    std::int16_t valueLength; ///< bytes
    const char* value;        ///< not terminated; may be unaligned
};

/// Type codes of columns.
enum ColumnType : std::int16_t {
    COLUMN_INTEGER = 3, ///< 4 bytes, host order
    COLUMN_CHARACTER = 9,
    COLUMN_UTF8 = 12,
};

/// Description of one column, filled by GetColumnInfo.
struct ColumnInfo {
    const char* name;    ///< internal (lower-case) name; static
    std::int16_t offset; ///< bytes from the row's start
    std::int16_t length; ///< bytes
    std::int16_t type;   ///< a ColumnType
};

#endif
