# SPDX-License-Identifier: MIT
"""Reading the bytes of objects: streams with reading ahead, and ranges."""
import functools
import os
import unittest

from gi.repository import GLib
from harness import LoopCard, ServiceTest, make_card, needs_root, run, wait_until
from reading import BAD_RANGE, LARGE, LONGEST, READ, SLOT, TOO_LONG, Answer, Reads, at_once, call, close_stream
from reading import open_stream, pieces, read, sparse, streamed


class StreamTest(Reads, ServiceTest):
    def test_a_stream_gives_every_byte_of_a_file_in_order(self):
        content = os.urandom(7 * SLOT + 12_345)
        device, _, found = self.card({"MVI_0001.MOV": content})
        self.assertTrue(streamed(device, found["MVI_0001.MOV"], len(content)) == content)

    def test_a_file_that_ends_on_the_border_of_a_piece(self):
        contents = {f"MVI_000{slots}.MOV": os.urandom(slots * SLOT) for slots in (1, 2, 5, 6)}
        device, _, found = self.card(contents)
        for name, content in contents.items():
            self.assertTrue(streamed(device, found[name], len(content)) == content, name)

    def test_a_file_of_one_byte(self):
        device, _, found = self.card({"IMG_0001.JPG": b"x"})
        self.assertEqual(streamed(device, found["IMG_0001.JPG"], 1), b"x")

    def test_a_file_of_no_bytes_opens_and_closes_and_has_no_range(self):
        device, path, found = self.card({"IMG_0001.JPG": b""})
        handle = found["IMG_0001.JPG"]
        self.assertEqual(open_stream(device, handle), (0, 0))
        self.assertEqual(read(device, handle).code, BAD_RANGE)
        self.assertEqual(read(device, handle, 0, 1).code, BAD_RANGE)
        self.assertEqual(close_stream(device, handle), (0, 0))
        self.assertEqual(self.service.descriptors_below(path), [])

    def test_a_file_of_more_than_four_gigabytes(self):
        size = (4 << 30) + 3 * SLOT + 5
        marks = {0: b"first", (4 << 30) - 3: b"across", (4 << 30) + SLOT + 77: b"beyond", size - 4: b"last"}
        device, _, found = self.card({"MVI_0001.MOV": lambda path: sparse(path, size, marks.items())})
        handle = found["MVI_0001.MOV"]
        self.assertEqual(device.wait_for("MVI_0001.MOV")["MVI_0001.MOV"].size, size)
        self.assertEqual(open_stream(device, handle), (0, 0))
        end, seen = 0, dict.fromkeys(marks, b"")
        for offset, piece in pieces(device, handle, size):
            self.assertEqual(len(piece), min(SLOT, size - offset))
            self.assertEqual(piece[len(piece) // 2 - 2], 0)
            for place, mark in marks.items():  # a mark may lie in two pieces
                seen[place] += piece[max(place - offset, 0):max(place + len(mark) - offset, 0)]
            end = offset + len(piece)
        self.assertEqual((end, seen), (size, marks))
        self.assertEqual(close_stream(device, handle), (0, 0))
        for place, mark in marks.items():
            self.assertEqual(read(device, handle, place, len(mark)).take(), mark)

    def test_a_read_away_from_the_next_piece_is_an_empty_success_and_ranges_work_after_the_close(self):
        content = os.urandom(9 * SLOT)
        device, _, found = self.card({"MVI_0001.MOV": content})
        handle = found["MVI_0001.MOV"]
        open_stream(device, handle)
        self.assertTrue(read(device, handle, 0, SLOT).take() == content[:SLOT])
        for offset in (1, SLOT - 1, SLOT + 1, 8 * SLOT + 5):
            answer = read(device, handle, offset, 1000)
            self.assertEqual((answer.code, answer.take()), (0, b""))
        close_stream(device, handle)
        for offset in (1, SLOT - 1, SLOT + 1, 8 * SLOT + 5):
            self.assertEqual(read(device, handle, offset, 1000).take(), content[offset:offset + 1000])

    def test_a_read_where_a_piece_begins_gets_all_of_it_whatever_its_length(self):
        content = os.urandom(2 * SLOT + 10)
        device, _, found = self.card({"MVI_0001.MOV": content})
        handle = found["MVI_0001.MOV"]
        open_stream(device, handle)
        self.assertTrue(read(device, handle, 0, 1).take() == content[:SLOT])
        self.assertTrue(read(device, handle, SLOT, SLOT + 10).take() == content[SLOT:2 * SLOT])
        self.assertEqual(read(device, handle, 2 * SLOT, 10).take(), content[2 * SLOT:])

    def test_a_bad_range_in_a_stream_is_refused_and_takes_no_piece(self):
        content = os.urandom(3 * SLOT)
        device, _, found = self.card({"MVI_0001.MOV": content})
        handle = found["MVI_0001.MOV"]
        open_stream(device, handle)
        for offset, length, code in ((0, LONGEST + 1, TOO_LONG), (0, 0, BAD_RANGE), (3 * SLOT, 1, BAD_RANGE),
                                     (2 * SLOT, SLOT + 1, BAD_RANGE), (None, None, TOO_LONG)):
            answer = read(device, handle, offset, length)
            self.assertEqual((answer.code, answer.take()), (code, b""))
        self.assertTrue(b"".join(piece[:] for _, piece in pieces(device, handle, len(content))) == content)

    def test_a_stream_opened_twice_and_closed_once_stays_open(self):
        content = os.urandom(3 * SLOT)
        device, path, found = self.card({"MVI_0001.MOV": content})
        handle = found["MVI_0001.MOV"]
        open_stream(device, handle)
        open_stream(device, handle)
        self.assertEqual(len(self.service.descriptors_below(path)), 1)
        self.assertEqual(close_stream(device, handle), (0, 0))
        self.assertEqual(len(self.service.descriptors_below(path)), 1)
        self.assertTrue(read(device, handle, 0, SLOT).take() == content[:SLOT])
        self.assertEqual(close_stream(device, handle), (0, 0))
        self.assertEqual(self.service.descriptors_below(path), [])

    def test_closing_what_is_not_open_is_a_success_that_does_nothing(self):
        device, path, found = self.card({"IMG_0001.JPG": b"picture"})
        for handle in (found["IMG_0001.JPG"], found["DCIM"], 4_000_000_000):
            self.assertEqual(close_stream(device, handle), (0, 0))
        self.assertEqual(self.service.descriptors_below(path), [])
        self.assertEqual(read(device, found["IMG_0001.JPG"]).take(), b"picture")

    def test_the_seventeenth_stream_gives_ranges_as_asked_for(self):
        contents = {f"MVI_00{number}.MOV": os.urandom(SLOT + number) for number in range(10, 27)}
        device, path, found = self.card(contents)
        for name in contents:
            self.assertEqual(open_stream(device, found[name]), (0, 0))
        self.assertEqual(len(self.service.descriptors_below(path)), 17)
        *others, last = contents
        self.assertEqual(read(device, found[last], 5, 1000).take(), contents[last][5:1005])
        for name in others:
            got = b"".join(piece[:] for _, piece in pieces(device, found[name], len(contents[name])))
            self.assertTrue(got == contents[name], name)
        device.close()
        wait_until(lambda: not self.service.descriptors_below(path), "the streams to be closed")

    def test_two_clients_that_stream_one_object_never_get_wrong_bytes_and_ranges_work_afterwards(self):
        content = os.urandom(6 * SLOT)
        device, path, found = self.card({"MVI_0001.MOV": content})
        handle = found["MVI_0001.MOV"]
        other = self.other_client()
        other.ask("open", path)
        open_stream(device, handle)
        other.ask("open_stream", handle)
        for offset in range(0, len(content), SLOT):
            self.assertIn(read(device, handle, offset, SLOT).take(), (b"", content[offset:offset + SLOT]))
            self.assertIn(other.ask("take_piece", handle, offset, SLOT)[1], (0, SLOT))
        close_stream(device, handle)
        other.kill()
        wait_until(lambda: not self.service.descriptors_below(path), "the other's stream to be closed")
        self.assertTrue(read(device, handle, 3, LONGEST).take() == content[3:LONGEST + 3])

    def test_a_client_that_vanishes_in_the_middle_leaves_no_descriptor_and_no_memory(self):
        device, path, found = self.card({"MVI_0001.MOV": lambda path: sparse(path, 40 * SLOT)})
        read(device, found["MVI_0001.MOV"], 0, LARGE).close()
        idle, targets = self.service.resident_kilobytes(), len(self.service.targets())
        other = self.other_client()
        other.ask("open", path)
        other.ask("open_stream", found["MVI_0001.MOV"])
        for offset in range(0, 10 * SLOT, SLOT):
            self.assertEqual(other.ask("take_piece", found["MVI_0001.MOV"], offset, SLOT), [0, SLOT])
        self.assertEqual(len(self.service.descriptors_below(path)), 1)
        other.kill()
        wait_until(lambda: not self.service.descriptors_below(path), "its stream to be closed")
        wait_until(lambda: not self.memory_named("brivod-slot"), "the memory of its stream to go")
        wait_until(lambda: len(self.service.targets()) <= targets, "its descriptors to go")
        if not self.service.is_instrumented():
            wait_until(lambda: self.service.resident_kilobytes() < idle + 8_000, "its memory to go")

    def test_a_file_that_shrinks_in_the_middle_ends_where_it_ends_now(self):
        content = os.urandom(20 * SLOT)
        device, path, found = self.card({"MVI_0001.MOV": content})
        handle = found["MVI_0001.MOV"]
        open_stream(device, handle)
        self.assertTrue(read(device, handle, 0, SLOT).take() == content[:SLOT])
        end = 8 * SLOT + 777  # farther than is read ahead
        os.truncate(f"{path}/DCIM/100ABCDE/MVI_0001.MOV", end)
        got = b"".join(piece[:] for _, piece in pieces(device, handle, len(content), SLOT))
        self.assertTrue(got == content[SLOT:end])
        close_stream(device, handle)
        self.assertEqual(read(device, handle, end - 5, 10).take(), content[end - 5:end])
        self.assertTrue(read(device, handle, end - LARGE, 2 * LARGE).take() == content[end - LARGE:end])
        for length in (10, LARGE):
            answer = read(device, handle, end, length)
            self.assertEqual((answer.code, answer.take()), (0, b""))

    def test_a_file_that_grows_is_as_long_as_the_catalogue_says(self):
        content = os.urandom(SLOT + 10)
        device, path, found = self.card({"MVI_0001.MOV": content})
        with open(f"{path}/DCIM/100ABCDE/MVI_0001.MOV", "ab") as file:
            file.write(bytes(5 * SLOT))
        handle = found["MVI_0001.MOV"]
        open_stream(device, handle)
        self.assertTrue(read(device, handle, 0, SLOT).take() == content[:SLOT])
        self.assertEqual(read(device, handle, SLOT, 10).take(), content[SLOT:])
        self.assertEqual(read(device, handle, SLOT + 10, 1).code, BAD_RANGE)
        close_stream(device, handle)
        self.assertEqual(read(device, handle, SLOT, 10).take(), content[SLOT:])
        self.assertEqual(read(device, handle, SLOT, 11).code, BAD_RANGE)


class RangeTest(Reads, ServiceTest):
    def setUp(self):
        super().setUp()
        self.content = os.urandom(LONGEST + 100)
        self.reader, self.path, found = self.card({"MVI_0001.MOV": self.content, "IMG_0001.JPG": b"picture"})
        self.movie, self.picture, self.folder = found["MVI_0001.MOV"], found["IMG_0001.JPG"], found["DCIM"]

    def tearDown(self):
        self.assertEqual(self.service.descriptors_below(self.path), [])
        super().tearDown()

    def test_the_longest_range_and_one_byte_more(self):
        self.assertTrue(read(self.reader, self.movie, 0, LONGEST).take() == self.content[:LONGEST])
        self.assertTrue(read(self.reader, self.movie, 100, LONGEST).take() == self.content[100:])
        answer = read(self.reader, self.movie, 0, LONGEST + 1)
        self.assertEqual((answer.code, answer.take()), (TOO_LONG, b""))
        self.assertEqual(read(self.reader, self.movie, 101, LONGEST).code, BAD_RANGE)

    def test_ranges_before_and_after_the_size_at_which_data_travels_as_memory(self):
        for length in (1, LARGE - 1, LARGE, LARGE + 1, SLOT, LONGEST - 1):
            answer = read(self.reader, self.movie, 7, length)
            self.assertEqual(answer.fd is not None, length >= LARGE)
            self.assertTrue(answer.take() == self.content[7:7 + length], length)

    def test_a_folder_has_no_bytes_and_no_streams(self):
        for offset, length in ((None, None), (0, 1), (0, 100), (5000, 1), (0, LONGEST)):
            answer = read(self.reader, self.folder, offset, length)
            self.assertIn(answer.code, (0, BAD_RANGE))
            self.assertEqual(answer.take(), b"")
        self.assertEqual(open_stream(self.reader, self.folder), (0, 0))
        self.assertEqual(read(self.reader, self.folder, 0, 1).take(), b"")
        self.assertEqual(close_stream(self.reader, self.folder), (0, 0))

    def test_numbers_that_are_negative_or_huge(self):
        huge = (GLib.Variant("t", 2**64 - 1), GLib.Variant("x", -1), GLib.Variant("i", -1), GLib.Variant("x", -2**63),
                GLib.Variant("x", 2**63 - 1), GLib.Variant("t", 2**63), GLib.Variant("d", 1e300),
                GLib.Variant("d", float("inf")))
        for number in huge:
            answer = read(self.reader, self.picture, number, 1)
            self.assertEqual((answer.code, answer.take()), (BAD_RANGE, b""), number)
            answer = read(self.reader, self.picture, 1, number)
            self.assertIn(answer.code, (BAD_RANGE, TOO_LONG), number)
            self.assertEqual(answer.take(), b"")
            answer = read(self.reader, self.picture, number, number)
            self.assertIn(answer.code, (BAD_RANGE, TOO_LONG), number)
            self.assertEqual(answer.take(), b"")

    def test_a_fraction_below_zero_and_one_that_is_no_number_count_as_zero(self):
        for fraction in (-1.0, -1e300, float("-inf"), float("nan")):
            number = GLib.Variant("d", fraction)
            self.assertEqual(read(self.reader, self.picture, number, 3).take(), b"pic")
            self.assertEqual(read(self.reader, self.picture, 0, number).code, BAD_RANGE)

    def test_numbers_in_every_type_of_number(self):
        for kind in "ynqiuxtd":
            two, three = GLib.Variant(kind, 2), GLib.Variant(kind, 3)
            self.assertEqual(read(self.reader, self.picture, two, three).take(), b"ctu")
        true = GLib.Variant("b", True)
        self.assertEqual(read(self.reader, self.picture, true, true).take(), b"i")

    def test_what_is_no_number_is_a_bad_range(self):
        for other in (GLib.Variant("s", "1"), GLib.Variant("ay", b"1"), GLib.Variant("as", []),
                      GLib.Variant("a{sv}", {}), GLib.Variant("v", GLib.Variant("s", "2"))):
            self.assertEqual(read(self.reader, self.picture, other, 1).code, BAD_RANGE, other)
            self.assertEqual(read(self.reader, self.picture, 0, other).code, BAD_RANGE, other)

    def test_stream_options_that_are_not_true_are_as_good_as_none(self):
        for other in (GLib.Variant("b", False), GLib.Variant("s", "yes"), GLib.Variant("i", 0)):
            for option in ("OVReadBufferStreamOpen", "OVReadBufferStreamClose"):
                self.assertEqual(Answer(*call(self.reader, READ, self.picture, {option: other})).take(), b"picture")

    def test_fifteen_long_reads_under_way_at_once(self):
        answers = at_once(*[functools.partial(read, self.reader, self.movie, offset, LONGEST) for offset in range(15)])
        for offset, answer in enumerate(answers):
            self.assertTrue(answer.result().take() == self.content[offset:offset + LONGEST])


class YankedCardTest(Reads, ServiceTest):
    @needs_root
    def test_a_card_whose_medium_goes_away_in_the_middle_of_a_stream(self):
        card = self.closing(LoopCard(self.service, "YANKED", megabytes=96))
        content = os.urandom(30 * SLOT)
        make_card(card.point, {"100ABCDE/MVI_0001.MOV": content})
        other, _, found = self.card({"IMG_0001.JPG": b"picture"}, "OTHER")
        device = self.device(self.the_manager(), card.point)
        handle = self.handles_on(device, "MVI_0001.MOV")["MVI_0001.MOV"]
        open_stream(device, handle)
        self.assertTrue(read(device, handle, 0, SLOT).take() == content[:SLOT])
        run("sync", "-f", card.point)
        os.truncate(card.image, 0)
        with open("/proc/sys/vm/drop_caches", "w", encoding="ascii") as caches:
            caches.write("3")
        got = b"".join(piece[:] for _, piece in pieces(device, handle, len(content), SLOT))
        self.assertTrue(got == content[SLOT:SLOT + len(got)])
        self.assertLess(len(got), 10 * SLOT, "what was read ahead")
        self.assertEqual(close_stream(device, handle), (0, 0))
        for length in (100, LARGE):
            answer = read(device, handle, 20 * SLOT, length)
            self.assertEqual((answer.code, answer.take()), (0, b""))
        # The others notice nothing, and the card can go.
        self.assertEqual(read(other, found["IMG_0001.JPG"]).take(), b"picture")
        self.assertEqual(self.service.descriptors_below(card.point), [])
        card.unmount()
        wait_until(device.closed.is_set, "the end of the device's connection")
        self.assertEqual(len(self.the_manager().devices()), 1)


if __name__ == "__main__":
    unittest.main()
