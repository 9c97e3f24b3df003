"""lumtdm on the tdm demo database: reading, every edit through a save and a
reopen, the error classes and stale handles."""

import gc
import os
import shutil
import subprocess
import sys
import threading

import pytest

import lumtdm
from conftest import reopen

VIEW = "demo/chip/netlist"


def tree(view):
    """Every block as 'path type' with its pins' bindings, one string per block."""
    return ["%s %s %s" % (b.full_path[len(VIEW) + 1:], b.type_name, b.pin_map)
            for b in view.blocks()]


def test_demo_types_pins_and_networks(demo_db):
    view = demo_db.lookup(VIEW)
    assert view.count_by_type() == {"GATES:NAND2": 2, "GATES:INV": 2, "GATES:DFF": 1,
                                    "GATES:IOPAD": 1, "CORES:ALU": 1, None: 4}
    top = view.top_block
    assert [c.name for c in top.children] == ["u1", "spare", "reg", "core", "core_copy", "io"]
    reg = top.children["reg"]
    assert reg.type_block.tag == "GATES:DFF" and reg.is_typed
    assert reg.pin_map == {"DATA": "D", "CLOCK": "CK", "OUT": "Q"}
    assert [p.name for p in reg.type_block.pins] == ["D", "CK", "Q"]
    pad = top.children["io"].pins["PAD"]
    assert pad.direction == lumtdm.Direction.BIDIRECTIONAL
    assert pad.type_pin == pad.type_pin.type_block.pin("PAD")
    assert pad.signal.name == "pad" and top.pins["IO"].inner_signal == pad.signal
    assert {n.name: [s.name for s in n.signals] for n in view.networks} == {
        "clocks": ["clk"], "datapath": ["n1", "n2", "q"]}
    assert [p.full_path for p in top.signals["n1"].pins] == [
        VIEW + "/chip/u1.Y", VIEW + "/chip/core.A"]
    assert [lib.name for lib in view.libraries] == ["GATES", "CORES"]
    assert view.libraries[0].version == (1, 2) and "NAND2" in view.libraries[0]
    assert view.loaded_version == lumtdm.format_version()
    assert demo_db.lookup(VIEW).design.is_user_design


def test_lookup_by_path_and_name(demo_db):
    # Every object's full path leads back to it.
    view = demo_db.lookup(VIEW)
    top = view.top_block
    objects = [view, view.design, view.design.design_manager, top, top.children["core"],
               top.children["core"].children["g1"], top.pins["A"], top.signals["n2"],
               view.networks["datapath"]]
    for obj in objects:
        assert demo_db.lookup(obj.full_path) == obj, obj.full_path
    for missing in ["nope", VIEW + "/chip/u9", VIEW + "/chip/u1.Z", VIEW + ":none", VIEW + "/x"]:
        with pytest.raises(KeyError):
            demo_db.lookup(missing)
    assert top.children.get("u9") is None and "u1" in top.children and top.children[-1].name == "io"


def test_typed_queries(demo_db):
    top = demo_db.lookup(VIEW).top_block
    gates = top.view.library("GATES")
    nand = gates["NAND2"]
    assert [b.name for b in top.children_of_type(nand)] == ["u1"]
    assert [b.name for b in top.children_of_type("GATES:INV")] == ["spare"]
    assert [b.name for b in top.children_of_type(None)] == ["core_copy"]
    assert top.first_child_of_type("CORES:ALU").name == "core"
    assert top.children["u1"].is_type_of(nand) and top.is_type_of(None)
    u1 = top.children["u1"]
    assert u1.pin_of_type(nand.pin("B")) == u1.pins["B"]
    assert u1.pin_of_type(None) is None
    with pytest.raises(ValueError):
        top.is_type_of("NAND2")


