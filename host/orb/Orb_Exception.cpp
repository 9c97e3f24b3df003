#include "Orb_Exception.h"

Orb_Exception::Orb_Exception(char const *file, int line, char const *objectName,
                             char const *message)
    : Port::Exception("Orb", file, "", line, objectName, message, false) {}

Orb_Exception::~Orb_Exception() = default;
