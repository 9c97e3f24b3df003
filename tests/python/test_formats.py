"""lumtdm's real formats: cell libraries made into type libraries, a netlist
imported into a database, opened, counted and exported back, and bad files."""

import json
import os
import threading

import pytest

import lumtdm

REPO = os.path.dirname(os.path.dirname(os.path.dirname(os.path.abspath(__file__))))
CELLS = os.path.join(REPO, "examples", "data", "sg13g2_stdcell_typ_1p20V_25C.filtered.lib")
REAL = os.environ.get("LUM_REAL_DIR") or os.path.join(os.path.dirname(REPO), "shared", "real")
TINY = os.path.join(REAL, "lib", "tiny_example.lib")
LIB = "sg13g2_stdcell_typ_1p20V_25C"

# Two instances of a module of two cells, and a cell in the top.
NETLIST = """\
module half (a, b, y);
  input a, b;
  output y;
  wire n;
  sg13g2_nand2_1 g1 (.A(a), .B(b), .Y(n));
  sg13g2_inv_1 g2 (.A(n), .Y(y));
endmodule

module top (x, z, o1, o2, o3);
  input x, z;
  output o1, o2, o3;
  half h1 (.a(x), .b(z), .y(o1));
  half h2 (.a(o1), .b(z), .y(o2));
  sg13g2_inv_1 i0 (.A(x), .Y(o3));
endmodule
"""


def need(path):
    if not os.path.exists(path):
        pytest.skip("%s is not there" % path)
    return path


def write(folder, name, text):
    path = folder / name
    path.write_text(text)
    return str(path)


def test_cell_libraries_become_type_libraries(tmp_path):
    summary = lumtdm.import_library(need(CELLS), output_dir=str(tmp_path), personality="ihp",
                                    part="sg13g2")
    assert summary["name"] == LIB and summary["cells"] == 78
    assert summary["path"] == str(tmp_path / (LIB + ".tlm")) and os.path.exists(summary["path"])
    with lumtdm.create(lib_path=[str(tmp_path)]):
        library = lumtdm.load_library(LIB, "ihp", "sg13g2")
        nand = library["sg13g2_nand2_1"]
        assert [(p.name, p.direction) for p in nand.pins] == [
            ("Y", lumtdm.Direction.OUTPUT), ("A", lumtdm.Direction.INPUT),
            ("B", lumtdm.Direction.INPUT)]


def test_buses_supply_pins_and_a_name_of_our_own(tmp_path):
    tiny = lumtdm.import_library(need(TINY), output_dir=str(tmp_path), name="mine")
    assert {k: tiny[k] for k in ("name", "cells", "inputs", "outputs", "buses", "supply_pins")} \
        == {"name": "mine", "cells": 3, "inputs": 12, "outputs": 7, "buses": 2, "supply_pins": 2}
    assert os.path.exists(tmp_path / "mine.tlm")


def test_import_open_count_export_round_trip(tmp_path):
    netlist = write(tmp_path, "top.v", NETLIST)
    database = str(tmp_path / "top.odb")
    summary = lumtdm.import_netlist(netlist, database, libraries=[need(CELLS)], top="top")
    assert summary["top"] == "top" and summary["modules"] == 2
    assert summary["module_instances"] == 2 and summary["untyped"] == 0
    assert summary["instances_by_library"] == {LIB: 3}
    assert summary["libraries"] == [str(tmp_path / (LIB + ".tlm"))]

    with lumtdm.open(database, lib_path=[str(tmp_path)]) as db:
        view = db.lookup("top/top/netlist")
        counts = view.count_by_type()
        # Each cell and module instance by its type; the top block untyped.
        assert counts == {LIB + ":sg13g2_nand2_1": 2, LIB + ":sg13g2_inv_1": 3,
                          "Lum_LocalLibrary:half": 2, None: 1}
        verilog = lumtdm.export_netlist(view, format="verilog")
        assert "module half" in verilog and "sg13g2_nand2_1 g1" in verilog
        # From the database (its only view), to a file whose extension says JSON.
        exported = str(tmp_path / "again.json")
        assert lumtdm.export_netlist(db, exported) is None
        assert sorted(json.load(open(exported))["modules"]) == ["half", "top"]
        # While the database holds its library, the Liberty file cannot be
        # registered again under that name (its .tlm serves, as below).
        with pytest.raises(lumtdm.InvalidLibraryError, match="loaded already"):
            lumtdm.import_netlist(netlist, str(tmp_path / "twice.odb"), libraries=[CELLS])

    # The exported netlist imports to the same counts, from the kept .tlm.
    again = str(tmp_path / "again.odb")
    lumtdm.import_netlist(exported, again, libraries=[summary["libraries"][0]])
    with lumtdm.open(again, lib_path=[str(tmp_path)]) as db:
        assert db.lookup("top/top/netlist").count_by_type() == counts


