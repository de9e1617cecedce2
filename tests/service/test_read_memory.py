# SPDX-License-Identifier: MIT
"""The memory that bytes travel in: that of the service, and that which clients lend it."""
import errno
import fcntl
import mmap
import os
import unittest

from gi.repository import Gio, GLib
from harness import KORVEL, PATH, WAIT, ServiceTest, wait_until
from reading import BAD_RANGE, F_SEAL_FUTURE_WRITE, LARGE, LONGEST, READ, SLOT, TOO_LONG, Answer, BareMapping, Lent
from reading import Reads, call, close_stream, open_stream, pieces, range_options, read, read_into, sparse

UNKNOWN = 4_000_000_000


class ReceivedMemoryTest(Reads, ServiceTest):
    def setUp(self):
        super().setUp()
        self.content = b"".join(bytes([number]) * SLOT for number in range(1, 31))
        self.reader, self.path, found = self.card({"MVI_0001.MOV": self.content})
        self.handle = found["MVI_0001.MOV"]

    def check_that_it_cannot_be_changed(self, fd, size):
        self.assertEqual(fcntl.fcntl(fd, fcntl.F_GETFL) & os.O_ACCMODE, os.O_RDONLY)
        seals = fcntl.fcntl(fd, fcntl.F_GET_SEALS)
        wanted = fcntl.F_SEAL_SHRINK | fcntl.F_SEAL_GROW
        self.assertEqual(seals & wanted, wanted)
        again = os.open(f"/proc/self/fd/{fd}", os.O_RDWR)
        try:
            for change in (lambda: os.ftruncate(again, 0), lambda: os.ftruncate(again, 2 * LONGEST + 1),
                           lambda: os.pwrite(again, b"x", 0), lambda: mmap.mmap(again, size),
                           lambda: mmap.mmap(fd, size)):
                with self.assertRaises(OSError) as caught:
                    change()
                self.assertIn(caught.exception.errno, (errno.EPERM, errno.EACCES))
        finally:
            os.close(again)

    def test_what_a_range_comes_in_cannot_be_changed(self):
        answer = self.closing(read(self.reader, self.handle, 0, LARGE))
        self.check_that_it_cannot_be_changed(answer.fd, LARGE)

    def test_what_a_piece_of_a_stream_comes_in_cannot_be_changed(self):
        open_stream(self.reader, self.handle)
        answer = self.closing(read(self.reader, self.handle, 0, SLOT))
        self.check_that_it_cannot_be_changed(answer.fd, SLOT)

    def check_that_held_memory_stays(self, answers):
        """Holds every third answer with its descriptor and every third as a bare mapping, and drops the others."""
        held = []
        for number, answer in enumerate(answers):
            expected = answer[0:1] * len(answer)
            self.assertTrue(answer[:] == expected)
            if number % 3 == 0:
                held.append((expected, answer))
            elif number % 3 == 1:
                held.append((expected, BareMapping(answer)))
            else:
                answer.close()
        for expected, kept in held:
            self.assertTrue(kept.take() == expected)

    def test_pieces_of_a_stream_keep_their_bytes_while_they_are_held(self):
        def pieces_twice():
            for _ in range(2):
                open_stream(self.reader, self.handle)
                for offset in range(0, len(self.content), SLOT):
                    answer = read(self.reader, self.handle, offset, SLOT)
                    self.assertEqual(answer[0], self.content[offset])
                    yield answer
                close_stream(self.reader, self.handle)
        self.check_that_held_memory_stays(pieces_twice())

    def test_ranges_keep_their_bytes_while_they_are_held(self):
        def ranges():
            for number in range(60):
                offset = number % 30 * SLOT
                answer = read(self.reader, self.handle, offset, (LARGE, LARGE + 1, SLOT)[number % 3])
                self.assertEqual(answer[0], self.content[offset])
                yield answer
        self.check_that_held_memory_stays(ranges())

    def test_what_is_held_outlives_the_connection_and_the_service_forgets_it(self):
        open_stream(self.reader, self.handle)
        held = [self.closing(read(self.reader, self.handle, offset, SLOT)) for offset in range(0, 4 * SLOT, SLOT)]
        held.append(self.closing(read(self.reader, self.handle, 20 * SLOT, LARGE)))
        self.reader.close()
        wait_until(lambda: not self.memory_named("brivod-slot"), "the memory of the stream to go")
        for number, answer in enumerate(held[:4]):
            self.assertTrue(answer[:] == self.content[number * SLOT:(number + 1) * SLOT])