def test_properties_mapping_round_trip(demo_db, demo_dir):
    block = demo_db.lookup(VIEW + "/chip/u1")
    props = block.properties
    props["NOTE"] = "a b:c\n\xe9"
    props["LIST"] = ["x", "", "y z"]
    props["RAW"] = "bad\udcffbyte"
    assert "NOTE" in props and props["LIST"] == ["x", "", "y z"]
    with pytest.raises(KeyError):
        del props["ABSENT"]
    with pytest.raises(TypeError):
        props["BAD"] = 3
    db = reopen(demo_db, demo_dir)
    props = db.lookup(VIEW + "/chip/u1").properties
    assert (props["NOTE"], props["LIST"], props["RAW"]) == ("a b:c\n\xe9", ["x", "", "y z"],
                                                           "bad\udcffbyte")
    del props["NOTE"]
    assert "NOTE" not in props and props["TDS_BLOCK_TYPE"] == "GATES:NAND2"
    db.close()


def test_every_edit_survives_commit_save_reopen(demo_db, demo_dir):
    view = demo_db.lookup(VIEW)
    top = view.top_block
    gates, cores = view.library("GATES"), view.library("CORES")
    top.create_typed_block("t1", gates["INV"])
    bare = top.create_typed_block("t2", gates["DFF"], pins=False)
    assert len(bare.pins) == 0 and bare.manifest_pins() and [p.name for p in bare.pins] == [
        "CK", "D", "Q"]
    grafted = top.create_typed_block("alu2", cores["ALU"], graft=True)
    assert [c.name for c in grafted.children] == ["g1", "g2"]
    copy = top.create_untyped_copy("copy2", cores["ALU"])
    assert not copy.is_typed and "CORES.tlm:ALU " in copy.properties["TDS_LIBRARY_ASSOC"]
    plain = top.create_block("p1")
    for name, direction in [("I", lumtdm.Direction.INPUT), ("O", lumtdm.Direction.OUTPUT)]:
        plain.create_pin(name, direction)
    plain.rebind(gates["INV"], {"I": "A", "O": gates["INV"].pin("Y")})
    top.children["spare"].rebind(gates["NAND2"])
    top.children["u1"].unbind()
    wire = top.create_signal("w")
    plain.pins["O"].connect(wire)
    top.children["t1"].pins["A"].connect(wire)
    view.networks["clocks"].add(wire)
    top.children["io"].delete()
    db = reopen(demo_db, demo_dir)
    after = db.lookup(VIEW)
    rows = tree(after)
    assert "chip/t1 INV {'A': 'A', 'Y': 'Y'}" in rows
    assert "chip/t2 DFF {'CK': 'CK', 'D': 'D', 'Q': 'Q'}" in rows
    assert "chip/alu2/g1 NAND2 {'A': 'A', 'B': 'B', 'Y': 'Y'}" in rows
    assert "chip/copy2/g2 None {'A': None, 'Y': None}" in rows
    assert "chip/p1 INV {'I': 'A', 'O': 'Y'}" in rows
    assert "chip/spare NAND2 {'A': 'A', 'B': 'B', 'Y': 'Y'}" in rows
    assert "chip/u1 None {'A': None, 'B': None, 'Y': None}" in rows
    assert not any(r.startswith("chip/io ") for r in rows)
    w = db.lookup(VIEW + "/chip:w")
    assert [p.full_path for p in w.pins] == [VIEW + "/chip/p1.O", VIEW + "/chip/t1.A"]
    assert w.network.name == "clocks"
    db.close()


def test_pin_map_round_trip(demo_db, demo_dir):
    # A map given as a dict is stored, committed and restored pin for pin.
    top = demo_db.lookup(VIEW).top_block
    dff = top.view.library("GATES")["DFF"]
    block = top.create_block("r2")
    for name in ["DIN", "CLKIN", "QOUT"]:
        block.create_pin(name, lumtdm.Direction.INPUT)
    mapping = {"DIN": "D", "CLKIN": "CK", "QOUT": "Q"}
    block.rebind(dff, mapping)
    assert block.pin_map == mapping
    db = reopen(demo_db, demo_dir)
    block = db.lookup(VIEW + "/chip/r2")
    assert block.pin_map == mapping and block.type_block.tag == "GATES:DFF"
    assert dict(block.properties["TDS_BLOCK_PIN_MAP"]) == mapping
    db.close()


