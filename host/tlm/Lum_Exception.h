#pragma once

#include "Port_Exception.h"

// Exceptions of the type-library suite. Constructor arguments, in order:
// subsystem code, source path, revision text, line, object name, message, flag.
class LUM_PLATFORM_API Lum_Exception : public Port::Exception {
public:
  using Port::Exception::Exception;
  ~Lum_Exception() override;
};

// Stored data is inconsistent or of an unsupported format.
class LUM_PLATFORM_API Lum_ExceptionCorruptDatabase : public Lum_Exception {
public:
  using Lum_Exception::Lum_Exception;
  ~Lum_ExceptionCorruptDatabase() override;
};

// A design cannot be loaded by this software.
class LUM_PLATFORM_API Lum_ExceptionDesignLoad : public Lum_Exception {
public:
  using Lum_Exception::Lum_Exception;
  ~Lum_ExceptionDesignLoad() override;
};

// A type library is missing or unusable.
class LUM_PLATFORM_API Lum_ExceptionInvalidLibrary : public Lum_Exception {
public:
  using Lum_Exception::Lum_Exception;
  ~Lum_ExceptionInvalidLibrary() override;
};

// A type block is missing or unusable.
class LUM_PLATFORM_API Lum_ExceptionInvalidTypeBlock : public Lum_Exception {
public:
  using Lum_Exception::Lum_Exception;
  ~Lum_ExceptionInvalidTypeBlock() override;
};
