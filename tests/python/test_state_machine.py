"""A hypothesis state machine that interleaves creates, rebinds, deletes,
grafts, saves, reopens and closes on the demo database: no step may crash,
every handle of a deleted object or closed database raises
StaleObjectError, and every other handle still works."""

import shutil

import pytest
from hypothesis import HealthCheck, settings
from hypothesis import strategies as st
from hypothesis.stateful import RuleBasedStateMachine, invariant, precondition, rule

import lumtdm

VIEW = "demo/chip/netlist"
GATES = ["NAND2", "INV", "DFF", "IOPAD"]


@pytest.fixture(autouse=True)
def _demo(demo_dir, tmp_path):
    DesignMachine.demo_dir = demo_dir
    DesignMachine.work_dir = tmp_path


class DesignMachine(RuleBasedStateMachine):
    demo_dir = None
    work_dir = None

    def __init__(self):
        super().__init__()
        self.path = str(self.work_dir / "machine.odb")
        shutil.copy(self.demo_dir / "demo.odb", self.path)
        self.db = None
        self.live = []  # handles whose objects exist
        self.stale = []  # handles whose objects are gone
        self.serial = 0
        self.reopen()

    def reopen(self):
        try:
            self.db = lumtdm.open(self.path, lib_path=[str(self.demo_dir)])
        except lumtdm.LumError:
            # A rebind through a pin map can commit bindings that opening
            # refuses (a type pin left over whose name another pin has):
            # refused whole, nothing stays open; start again from the demo.
            shutil.copy(self.demo_dir / "demo.odb", self.path)
            self.db = lumtdm.open(self.path, lib_path=[str(self.demo_dir)])
        self.view = self.db.lookup(VIEW)
        self.live = [self.view.top_block] + list(self.view.top_block.children)

    def save(self):
        try:
            self.db.save()
        except lumtdm.LumError:
            pass  # a commit that the next open would refuse is refused before writing

    def forget_all(self):
        self.stale += self.live
        self.live = []

    def blocks(self):
        return [b for b in self.live if isinstance(b, lumtdm.Block)]

    def fresh_name(self):
        self.serial += 1
        return "b%d" % self.serial

    @precondition(lambda self: self.db is not None)
    @rule(index=st.integers(0, 100), gate=st.sampled_from(GATES), pins=st.booleans())
    def create_typed(self, index, gate, pins):
        parent = self.blocks()[index % len(self.blocks())]
        type_block = self.view.library("GATES")[gate]
        self.live.append(parent.create_typed_block(self.fresh_name(), type_block, pins=pins))

    @precondition(lambda self: self.db is not None)
    @rule(graft=st.booleans(), typed=st.booleans())
    def create_alu(self, graft, typed):
        top = self.view.top_block
        alu = self.view.library("CORES")["ALU"]
        block = (top.create_typed_block(self.fresh_name(), alu, graft=graft) if typed
                 else top.create_untyped_copy(self.fresh_name(), alu))
        self.live += [block] + list(block.children) + list(block.pins)

    @precondition(lambda self: self.db is not None)
    @rule(index=st.integers(0, 100), gate=st.sampled_from(GATES + [None]), by_map=st.booleans())
    def rebind(self, index, gate, by_map):
        block = self.blocks()[index % len(self.blocks())]
        type_block = self.view.library("GATES")[gate] if gate else None
        pin_map = None
        if by_map and type_block is not None:
            type_pins = [p.name for p in type_block.pins]
            pin_map = {p.name: type_pins[i % len(type_pins)] for i, p in enumerate(block.pins)}
        try:
            block.rebind(type_block, pin_map)
        except lumtdm.LumError:
            pass  # pins that do not fit the type: refused, not a crash

    @precondition(lambda self: self.db is not None and len(self.blocks()) > 1)
    @rule(index=st.integers(0, 100))
    def delete(self, index):
        block = self.blocks()[1:][index % (len(self.blocks()) - 1)]
        prefix = block.full_path
        gone = [h for h in self.live
                if h.full_path == prefix or h.full_path.startswith((prefix + "/", prefix + "."))]
        block.delete()
        self.live = [h for h in self.live if h not in gone]
        self.stale += gone

    @precondition(lambda self: self.db is not None)
    @rule()
    def save_and_reopen(self):
        self.save()
        self.db.close()
        self.forget_all()
        self.reopen()

    @precondition(lambda self: self.db is not None)
    @rule(save=st.booleans())
    def close(self, save):
        if save:
            self.save()
        self.db.close()
        self.forget_all()
        self.db = None

    @precondition(lambda self: self.db is None)
    @rule()
    def open_again(self):
        self.reopen()

    @invariant()
    def handles_tell_live_from_stale(self):
        for handle in self.live:
            assert handle.alive and handle.name
        for handle in self.stale:
            assert not handle.alive
            with pytest.raises(lumtdm.StaleObjectError):
                handle.name

    def teardown(self):
        if self.db is not None:
            self.db.close()


DesignMachine.TestCase.settings = settings(
    max_examples=30, stateful_step_count=15, deadline=None, database=None,
    suppress_health_check=[HealthCheck.too_slow, HealthCheck.function_scoped_fixture])
test_design_machine = DesignMachine.TestCase
