# SPDX-License-Identifier: MIT
"""Reads that fail, come short or stall: no answer has bytes that the medium did not give, and nothing hangs but what
waits for the medium."""
import functools
import os
import signal
import unittest

from harness import WAIT, wait_until
from faults import FaultyServiceTest
from reading import LARGE, LONGEST, SLOT, Lent, Reads, at_once, close_stream, open_stream, pieces, read, read_into
from reading import streamed

MOVIE, PICTURE = "MVI_0001.MOV", "IMG_0001.JPG"
FAULT = SLOT + 12_345  # in the second piece of a stream


class FaultTest(Reads, FaultyServiceTest):
    def setUp(self):
        super().setUp()
        self.content = os.urandom(4 * SLOT + 99)
        self.reader, self.path, found = self.card({MOVIE: self.content, PICTURE: b"picture"})
        self.movie, self.picture = found[MOVIE], found[PICTURE]
        self.buffer = self.closing(Lent(LONGEST))

    def tearDown(self):
        """Whatever failed, it works again afterwards, and nothing stays open."""
        self.service.take_back()
        self.assertTrue(streamed(self.reader, self.movie, len(self.content)) == self.content)
        self.assertTrue(self.range_of(FAULT - 100, LONGEST) == self.content[FAULT - 100:FAULT - 100 + LONGEST])
        self.assertTrue(self.lent_of(FAULT - 100, LARGE) == self.content[FAULT - 100:FAULT - 100 + LARGE])
        self.assertEqual(self.service.descriptors_below(self.path), [])
        super().tearDown()

    def range_of(self, offset, length):
        answer = read(self.reader, self.movie, offset, length)
        self.assertEqual(answer.code, 0)
        return answer.take()

    def lent_of(self, offset, length):
        answer = read_into(self.reader, self.movie, offset, length, self.buffer.fd, self.buffer.size)
        self.assertEqual((answer.code, answer.take()), (0, b""))
        return self.buffer.bytes()[:answer.count]

    def stream_until_it_ends(self):
        open_stream(self.reader, self.movie)
        data = b"".join(piece[:] for _, piece in pieces(self.reader, self.movie, len(self.content)))
        answer = read(self.reader, self.movie, len(data), 1) if len(data) < len(self.content) else None
        self.assertEqual((answer.code, answer.take()) if answer else (0, b""), (0, b""), "an empty one again")
        self.assertEqual(close_stream(self.reader, self.movie), (0, 0))
        return data

    def test_a_medium_that_gives_nothing(self):
        for kind in ("fail", "short", "end"):
            self.service.order(f"{kind} 0 {MOVIE}")
            self.assertEqual(self.stream_until_it_ends(), b"")
            for length in (100, LARGE, LONGEST):
                self.assertEqual(self.range_of(0, length), b"")
                self.assertEqual(self.lent_of(0, length), b"")
            self.assertEqual(read(self.reader, self.picture).take(), b"picture", "other files are well")

    def test_a_stream_over_a_bad_place_ends_with_the_piece_before_it(self):
        self.service.order(f"fail {FAULT} {MOVIE}")
        self.assertTrue(self.stream_until_it_ends() == self.content[:SLOT])

    def test_a_stream_over_a_place_from_which_on_nothing_comes_ends_there(self):
        for kind in ("short", "end"):
            for place in (FAULT, SLOT, 1, 4 * SLOT + 98):
                self.service.order(f"{kind} {place} {MOVIE}")
                self.assertTrue(self.stream_until_it_ends() == self.content[:place], (kind, place))

    def test_ranges_over_a_bad_place_are_empty_and_those_before_it_are_whole(self):
        self.service.order(f"fail {FAULT} {MOVIE}")
        for read_range in (self.range_of, self.lent_of):
            for length in (100, LARGE - 1, LARGE, SLOT):
                self.assertEqual(read_range(FAULT - length + 1, length), b"")
                self.assertEqual(read_range(FAULT, length), b"")
                self.assertTrue(read_range(FAULT - length, length) == self.content[FAULT - length:FAULT])

    def test_ranges_over_a_place_from_which_on_nothing_comes_give_what_lies_before(self):
        for kind in ("short", "end"):
            self.service.order(f"{kind} {FAULT} {MOVIE}")
            for read_range in (self.range_of, self.lent_of):
                for length in (100, LARGE - 1, LARGE, SLOT):
                    for before in (1, length // 2, length - 1, length):
                        self.assertTrue(read_range(FAULT - before, length) == self.content[FAULT - before:FAULT])
                    self.assertEqual(read_range(FAULT, length), b"")
                    self.assertEqual(read_range(FAULT + 5, length), b"")

    def test_lent_memory_behind_what_came_is_left_alone(self):
        self.service.order(f"short {FAULT} {MOVIE}")
        self.assertTrue(self.lent_of(FAULT - 1000, SLOT) == self.content[FAULT - 1000:FAULT])
        self.assertTrue(self.buffer.bytes()[1000:] == b"\xa5" * (LONGEST - 1000))
        self.assertEqual(self.lent_of(FAULT, SLOT), b"")
        self.assertTrue(self.buffer.bytes()[1000:] == b"\xa5" * (LONGEST - 1000))

    def test_reads_that_come_in_two_parts_are_put_together(self):
        self.service.order(f"split {FAULT} {MOVIE}", f"split {3 * SLOT - 1} {MOVIE}")
        self.assertTrue(self.stream_until_it_ends() == self.content)
        for read_range in (self.range_of, self.lent_of):
            for length in (100, LARGE, LONGEST):
                self.assertTrue(read_range(FAULT - 7, length) == self.content[FAULT - 7:FAULT - 7 + length])

    def test_a_fault_that_goes_does_not_bring_an_ended_stream_back(self):
        self.service.order(f"short {FAULT} {MOVIE}")
        open_stream(self.reader, self.movie)
        data = b"".join(piece[:] for _, piece in pieces(self.reader, self.movie, len(self.content)))
        self.assertTrue(data == self.content[:FAULT])
        self.service.take_back()
        self.assertEqual(self.range_of(FAULT, 100), b"")
        self.assertTrue(self.lent_of(FAULT, 100) == self.content[FAULT:FAULT + 100], "lent memory needs no piece")
        close_stream(self.reader, self.movie)
        self.assertTrue(self.range_of(FAULT, LARGE) == self.content[FAULT:FAULT + LARGE])

    def test_a_fault_that_comes_into_an_open_stream_behind_what_was_read_ahead(self):
        size = 12 * SLOT
        device, path, found = self.card({"MVI_0002.MOV": bytes(size)}, "LONG")
        open_stream(device, found["MVI_0002.MOV"])
        read(device, found["MVI_0002.MOV"], 0, SLOT).close()
        self.service.order(f"fail {8 * SLOT + 7} MVI_0002.MOV")
        rest = b"".join(piece[:] for _, piece in pieces(device, found["MVI_0002.MOV"], size, SLOT))
        self.assertTrue(rest == bytes(7 * SLOT))
        close_stream(device, found["MVI_0002.MOV"])
        self.assertEqual(self.service.descriptors_below(path), [])

    def test_faults_that_come_and_go_while_ranges_are_read(self):
        orders = [f"{kind} {place} {MOVIE}"
                  for kind in ("fail", "short", "end", "split") for place in (0, FAULT, LARGE)]

        def read_on():
            for offset in range(0, 100 * 1009, 1009):
                data = self.range_of(offset, SLOT)
                self.assertTrue(data == self.content[offset:offset + len(data)])
        reading, = at_once(read_on)
        while not reading.done():
            for order in orders:
                self.service.order(order)
        reading.result()


class StallTest(Reads, FaultyServiceTest):
    def setUp(self):
        super().setUp()
        self.content = os.urandom(4 * SLOT)
        self.stuck, self.path, found = self.card({MOVIE: self.content})
        self.movie = found[MOVIE]
        self.healthy, self.other_path, found = self.card({PICTURE: b"picture", "MVI_0002.MOV": self.content}, "OTHER")
        self.other, self.other_movie = found[PICTURE], found["MVI_0002.MOV"]
        self.buffer = self.closing(Lent(LARGE))

    def stall(self, position=0):
        self.service.order(f"stall {position} {MOVIE}")

    def check_that_the_others_are_served(self):
        self.assertEqual(read(self.healthy, self.other).take(), b"picture")
        self.assertTrue(streamed(self.healthy, self.other_movie, len(self.content)) == self.content)
        self.assertEqual(len(self.the_manager().devices()), 2)
        client = self.other_client()
        client.ask("open", self.other_path)
        self.assertEqual(client.ask("read", self.other, 0, 7), [0, "picture"])

    def check_stall(self, *calls):
        """Makes these calls, each of which waits for the medium; gives the answers that come after it."""
        self.stall()
        waiting = at_once(*calls)
        self.service.wait_for_stall()
        self.check_that_the_others_are_served()
        self.assertFalse(any(answer.done() for answer in waiting))
        self.service.take_back()
        return [answer.result(WAIT) for answer in waiting]

    def test_a_range_that_stalls_holds_up_its_own_device_alone(self):
        for length in (100, LARGE):
            answer, = self.check_stall(functools.partial(read, self.stuck, self.movie, 5, length))
            self.assertTrue(answer.take() == self.content[5:5 + length])

    def test_a_read_into_lent_memory_that_stalls_holds_up_its_own_device_alone(self):
        answer, = self.check_stall(
            lambda: read_into(self.stuck, self.movie, 5, LARGE, self.buffer.fd, self.buffer.size))
        self.assertEqual(answer.count, LARGE)
        self.assertTrue(self.buffer.bytes() == self.content[5:5 + LARGE])

    def test_a_stream_that_stalls_in_the_middle_holds_up_its_own_device_alone_and_goes_on(self):
        self.stall(2 * SLOT + 1)
        streaming, = at_once(lambda: streamed(self.stuck, self.movie, len(self.content)))
        self.service.wait_for_stall()
        self.check_that_the_others_are_served()
        self.assertFalse(streaming.done())
        self.service.take_back()
        self.assertTrue(streaming.result(WAIT) == self.content)

    def test_a_stream_that_is_closed_during_a_stall(self):
        self.stall()
        open_stream(self.stuck, self.movie)
        self.service.wait_for_stall()
        closing, = at_once(lambda: close_stream(self.stuck, self.movie))
        self.check_that_the_others_are_served()
        self.service.take_back()
        self.assertEqual(closing.result(WAIT), (0, 0))
        self.assertEqual(self.service.descriptors_below(self.path), [])
        self.assertTrue(read(self.stuck, self.movie, 1, LARGE).take() == self.content[1:1 + LARGE])

    def test_sixteen_stalled_streams_hold_up_their_own_device_alone(self):
        names = [f"MVI_10{number}.MOV" for number in range(10, 26)]
        device, path, found = self.card({name: self.content for name in names}, "MANY")
        self.service.order("stall 0 .MOV")
        for name in names:
            open_stream(device, found[name])
        self.service.wait_for_stall()
        self.assertEqual(read(self.healthy, self.other).take(), b"picture")
        client = self.other_client()
        client.ask("open", self.other_path)
        self.assertEqual(client.ask("read", self.other, 0, 7), [0, "picture"])
        self.service.take_back()
        for name in names:
            got = b"".join(piece[:] for _, piece in pieces(device, found[name], len(self.content)))
            self.assertTrue(got == self.content, name)
            close_stream(device, found[name])
        self.assertEqual(self.service.descriptors_below(path), [])

    def test_a_client_that_is_killed_during_a_stall_is_forgotten_after_it(self):
        client = self.other_client()
        client.ask("open", self.path)
        self.assertEqual(client.ask("read_into_lent", self.movie, LARGE, 1), [0, LARGE])
        client.ask("open_stream", self.movie)
        client.ask("take_piece", self.movie, 0, SLOT)
        self.stall()
        client.tell("read_into_lent", self.movie, LARGE, 1)
        self.service.wait_for_stall()
        client.kill()
        self.check_that_the_others_are_served()
        self.service.take_back()
        wait_until(lambda: not self.service.descriptors_below(self.path), "its stream to be closed")
        wait_until(lambda: not self.memory_named("lent"), "its buffers to be unmapped")
        self.assertTrue(read(self.stuck, self.movie, 1, LARGE).take() == self.content[1:1 + LARGE])

    def test_a_card_that_goes_during_a_stall(self):
        self.stall()
        open_stream(self.stuck, self.movie)
        self.service.wait_for_stall()
        os.rename(self.path, f"{self.service.folder}/away")
        wait_until(lambda: self.the_manager().named("notifyRemovedDevice"), "the removal")
        wait_until(self.stuck.closed.is_set, "the end of the device's connection")
        self.assertEqual(read(self.healthy, self.other).take(), b"picture")
        self.service.take_back()
        away = f"{self.service.folder}/away"
        wait_until(lambda: not self.service.descriptors_below(away), "its descriptors to go")
        wait_until(lambda: not self.memory_named("brivod-slot"), "its memory to go")

    def check_that_sigterm_ends_it(self):
        self.service.wait_for_stall()
        self.service.process.send_signal(signal.SIGTERM)
        self.assertEqual(self.service.process.wait(WAIT), 0)
        self.service.process = None

    def test_sigterm_ends_a_service_whose_range_stalls(self):
        self.stall()
        waiting, = at_once(lambda: read(self.stuck, self.movie, 0, LARGE))
        self.check_that_sigterm_ends_it()
        self.assertIsNotNone(waiting.exception(WAIT), "no answer")

    def test_sigterm_ends_a_service_whose_stream_stalls_and_another_takes_its_place(self):
        self.stall()
        open_stream(self.stuck, self.movie)
        self.check_that_sigterm_ends_it()
        wait_until(self.stuck.closed.is_set, "the end of the device's connection")
        self.service.take_back()
        if os.path.exists(f"{self.service.runtime}/manager"):
            os.remove(f"{self.service.runtime}/manager")  # so that start() waits for the new one
        self.service.start()
        manager = self.manager()
        device = self.device(manager, self.path)
        handle = self.handles_on(device, MOVIE)[MOVIE]
        self.assertTrue(streamed(device, handle, len(self.content)) == self.content)


if __name__ == "__main__":
    unittest.main()
