// Saving and opening design databases.

#include "Orb_Exception.h"
#include "Orb_Model.h"

void Orb_Model::Save(char const *path) const {
  throw Orb_Exception("host/Orb_ModelIO", __LINE__, path, "Save is not implemented yet.");
}

void Orb_Model::Open(char const *path) {
  throw Orb_Exception("host/Orb_ModelIO", __LINE__, path, "Open is not implemented yet.");
}
