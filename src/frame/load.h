#pragma once
#include "frame/records.h"

namespace zor {

/// Writes the declarations of the constants from row `first` on: the name, " = " and the value, in decimal up
/// to 9 or with `decimalOnly`, else as eight hexadecimal digits. `withPrefix` puts a k before the name. The
/// texts are never freed, since the host may keep them. Ignores a null record.
void BuildConstantDeclarations(ClassRecord* record, std::int32_t first, std::int32_t withPrefix,
                               std::int32_t decimalOnly);

/// From host version 2010.029 on, rows that deal in host pictures are flagged as available like all others:
/// where a flags word has 0x40000 or 0x80000, 4 or 8 is added.
void RewriteVersionFlags(ClassRecord& record, double hostVersion);

}