def test_error_classes_and_their_causes(demo_db, demo_dir, tmp_path):
    assert issubclass(lumtdm.CorruptDatabaseError, lumtdm.LumError)
    assert issubclass(lumtdm.LumError, lumtdm.Error) and issubclass(lumtdm.OrbError, lumtdm.Error)
    assert issubclass(lumtdm.InvalidFormatError, lumtdm.LumError)
    assert issubclass(lumtdm.StaleObjectError, lumtdm.Error)
    view = demo_db.lookup(VIEW)
    top = view.top_block
    gates = view.library("GATES")
    with pytest.raises(lumtdm.OrbError) as err:
        top.create_block("u1")
    assert err.value.object_name and err.value.message
    with pytest.raises(lumtdm.OrbError):
        lumtdm.open(str(tmp_path / "missing.odb"))
    with pytest.raises(lumtdm.CorruptDatabaseError) as err:
        top.children["reg"].rebind(gates["INV"], {"DATA": "A", "CLOCK": "A", "OUT": "Y"})
    with pytest.raises(KeyError):
        top.children["reg"].rebind(gates["INV"], {"DATA": "NOPE"})
    with pytest.raises(lumtdm.InvalidLibraryError) as err:
        lumtdm.load_library("NO_SUCH_LIB", "sample", "s100")
    assert err.value.object_name == "NO_SUCH_LIB"
    # A type block of a library the view does not list.
    other = lumtdm.load_library("GATES", "other", "p")
    assert other != gates
    with pytest.raises(lumtdm.InvalidTypeBlockError):
        top.children["u1"].rebind(other["INV"])
    with pytest.raises(lumtdm.CorruptDatabaseError):
        top.create_typed_block("x", other["INV"])
    assert "x" not in top.children
    # A design carrying a foreign mark is refused on load, and nothing stays open.
    design = view.design.design_manager.create_design("foreign")
    design.properties["TDS_DESIGN_TYPE"] = "SOMEONE_ELSE"
    demo_db.save()
    with pytest.raises(lumtdm.DesignLoadError) as err:
        lumtdm.open(demo_db.path, lib_path=[str(demo_dir)])
    assert err.value.object_name == "foreign"
    with pytest.raises(ValueError):
        top.create_block("a\0b")
    with pytest.raises(ValueError):
        lumtdm.create().save()


def test_stale_handles_and_reused_slots(demo_db):
    top = demo_db.lookup(VIEW).top_block
    core = top.children["core"]
    inner = [core, core.children["g1"], core.pins["A"], core.signals["mid"]]
    core.delete()
    for obj in inner:
        assert not obj.alive and "stale" in repr(obj)
        with pytest.raises(lumtdm.StaleObjectError, match="deleted"):
            obj.name
    # New blocks reuse the freed slots; the old handles must not see them.
    fresh = [top.create_block("n%d" % i) for i in range(4)]
    assert all(b.alive for b in fresh) and not inner[0].alive
    assert inner[0] not in fresh
    with pytest.raises(lumtdm.StaleObjectError):
        inner[1].delete()


def test_close_ends_iterators_and_objects_keep_the_database(demo_dir, tmp_path):
    path = tmp_path / "demo.odb"
    shutil.copy(demo_dir / "demo.odb", path)
    view = lumtdm.open(str(path), lib_path=[str(demo_dir)]).lookup(VIEW)
    gc.collect()
    assert view.name == "netlist"  # the database lives on through its view
    type_block = view.top_block.children["u1"].type_block
    walk, pins = view.blocks(), iter(view.top_block.pins)
    next(walk), next(pins)
    view.database.close()
    assert list(walk) == [] and list(pins) == []
    for use in [lambda: view.name, lambda: type_block.name, lambda: view.database.commit()]:
        with pytest.raises(lumtdm.StaleObjectError, match="closed"):
            use()
    with lumtdm.open(str(path)) as db:
        assert not db.closed
    assert db.closed
    db.close()