class ResidentMemoryTest(Reads, ServiceTest):
    def check_peak(self, files, size, megabytes):
        """Reads such files as streams, a piece of each in turn."""
        device, _, found = self.card({f"MVI_{n:04}.MOV": lambda path: sparse(path, size) for n in range(files)})
        handles = [found[f"MVI_{n:04}.MOV"] for n in range(files)]
        idle = self.forget_peak()
        streams = []
        for handle in handles:
            open_stream(device, handle)
            streams.append(pieces(device, handle, size))
        got = sum(len(piece) for row in zip(*streams) for _, piece in row)
        self.assertEqual(got, files * size)
        if not self.service.is_instrumented():
            self.assertLess(self.peak() - idle, megabytes * 1024)
        for handle in handles:
            close_stream(device, handle)
        self.assertEqual(self.memory_named("brivod-slot"), [])

    def test_a_long_stream_takes_few_megabytes(self):
        self.check_peak(1, 2 << 30, 32)

    def test_ten_streams_at_once_take_ten_times_as_many(self):
        self.check_peak(10, 128 << 20, 150)


class LentMemoryTest(Reads, ServiceTest):
    def setUp(self):
        super().setUp()
        self.content = os.urandom(2 * LONGEST + 50)
        self.reader, self.path, found = self.card({"MVI_0001.MOV": self.content, "IMG_0001.JPG": b"picture"})
        self.movie, self.picture, self.folder = found["MVI_0001.MOV"], found["IMG_0001.JPG"], found["DCIM"]
        self.targets = len(self.service.targets())

    def tearDown(self):
        self.assertEqual(read(self.reader, self.picture).take(), b"picture")
        self.reader.close()
        wait_until(lambda: not self.memory_named("lent"), "what was lent to be unmapped")
        wait_until(lambda: len(self.service.targets()) < self.targets, "the descriptors to go")
        super().tearDown()

    def lent(self, size, **options):
        return self.closing(Lent(size, **options))

    def check_refused(self, fd, size, length=LARGE):
        answer = read_into(self.reader, self.movie, 0, length, fd, size)
        self.assertEqual((answer.code, answer.count, answer.take()), (BAD_RANGE, 0, b""))
        self.assertNotIn("OVReadBuffer", answer.values)

    def test_bytes_arrive_in_the_buffer_and_the_answer_says_how_many(self):
        buffer = self.lent(LONGEST)
        for offset, length in ((0, 1), (3, LARGE - 1), (5, LARGE), (7, SLOT), (LONGEST + 50, LONGEST)):
            answer = read_into(self.reader, self.movie, offset, length, buffer.fd, LONGEST,
                               also={"mine": GLib.Variant("s", "kept")})
            self.assertEqual((answer.code, answer.count, answer.fd, answer.take()), (0, length, None, b""))
            self.assertEqual(answer.values["OVReadBufferCount"].get_type_string(), "t")
            self.assertEqual(answer.values["mine"].unpack(), "kept")
            self.assertNotIn("OVReadBuffer", answer.values)
            self.assertTrue(buffer.bytes()[:length] == self.content[offset:offset + length])

    def test_what_lies_behind_the_read_is_left_alone(self):
        buffer = self.lent(SLOT)
        self.assertEqual(read_into(self.reader, self.movie, 9, 1000, buffer.fd, SLOT).count, 1000)
        self.assertTrue(buffer.bytes() == self.content[9:1009] + b"\xa5" * (SLOT - 1000))

    def test_two_buffers_in_turn(self):
        buffers = [self.lent(LARGE + 1), self.lent(LARGE)]
        for number in range(40):
            buffer, offset = buffers[number % 2], number * LARGE
            self.assertEqual(read_into(self.reader, self.movie, offset, LARGE, buffer.fd, buffer.size).count, LARGE)
            self.assertTrue(buffer.bytes()[:LARGE] == self.content[offset:offset + LARGE])
        self.assertEqual(len(self.memory_named("lent")), 2, "each is mapped once")

    def test_a_buffer_larger_than_a_read_can_be_is_mapped_as_far_as_it_is_used(self):
        buffer = self.lent(4 * LONGEST)
        self.assertEqual(read_into(self.reader, self.movie, 0, LONGEST, buffer.fd, 4 * LONGEST).count, LONGEST)
        self.assertTrue(buffer.bytes() == self.content[:LONGEST] + b"\xa5" * (3 * LONGEST))
        first, last = (int(place, 16) for place in self.memory_named("lent")[0].split()[0].split("-"))
        self.assertEqual(last - first, LONGEST)

    def test_the_rules_for_ranges_hold_and_the_buffer_is_not_touched(self):
        buffer = self.lent(2 * LONGEST)
        for handle, offset, length, code in (
                (self.movie, 0, LONGEST + 1, TOO_LONG), (self.movie, None, None, TOO_LONG),
                (self.movie, 0, 0, BAD_RANGE), (self.movie, len(self.content), 1, BAD_RANGE),
                (self.movie, 2**64 - 5, 10, BAD_RANGE), (UNKNOWN, 0, 1, BAD_RANGE)):
            answer = read_into(self.reader, handle, offset, length, buffer.fd, buffer.size)
            self.assertEqual((answer.code, answer.count, answer.take()), (code, 0, b""))
        folder = read_into(self.reader, self.folder, 0, 1, buffer.fd, buffer.size)
        self.assertEqual((folder.count, folder.take()), (0, b""))
        self.assertTrue(buffer.bytes() == b"\xa5" * buffer.size)

    def test_a_buffer_that_is_not_sealed_against_shrinking(self):
        for seals in (0, fcntl.F_SEAL_GROW):
            buffer = self.lent(LARGE, seals=seals)
            self.check_refused(buffer.fd, LARGE)
            self.assertTrue(buffer.bytes() == b"\xa5" * LARGE)

    def test_a_buffer_that_cannot_be_written(self):
        for seals in (fcntl.F_SEAL_WRITE, F_SEAL_FUTURE_WRITE):
            buffer = self.lent(LARGE, seals=fcntl.F_SEAL_SHRINK | seals)
            self.check_refused(buffer.fd, LARGE)
            self.assertTrue(buffer.bytes() == b"\xa5" * LARGE)
        buffer = self.lent(LARGE)
        reader = os.open(f"/proc/self/fd/{buffer.fd}", os.O_RDONLY)
        self.addCleanup(os.close, reader)
        self.check_refused(reader, LARGE)
        self.assertTrue(buffer.bytes() == b"\xa5" * LARGE)

    def test_a_buffer_that_is_too_small_for_the_read(self):
        buffer = self.lent(LARGE)
        self.check_refused(buffer.fd, LARGE, LARGE + 1)
        self.check_refused(buffer.fd, 100, 101)
        self.check_refused(buffer.fd, 0, 1)
        self.assertTrue(buffer.bytes() == b"\xa5" * LARGE)
        self.check_refused(self.lent(0).fd, 0, 1)

    def test_a_buffer_that_is_said_to_be_larger_than_it_is(self):
        buffer = self.lent(LARGE)
        for claimed in (LARGE + 1, LONGEST, 2**63, 2**64 - 1):
            self.check_refused(buffer.fd, claimed, 100)
        self.assertEqual(read_into(self.reader, self.movie, 0, 100, buffer.fd, LARGE).count, 100)
        for claimed in (LARGE + 1, LONGEST, 2**63, 2**64 - 1):  # also once it is known
            self.check_refused(buffer.fd, claimed, LARGE + 1)
        self.assertTrue(buffer.bytes() == self.content[:100] + b"\xa5" * (LARGE - 100))

    def test_a_known_buffer_that_has_grown_and_is_said_to(self):
        buffer = self.lent(LARGE)
        self.assertEqual(read_into(self.reader, self.movie, 0, LARGE, buffer.fd, LARGE).count, LARGE)
        os.ftruncate(buffer.fd, 3 * LARGE)
        self.assertEqual(read_into(self.reader, self.movie, 5, 3 * LARGE, buffer.fd, 3 * LARGE).count, 3 * LARGE)
        self.assertTrue(os.pread(buffer.fd, 3 * LARGE, 0) == self.content[5:5 + 3 * LARGE])
        self.assertEqual(len(self.memory_named("lent")), 1)

    def test_a_buffer_that_is_no_memory(self):
        reader, writer = os.pipe()
        self.addCleanup(os.close, reader)
        self.addCleanup(os.close, writer)
        os.set_blocking(reader, False)
        self.check_refused(reader, LARGE)
        self.check_refused(writer, LARGE)
        with self.assertRaises(BlockingIOError):
            os.read(reader, 1)
        path = f"{self.service.folder}/ordinary"
        with open(path, "w+b") as file:
            file.write(b"\xa5" * LARGE)
            file.flush()
            self.check_refused(file.fileno(), LARGE)
        with open(path, "rb") as file:
            self.assertTrue(file.read() == b"\xa5" * LARGE)

    def test_memory_that_came_from_the_service_is_none_to_lend(self):
        received = self.closing(read(self.reader, self.movie, LARGE, LARGE))
        self.check_refused(received.fd, LARGE)
        again = os.open(f"/proc/self/fd/{received.fd}", os.O_RDWR)
        self.addCleanup(os.close, again)
        self.check_refused(again, LARGE)
        self.assertTrue(received[:] == self.content[LARGE:2 * LARGE])

    def test_a_buffer_of_another_type_than_memory(self):
        for other in (GLib.Variant("s", "buffer"), GLib.Variant("i", 3), GLib.Variant("ay", bytes(100)),
                      GLib.Variant("a{sv}", {})):
            options = {**range_options(0, 100), "OVReadBuffer": other}
            answer = Answer(*call(self.reader, READ, self.movie, options))
            self.assertEqual((answer.code, answer.count, answer.take()), (BAD_RANGE, 0, b""))
        buffer = self.lent(LARGE)
        for other, fds in ((GLib.Variant("h", 0), [buffer.fd]), (GLib.Variant("(hu)", (0, LARGE)), [buffer.fd])):
            options = {**range_options(0, 100), "OVReadBuffer": other}
            with self.assertRaises(GLib.Error) as caught:
                call(self.reader, READ, self.movie, options, Gio.UnixFDList.new_from_array([os.dup(fd) for fd in fds]))
            self.assertIn("InvalidArgs", caught.exception.message)
        self.assertTrue(buffer.bytes() == b"\xa5" * LARGE)

    def test_memory_that_is_closed_after_it_was_lent(self):
        buffer = Lent(LARGE)
        self.assertEqual(read_into(self.reader, self.movie, 0, LARGE, buffer.fd, LARGE).count, LARGE)
        buffer.close()
        for number in range(3):
            other = self.lent(LARGE)
            offset = number * LARGE
            self.assertEqual(read_into(self.reader, self.movie, offset, LARGE, other.fd, LARGE).count, LARGE)
            self.assertTrue(other.bytes() == self.content[offset:offset + LARGE])

    def test_a_descriptor_that_is_closed_while_the_read_is_under_way(self):
        buffer = self.lent(LONGEST)
        lent = os.dup(buffer.fd)
        descriptors = Gio.UnixFDList.new_from_array([lent])  # which owns it
        options = {**range_options(11, LONGEST), "OVReadBuffer": GLib.Variant("(ht)", (0, LONGEST))}
        self.reader.bus.call_with_unix_fd_list(
            None, PATH, KORVEL, READ, GLib.Variant("(ta{sv})", (self.movie, options)), None, Gio.DBusCallFlags.NONE,
            WAIT * 1000, descriptors, None, None)
        del descriptors
        self.assertEqual(read(self.reader, self.picture).take(), b"picture")  # answered in order
        self.assertTrue(buffer.bytes() == self.content[11:11 + LONGEST])

    def test_buffers_in_other_requests_do_no_harm(self):
        buffer = self.lent(LARGE)
        for member in ("requestMetadataForObjectHandle", "requestThumbnailDataForObjectHandle",
                       "requestDownloadObjectHandle", "requestDeleteObjectHandle"):
            for handle in (UNKNOWN, self.folder):
                descriptors = Gio.UnixFDList.new()
                options = {"OVReadBuffer": GLib.Variant("(ht)", (descriptors.append(buffer.fd), LARGE))}
                call(self.reader, f"{member}_options_withReply", handle, options, descriptors)
        descriptors = Gio.UnixFDList.new()
        lent = GLib.Variant("a{sv}", {"OVReadBuffer": GLib.Variant("(ht)", (descriptors.append(buffer.fd), LARGE))})
        for option in ("OVReadBufferStreamOpen", "OVReadBufferStreamClose"):
            call(self.reader, READ, self.movie, {option: GLib.Variant("b", True), "OVReadBuffer": lent}, descriptors)
        self.assertTrue(buffer.bytes() == b"\xa5" * LARGE)
        self.assertEqual(self.service.descriptors_below(self.path), [])

    def test_a_stream_opened_with_a_buffer_reads_nothing_ahead(self):
        buffer = self.lent(LONGEST)
        answer = read_into(self.reader, self.movie, None, None, buffer.fd, buffer.size,
                           also={"OVReadBufferStreamOpen": GLib.Variant("b", True)})
        self.assertEqual((answer.code, answer.take()), (0, b""))
        self.assertEqual(len(self.service.descriptors_below(self.path)), 1)
        self.assertEqual(self.memory_named("brivod-slot"), [])
        for offset in (SLOT + 1, 0, LONGEST):
            self.assertEqual(read_into(self.reader, self.movie, offset, SLOT, buffer.fd, buffer.size).count, SLOT)
            self.assertTrue(buffer.bytes()[:SLOT] == self.content[offset:offset + SLOT])
            self.assertEqual(read(self.reader, self.movie, offset, 100).take(), self.content[offset:offset + 100])
        close_stream(self.reader, self.movie)
        self.assertEqual(self.service.descriptors_below(self.path), [])

    def test_a_buffer_is_filled_from_anywhere_while_a_stream_reads_ahead(self):
        buffer = self.lent(LARGE)
        open_stream(self.reader, self.movie)
        self.assertTrue(read(self.reader, self.movie, 0, SLOT).take() == self.content[:SLOT])
        self.assertEqual(read_into(self.reader, self.movie, 77, LARGE, buffer.fd, LARGE).count, LARGE)
        self.assertTrue(buffer.bytes() == self.content[77:77 + LARGE])
        self.assertTrue(read(self.reader, self.movie, SLOT, SLOT).take() == self.content[SLOT:2 * SLOT])
        close_stream(self.reader, self.movie)

    def test_five_hundred_buffers_leave_no_descriptors_and_bounded_memory(self):
        idle = self.forget_peak()
        for number in range(500):
            buffer = Lent(1 << 20)
            answer = read_into(self.reader, self.movie, number, 1 << 20, buffer.fd, 1 << 20)
            self.assertEqual((answer.code, answer.count), (0, 1 << 20))
            if number % 100 == 0:
                self.assertTrue(buffer.bytes() == self.content[number:number + (1 << 20)])
            buffer.close()
        self.assertLessEqual(len(self.memory_named("lent")), 32)
        wait_until(lambda: len(self.service.targets()) <= self.targets, "the descriptors to go")
        if not self.service.is_instrumented():
            self.assertLess(self.peak() - idle, 64 * 1024)

    def test_the_buffers_of_a_client_that_was_killed_are_unmapped(self):
        other = self.other_client()
        other.ask("open", self.path)
        self.assertEqual(other.ask("read_into_lent", self.movie, LARGE, 10), [0, LARGE] * 10)
        self.assertEqual(len(self.memory_named("lent")), 10)
        mine = self.lent(LARGE)
        self.assertEqual(read_into(self.reader, self.movie, 0, LARGE, mine.fd, LARGE).count, LARGE)
        other.kill()
        wait_until(lambda: len(self.memory_named("lent")) == 1, "its buffers to be unmapped, and no others")
        self.assertEqual(read_into(self.reader, self.movie, 5, LARGE, mine.fd, LARGE).count, LARGE)
        self.assertTrue(mine.bytes() == self.content[5:5 + LARGE])


if __name__ == "__main__":
    unittest.main()
