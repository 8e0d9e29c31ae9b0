#pragma once

#include "runtime/core/types.h"

namespace zq {

/// The main kinds that type kinds are sorted into.
enum class TZqMainTypeKind : Byte {
  mtkUnknown,
  mtkInteger,
  mtkFloat,
  mtkString,
  mtkBoolean,
  mtkDateTime,
  mtkArray,
  mtkStructure,
  mtkOther
};
using enum TZqMainTypeKind;

/// The kinds of types: what variants, values, schema names and the value of a log message have in common.
enum class TZqTypeKind : Byte {
  rtkUnknown,
  rtkByte,
  rtkWord,
  rtkLongWord,
  rtkUInt64,
  rtkShortInt,
  rtkSmallInt,
  rtkLongInt,
  rtkInt64,
  rtkSingle,
  rtkDouble,
  rtkExtended,
  rtkChar,
  rtkAChar,
  rtkWChar,
  rtkString,
  rtkAString,
  rtkWString,
  rtkBoolean,
  rtkEnumeration,
  rtkSet,
  rtkDate,
  rtkTime,
  rtkDatetime,
  rtkVariant,
  rtkArray,
  rtkDynArray,
  rtkRecord,
  rtkObject,
  rtkInterface,
  rtkPointer,
  rtkMethod,
  rtkProcedure,
  rtkException,
  rtkClass,
  rtkClassRef
};
using enum TZqTypeKind;

}  // namespace zq
