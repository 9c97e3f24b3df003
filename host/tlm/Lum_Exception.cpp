#include "Lum_Exception.h"

// Out of line, so that each class has one home for its vtable and type
// information: a throw in one library is caught by its class in another.
Lum_Exception::~Lum_Exception() = default;
Lum_ExceptionCorruptDatabase::~Lum_ExceptionCorruptDatabase() = default;
Lum_ExceptionDesignLoad::~Lum_ExceptionDesignLoad() = default;
Lum_ExceptionInvalidLibrary::~Lum_ExceptionInvalidLibrary() = default;
Lum_ExceptionInvalidTypeBlock::~Lum_ExceptionInvalidTypeBlock() = default;
