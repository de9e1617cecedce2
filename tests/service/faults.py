# SPDX-License-Identifier: MIT
"""A brivod whose reads of card files fail, come short or stall as a test orders; see tests/support/faulty_reads.cpp."""
import contextlib
import os
import subprocess

from harness import BRIVOD, BUILD, Service, ServiceTest, wait_until

LAYER = f"{BUILD}/tests/faulty_reads.so"


def sanitizer_runtimes():
    """The libraries that have to come before all others, where brivod is built with them."""
    linked = subprocess.run(["ldd", BRIVOD], capture_output=True, text=True, check=True).stdout.split()
    return [word for word in linked if word.startswith("/") and ("/libasan." in word or "/libtsan." in word)]


class FaultyService(Service):
    """Reads go well until there are orders."""

    def __init__(self, **options):
        super().__init__(start=False, **options)
        self.orders = f"{self.folder}/orders"
        self.environment["BRIVOD_FAULTY_READS"] = self.orders
        self.start()

    def start(self):
        # For the service alone: what else runs in this environment reads as ever.
        environment = self.environment
        self.environment = {**environment, "LD_PRELOAD": ":".join([*sanitizer_runtimes(), LAYER])}
        try:
            super().start()
        finally:
            self.environment = environment

    def order(self, *orders):
        """These and no others from now on, each a text: kind, position and the end of a file's name."""
        with contextlib.suppress(FileNotFoundError):
            os.remove(f"{self.orders}.stalled")
        with open(f"{self.orders}.new", "w", encoding="utf-8") as file:
            file.writelines(f"{order}\n" for order in orders)
        os.rename(f"{self.orders}.new", self.orders)

    def take_back(self):
        with contextlib.suppress(FileNotFoundError):
            os.remove(self.orders)

    def wait_for_stall(self):
        """Until a read waits that was begun after the last order()."""
        wait_until(lambda: os.path.exists(f"{self.orders}.stalled"), "a read to stall")

    def close(self):
        self.take_back()
        super().close()


class FaultyServiceTest(ServiceTest):
    """A test with a running service that can be given faults."""

    def setUp(self):
        self.service = FaultyService(grant=self.grant, **self.environment)
        self.addCleanup(self.service.close)
