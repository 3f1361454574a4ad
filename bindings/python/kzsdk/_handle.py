"""Native handles that may be closed while other threads use them."""

from __future__ import annotations

import contextlib
import threading
from typing import Any, Callable, Iterator, Set

from kzsdk._interface import ffi
from kzsdk.errors import ClosedError, Error


class Handle:
    """Owns a native handle and counts the calls that use it.

    No native call may run while its handle is freed. close() therefore refuses new calls, and the
    last call that is still running frees the handle as it leaves.
    """

    def __init__(self, what: str, address: Any, free: Callable[[Any], Any], shared: bool,
                 freed: Callable[[], object] = lambda: None) -> None:
        """``shared``: several threads may use it at once; otherwise they take turns.

        ``freed`` is called once the handle has been freed.
        """
        self._what = what
        self._address = address
        self._free = free
        self._freed = freed
        self._guard = threading.Lock()  # of what follows
        self._users = 0
        self._closed = False
        self._visitors: Set[int] = set()  # threads whose call may call back
        self._turn = None if shared else threading.Lock()

    @property
    def closed(self) -> bool:
        return self._closed

    @contextlib.contextmanager
    def use(self) -> Iterator[Any]:
        """Gives the native handle, which stays valid inside the with block."""
        self._enter()
        try:
            with self._turn or contextlib.nullcontext():
                if self._turn is not None:
                    self.check_open()  # it may have been closed while this thread waited
                yield self._address
        finally:
            self._leave()

    @contextlib.contextmanager
    def use_with_callbacks(self) -> Iterator[Any]:
        """The same for calls that call back, and must not be called with this handle again."""
        with self.use() as address:
            thread = threading.get_ident()
            with self._guard:
                self._visitors.add(thread)
            try:
                yield address
            finally:
                with self._guard:
                    self._visitors.discard(thread)

    def close(self) -> None:
        with self._guard:
            if self._closed:
                return
            self._closed = True
            unused = self._users == 0
        if unused:
            self._release()

    def check_open(self) -> None:
        """Raises ClosedError."""
        if self._closed:
            raise ClosedError(f"the {self._what} was closed: create another one")

    def _enter(self) -> None:
        with self._guard:
            self.check_open()
            if threading.get_ident() in self._visitors:
                raise Error(f"a progress function must not use the {self._what} that calls it")
            self._users += 1

    def _leave(self) -> None:
        with self._guard:
            self._users -= 1
            last = self._closed and self._users == 0
        if last:
            self._release()

    def _release(self) -> None:
        address, self._address = self._address, ffi.NULL
        reference = ffi.new("void*[1]", [address])
        self._free(ffi.cast(ffi.typeof(self._free).args[0], reference))
        self._freed()

    def __del__(self) -> None:
        # Of a handle whose constructor failed there is nothing to close.
        if hasattr(self, "_guard"):
            self.close()