def test_dump_memory_report_and_threads(demo_db):
    view = demo_db.lookup(VIEW)
    assert "Data for class <Lum_TdmBlock>" in view.top_block.children["u1"].dump()
    assert "(NAND2)" in view.top_block.children["u1"].dump()
    usage = view.memory_usage()
    assert usage["block_count"] == 11 and usage["total_bytes"] == sum(
        v for k, v in usage.items() if k.endswith("_bytes") and k != "total_bytes")
    assert "11 blocks consume" in view.memory_report()
    # Long calls let other threads in; calls from several threads stay safe.
    results = []

    def count():
        results.append(view.count_by_type()[None])

    threads = [threading.Thread(target=count) for _ in range(4)]
    for t in threads:
        t.start()
    demo_db.commit()
    for t in threads:
        t.join()
    assert results == [4] * 4


def test_classes_cannot_be_subclassed():
    with pytest.raises(TypeError):
        type("MyBlock", (lumtdm.Block,), {})


def test_every_public_class_and_function_has_a_docstring():
    def described(name, obj):
        lines = (getattr(obj, "__doc__", None) or "").strip().splitlines()
        # pybind11 puts the signature first; a docstring must say more.
        return any(line.strip() and not line.startswith(name + "(") for line in lines)

    missing = []
    for name in lumtdm.__all__:
        obj = getattr(lumtdm, name)
        if not described(name, obj):
            missing.append(name)
        if isinstance(obj, type) and obj is not lumtdm.Direction:
            for attr, value in vars(obj).items():
                public = not attr.startswith("_") or attr in ("__getitem__", "__contains__")
                if public and (callable(value) or isinstance(value, property)) \
                        and not described(attr, value):
                    missing.append(name + "." + attr)
    assert missing == []


@pytest.mark.skipif("asan" in os.environ.get("LD_PRELOAD", ""),
                    reason="the sanitizer runtime needs more address space than the limit leaves")
def test_running_out_of_memory_raises_memory_error():
    # In a process of its own whose address space is capped: creating blocks
    # until the library's allocation fails must raise MemoryError and leave
    # the model usable.
    script = """if True:
        import os, resource, lumtdm
        db = lumtdm.create()
        top = db.create_design_manager("m").create_design("d").create_view("v").create_top_block("t")
        used = int(open("/proc/self/statm").read().split()[0]) * os.sysconf("SC_PAGE_SIZE")
        soft, hard = resource.getrlimit(resource.RLIMIT_AS)
        resource.setrlimit(resource.RLIMIT_AS, (used + 64 * 2**20, hard))
        n = 0
        try:
            while True:
                top.create_block("b%d" % n)
                n += 1
        except MemoryError:
            pass
        resource.setrlimit(resource.RLIMIT_AS, (soft, hard))
        assert len(top.children) == n and top.children[n - 1].name == "b%d" % (n - 1)
        db.close()
        print("ok", n)
    """
    result = subprocess.run([sys.executable, "-c", script], capture_output=True, text=True,
                            timeout=300)
    assert result.returncode == 0 and result.stdout.startswith("ok"), result.stderr


def test_check_lists_what_would_stop_an_open(demo_db, demo_dir):
    assert lumtdm.check(demo_db.path, lib_path=[str(demo_dir)]) == []
    assert demo_db.check() == [] and demo_db.lookup(VIEW).check() == []
    foreign = demo_db.lookup("demo").create_design("foreign")
    foreign.properties["TDS_DESIGN_TYPE"] = "SOMEONE_ELSE"
    demo_db.lookup(VIEW + "/chip/u1").properties["TDS_BLOCK_TYPE"] = "GATES:NOPE"
    found = sorted((p.kind, p.path, p.exception) for p in demo_db.check())
    demo_db.save(commit=False)
    assert sorted((p.kind, p.path, p.exception) for p in lumtdm.check(demo_db.path)) == found
    assert found == [
        ("foreign_mark", "demo/foreign", "Lum_ExceptionDesignLoad"),
        ("type_block_missing", VIEW + ":chip/u1", "Lum_ExceptionCorruptDatabase")]
    with pytest.raises(lumtdm.OrbError):
        lumtdm.check(demo_db.path + ".missing")
