#pragma once

// The real formats in the Python module: cell libraries made into type
// libraries, netlists imported into databases and views exported as netlists.

namespace pybind11 {
class module_;
} // namespace pybind11

namespace lumpy {

// Adds import_library, import_netlist and export_netlist to the module.
void BindFormats(pybind11::module_ &m);

} // namespace lumpy
