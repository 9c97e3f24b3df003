"""Typed design databases from Python.

Open a database, walk its hierarchy, query and edit typing, and save::

    import lumtdm

    with lumtdm.open("demo.odb", lib_path=["libs"]) as db:
        view = db.lookup("demo/chip/netlist")
        print(view.count_by_type())
        db.save()

Every object of a database (design managers, designs, views, blocks, pins,
signals, networks) is a handle: once its object is deleted, by the script, by
a rebind or a graft, or its database is closed, any use raises
StaleObjectError. Objects keep their database alive. Library failures raise
the subclasses of Error; running out of memory raises MemoryError.

The classes cannot be subclassed: the library's virtual hooks (type block
initialisation, library loading, graft hooks) are not open to Python.

Calls into the library are serialised; the long ones (open, save, commit,
close, checks, library loading, grafting, count_by_type, import_library,
import_netlist, export_netlist) let other Python threads run meanwhile.
"""

from collections.abc import MutableMapping as _MutableMapping

from ._lumtdm import (  # noqa: F401
    BlockWalk,
    Block,
    CorruptDatabaseError,
    Database,
    Design,
    DesignLoadError,
    DesignManager,
    Direction,
    Error,
    InvalidFormatError,
    InvalidLibraryError,
    InvalidTypeBlockError,
    LumError,
    Network,
    Object,
    ObjectIterator,
    ObjectList,
    OrbError,
    Pin,
    Problem,
    Signal,
    StaleObjectError,
    TypeBlock,
    TypeLibrary,
    TypePin,
    View,
    check,
    create,
    export_netlist,
    format_version,
    import_library,
    import_netlist,
    library_search_path,
    load_library,
    open,
)


class Properties(_MutableMapping):
    """The properties of an object as a mutable mapping of names to values.

    A string property reads as a str, a string list as a list of str, a list
    property as a list of (name, value) pairs. Assigning a str makes a string
    property, a list or tuple of str a string list; either replaces a property
    of that name. Bytes that are not UTF-8 read as surrogate escapes and are
    written back unchanged. Every access checks that the object still exists.
    """

    __slots__ = ("_object",)

    def __init__(self, obj):
        self._object = obj

    def __getitem__(self, name):
        """The value of the property of that name; KeyError when there is none."""
        return self._object._property_get(name)

    def __setitem__(self, name, value):
        """Creates or replaces a property: a str, or a list of str for a string list."""
        self._object._property_set(name, value)

    def __delitem__(self, name):
        """Deletes the property of that name; KeyError when there is none."""
        self._object._property_del(name)

    def __iter__(self):
        """The property names in the object's order."""
        return iter(self._object._property_names())

    def __len__(self):
        """The number of properties."""
        return len(self._object._property_names())

    def __repr__(self):
        return "Properties(%r)" % dict(self.items())


Object.properties = property(
    Properties, doc="The object's properties as a mutable mapping (see Properties).")

__all__ = [name for name in dir() if not name.startswith("_")]
