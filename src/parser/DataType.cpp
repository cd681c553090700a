#include "parser/DataType.h"

#include <algorithm>
#include <cstdint>
#include <iterator>

namespace zrm {

namespace {

using enum Receiver;

constexpr DataTypeInfo dataTypes[] = {
    {DATATYPE_INT, DEFAULT_INT, INTEGER4, DATATYPE_INT, true, true},
    {DATATYPE_UINTo, DEFAULT_UINTo, INTEGER4, DATATYPE_INT, false, false},
    {DATATYPE_UINTu, DEFAULT_UINTu, INTEGER4, DATATYPE_INT, false, true},
    {DATATYPE_UINTx, DEFAULT_UINTx, INTEGER4, DATATYPE_INT, false, false},
    {DATATYPE_FLOATe, DEFAULT_FLOATe, FLOAT, DATATYPE_FLOATe, true, false},
    {DATATYPE_FLOATf, DEFAULT_FLOATf, FLOAT, DATATYPE_FLOATe, true, true},
    {DATATYPE_FLOATg, DEFAULT_FLOATg, FLOAT, DATATYPE_FLOATe, true, true},
    {DATATYPE_STRING, DEFAULT_STRING, TEXT, DATATYPE_STRING, false, false},
    {DATATYPE_CHAR, DEFAULT_CHAR, CHARACTER, DATATYPE_CHAR, false, false},
    {DATATYPE_SHORT, DEFAULT_SHORT, INTEGER2, DATATYPE_SHORT, true, true},
    {DATATYPE_SHORTo, DEFAULT_SHORTo, INTEGER2, DATATYPE_SHORT, false, false},
    {DATATYPE_SHORTu, DEFAULT_SHORTu, INTEGER2, DATATYPE_SHORT, false, true},
    {DATATYPE_SHORTx, DEFAULT_SHORTx, INTEGER2, DATATYPE_SHORT, false, false},
    {DATATYPE_LONG, DEFAULT_LONG, INTEGER8, DATATYPE_LONG, true, true},
    {DATATYPE_LONGo, DEFAULT_LONGo, INTEGER8, DATATYPE_LONG, false, false},
    {DATATYPE_LONGu, DEFAULT_LONGu, INTEGER8, DATATYPE_LONG, false, true},
    {DATATYPE_LONGx, DEFAULT_LONGx, INTEGER8, DATATYPE_LONG, false, false},
    {DATATYPE_DOUBLEe, DEFAULT_DOUBLEe, DOUBLE, DATATYPE_DOUBLEe, true, false},
    {DATATYPE_DOUBLEf, DEFAULT_DOUBLEf, DOUBLE, DATATYPE_DOUBLEe, true, true},
    {DATATYPE_DOUBLEg, DEFAULT_DOUBLEg, DOUBLE, DATATYPE_DOUBLEe, true, true},
    {DATATYPE_BIGLONG, DEFAULT_BIGLONG, INTEGER8, DATATYPE_BIGLONG, true, true},
    {DATATYPE_BIGLONGo, DEFAULT_BIGLONGo, INTEGER8, DATATYPE_BIGLONG, false, false},
    {DATATYPE_BIGLONGu, DEFAULT_BIGLONGu, INTEGER8, DATATYPE_BIGLONG, false, true},
    {DATATYPE_BIGLONGx, DEFAULT_BIGLONGx, INTEGER8, DATATYPE_BIGLONG, false, false},
    {DATATYPE_LONGDOUBLEe, DEFAULT_LONGDOUBLEe, LONG_DOUBLE, DATATYPE_LONGDOUBLEe, true, false},
    {DATATYPE_LONGDOUBLEf, DEFAULT_LONGDOUBLEf, LONG_DOUBLE, DATATYPE_LONGDOUBLEe, true, true},
    {DATATYPE_LONGDOUBLEg, DEFAULT_LONGDOUBLEg, LONG_DOUBLE, DATATYPE_LONGDOUBLEe, true, true},
    {DATATYPE_LONGLONG, DEFAULT_LONGLONG, INTEGER8, DATATYPE_LONGLONG, true, true},
    {DATATYPE_LONGLONGo, DEFAULT_LONGLONGo, INTEGER8, DATATYPE_LONGLONG, false, false},
    {DATATYPE_LONGLONGu, DEFAULT_LONGLONGu, INTEGER8, DATATYPE_LONGLONG, false, true},
    {DATATYPE_LONGLONGx, DEFAULT_LONGLONGx, INTEGER8, DATATYPE_LONGLONG, false, false},
};

} // namespace

const DataTypeInfo* findDataType(_DataType type) noexcept {
    const auto* found =
        std::find_if(std::begin(dataTypes), std::end(dataTypes),
                     [type](const DataTypeInfo& info) { return info.type == type; });
    return found != std::end(dataTypes) ? found : nullptr;
}

std::size_t receiverSize(Receiver receiver) noexcept {
    constexpr std::size_t sizes[] = {
        sizeof(std::int16_t), sizeof(std::int32_t), sizeof(std::int64_t), sizeof(float),
        sizeof(double),       sizeof(long double),  sizeof(char),         sizeof(char)};
    return sizes[static_cast<std::size_t>(receiver)];
}

} // namespace zrm
