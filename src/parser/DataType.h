#ifndef ZRM_DATA_TYPE_H
#define ZRM_DATA_TYPE_H

#include <cstddef>

namespace zrm {

/// Type of a scanned field: base of its size modifier plus number of its conversion code.
enum _DataType : int {
    DATATYPE_BAD = -1, ///< the size modifier could not be read
    // The bases, which extractVariableSize also returns.
    DATATYPE_BASE_NONE = 0,
    DATATYPE_BASE_SHORT = 20,    ///< h
    DATATYPE_BASE_LONG = 30,     ///< l
    DATATYPE_BASE_BIGLONG = 40,  ///< L
    DATATYPE_BASE_LONGLONG = 50, ///< ll

    DATATYPE_INT = 1,
    DATATYPE_UINTo = 2,
    DATATYPE_UINTu = 3,
    DATATYPE_UINTx = 4,
    DATATYPE_FLOATe = 5,
    DATATYPE_FLOATf = 6,
    DATATYPE_FLOATg = 7,
    DATATYPE_STRING = 8,
    DATATYPE_CHAR = 9,
    DATATYPE_SHORT = 21,
    DATATYPE_SHORTo = 22,
    DATATYPE_SHORTu = 23,
    DATATYPE_SHORTx = 24,
    DATATYPE_LONG = 31,
    DATATYPE_LONGo = 32,
    DATATYPE_LONGu = 33,
    DATATYPE_LONGx = 34,
    DATATYPE_DOUBLEe = 35,
    DATATYPE_DOUBLEf = 36,
    DATATYPE_DOUBLEg = 37,
    DATATYPE_BIGLONG = 41,
    DATATYPE_BIGLONGo = 42,
    DATATYPE_BIGLONGu = 43,
    DATATYPE_BIGLONGx = 44,
    DATATYPE_LONGDOUBLEe = 45,
    DATATYPE_LONGDOUBLEf = 46,
    DATATYPE_LONGDOUBLEg = 47,
    DATATYPE_LONGLONG = 51,
    DATATYPE_LONGLONGo = 52,
    DATATYPE_LONGLONGu = 53,
    DATATYPE_LONGLONGx = 54,
};

// The default print directives. Messages also use them as names of the types.
inline constexpr char DEFAULT_INT[] = "%d";
inline constexpr char DEFAULT_UINTo[] = "%o";
inline constexpr char DEFAULT_UINTu[] = "%u";
inline constexpr char DEFAULT_UINTx[] = "%x";
inline constexpr char DEFAULT_FLOATe[] = "%e";
inline constexpr char DEFAULT_FLOATf[] = "%f";
inline constexpr char DEFAULT_FLOATg[] = "%g";
inline constexpr char DEFAULT_STRING[] = "%s";
inline constexpr char DEFAULT_CHAR[] = "%c";
inline constexpr char DEFAULT_SHORT[] = "%hd";
inline constexpr char DEFAULT_SHORTo[] = "%ho";
inline constexpr char DEFAULT_SHORTu[] = "%hu";
inline constexpr char DEFAULT_SHORTx[] = "%hx";
inline constexpr char DEFAULT_LONG[] = "%ld";
inline constexpr char DEFAULT_LONGo[] = "%lo";
inline constexpr char DEFAULT_LONGu[] = "%lu";
inline constexpr char DEFAULT_LONGx[] = "%lx";
inline constexpr char DEFAULT_DOUBLEe[] = "%le";
inline constexpr char DEFAULT_DOUBLEf[] = "%lf";
inline constexpr char DEFAULT_DOUBLEg[] = "%lg";
inline constexpr char DEFAULT_BIGLONG[] = "%Ld";
inline constexpr char DEFAULT_BIGLONGo[] = "%Lo";
inline constexpr char DEFAULT_BIGLONGu[] = "%Lu";
inline constexpr char DEFAULT_BIGLONGx[] = "%Lx";
inline constexpr char DEFAULT_LONGDOUBLEe[] = "%Le";
inline constexpr char DEFAULT_LONGDOUBLEf[] = "%Lf";
inline constexpr char DEFAULT_LONGDOUBLEg[] = "%Lg";
inline constexpr char DEFAULT_LONGLONG[] = "%lld";
inline constexpr char DEFAULT_LONGLONGo[] = "%llo";
inline constexpr char DEFAULT_LONGLONGu[] = "%llu";
inline constexpr char DEFAULT_LONGLONGx[] = "%llx";

/// The variable that receives a scanned field.
enum class Receiver { INTEGER2, INTEGER4, INTEGER8, FLOAT, DOUBLE, LONG_DOUBLE, TEXT, CHARACTER };

/// The properties of one data type in the format language.
struct DataTypeInfo {
    _DataType type;
    const char* defaultDirective;
    Receiver receiver;
    _DataType group;     ///< first of the types that can be printed for one another
    bool signOptions;    ///< a print directive may ask for '+' or a blank before the number
    bool groupingOption; ///< a print directive may ask for thousands grouping
};

/// The type's row in the table, or null if the number is not a data type.
const DataTypeInfo* findDataType(_DataType type) noexcept;

/// The size of the receiving variable in bytes; 1 for a text, whose width determines its size.
std::size_t receiverSize(Receiver receiver) noexcept;

} // namespace zrm

#endif