def test_export_options(tmp_path):
    netlist = write(tmp_path, "top.v", NETLIST)
    database = str(tmp_path / "top.odb")
    lumtdm.import_netlist(netlist, database, libraries=[need(CELLS)])
    with lumtdm.open(database, lib_path=[str(tmp_path)]) as db:
        assert json.loads(lumtdm.export_netlist(db, view="netlist"))["modules"]
        for bad in (dict(format="edif"), dict(view="layout")):
            with pytest.raises(ValueError):
                lumtdm.export_netlist(db, **bad)
        with pytest.raises(TypeError):
            lumtdm.export_netlist("top.odb")
    with pytest.raises(lumtdm.StaleObjectError):
        lumtdm.export_netlist(db)


def test_imports_and_exports_from_several_threads(tmp_path):
    netlist = write(tmp_path, "top.v", NETLIST)
    tlm = lumtdm.import_library(need(CELLS), output_dir=str(tmp_path))["path"]
    lumtdm.import_netlist(netlist, str(tmp_path / "top.odb"), libraries=[tlm])
    with lumtdm.open(str(tmp_path / "top.odb"), lib_path=[str(tmp_path)]) as db:
        view = db.lookup("top/top/netlist")
        texts = []
        threads = [threading.Thread(target=lambda: texts.append(lumtdm.export_netlist(view)))
                   for _ in range(3)]
        threads.append(threading.Thread(target=lambda: lumtdm.import_netlist(
            netlist, str(tmp_path / "other.odb"), libraries=[tlm])))
        for t in threads:
            t.start()
        for t in threads:
            t.join()
        assert len(texts) == 3 and len(set(texts)) == 1
    assert os.path.exists(tmp_path / "other.odb")


def test_bad_files_raise_invalid_format_error_with_file_and_position(tmp_path):
    cells = write(tmp_path, "bad.lib", "library (bad) {\n  cell (X) {\n    pin (A) { direction ; }\n")
    with pytest.raises(lumtdm.InvalidFormatError) as error:
        lumtdm.import_library(cells, output_dir=str(tmp_path))
    assert error.value.object_name == cells and "line 3" in error.value.message
    assert os.listdir(tmp_path) == ["bad.lib"]

    netlist = write(tmp_path, "bad.v", "module top (a);\n  input a;\n  wire w\n")
    with pytest.raises(lumtdm.InvalidFormatError) as error:
        lumtdm.import_netlist(netlist, str(tmp_path / "bad.odb"))
    assert error.value.object_name == netlist and "line " in error.value.message

    # An unknown cell is an error unless blackboxed; nothing is written on error.
    unknown = write(tmp_path, "unknown.v", NETLIST.replace("sg13g2_inv_1 i0", "mystery i0"))
    database = str(tmp_path / "unknown.odb")
    with pytest.raises(lumtdm.InvalidFormatError, match="mystery"):
        lumtdm.import_netlist(unknown, database, libraries=[need(CELLS)])
    assert not os.path.exists(database)
    summary = lumtdm.import_netlist(unknown, database, libraries=[need(CELLS)],
                                    blackbox_unknown=True)
    assert summary["untyped"] == 1 and summary["instances_by_library"] == {LIB: 2}
