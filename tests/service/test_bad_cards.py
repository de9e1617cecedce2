# SPDX-License-Identifier: MIT
"""Cards that vanish at the wrong moment, and cards with things on them that no camera wrote."""
import os
import signal
import unittest

from harness import LoopCard, ServiceTest, make_card, needs, needs_root, run, wait_until

BAD_RANGE = -21449
WHOLE_WALK = 4_000  # files; enough for a walk to be in the middle of


def drop_caches():
    with open("/proc/sys/vm/drop_caches", "w", encoding="ascii") as caches:
        caches.write("3")


class VanishingCardTest(ServiceTest):
    """The card goes in the middle of what is done with it; what is left of it must be nothing."""

    def setUp(self):
        super().setUp()
        self.service_manager = self.manager()

    def check_that_nothing_is_left(self, point, device):
        wait_until(lambda: self.service_manager.named("notifyRemovedDevice"), "the removal")
        wait_until(device.closed.is_set, "the end of the device's connection")
        wait_until(lambda: not self.service.descriptors_below(point), "the descriptors on it to go")
        # The device's own thread ends; those of the pool stay a while for what comes next.
        wait_until(lambda: not self.device_threads(), "the device's thread to end")
        self.assertEqual(self.service_manager.devices(), [])

    def device_threads(self):
        return [name for name in self.service.threads() if name.startswith("OVDeviceOp")]

    def full_loop_card(self, kind="ext4"):
        card = LoopCard(self.service, "FULL", kind, megabytes=64)
        self.addCleanup(card.close)
        files = {f"{100 + i // 1000}ABCDE/IMG_{i % 1000:04}.JPG": b"x" for i in range(WHOLE_WALK)}
        make_card(card.point, {**files, "199ABCDE/IMG_0001.MOV": bytes(8_000_000)})
        return card

    @needs_root
    def test_a_card_unmounted_lazily_in_the_middle_of_the_walk(self):
        card = self.full_loop_card()
        device = self.device(self.service_manager, card.point)
        device.enumerate()
        wait_until(lambda: len(device.named("notifyAddedItems")) > 100, "the walk to be on its way")
        run("umount", "-l", card.point)
        self.check_that_nothing_is_left(card.point, device)

    @needs_root
    def test_a_card_unmounted_lazily_with_a_stream_open(self):
        card = self.full_loop_card()
        device = self.device(self.service_manager, card.point)
        device.enumerate()
        handle = device.wait_for("IMG_0001.MOV")["IMG_0001.MOV"].handle
        self.assertEqual(device.read(handle, OVReadBufferStreamOpen=True)["errCode"], 0)
        self.assertEqual(len(self.device_threads()), 1)
        run("umount", "-l", card.point)
        self.check_that_nothing_is_left(card.point, device)
        run("losetup", "-d", card.loop)
        wait_until(lambda: card.loop not in run("losetup", "-l", "-O", "NAME"), "the file system to be let go")

    @needs_root
    @needs("mkfs.exfat", "mount.exfat-fuse")
    @unittest.skipUnless(os.path.exists("/dev/fuse"), "no /dev/fuse")
    def test_a_card_whose_file_system_dies_between_two_reads(self):
        card = self.full_loop_card("exfat")
        device = self.device(self.service_manager, card.point)
        device.enumerate()
        handle = device.wait_for("IMG_0001.MOV")["IMG_0001.MOV"].handle
        self.assertEqual(len(device.read(handle, 0, 1_000_000)["OVReadData"]), 1_000_000)
        server = int(run("pgrep", "-f", f"mount.exfat-fuse {card.loop}").split()[0])
        os.kill(server, signal.SIGKILL)
        answer = device.read(handle, 4_000_000, 4_000_000)
        self.assertEqual((answer["errCode"], answer["OVReadData"]), (0, b""), "the medium gave nothing")
        run("umount", "-l", card.point)
        self.check_that_nothing_is_left(card.point, device)

    @needs_root
    @needs("mkfs.exfat", "mount.exfat-fuse")
    @unittest.skipUnless(os.path.exists("/dev/fuse"), "no /dev/fuse")
    def test_a_card_that_does_not_answer_stops_nothing_but_itself(self):
        card = self.full_loop_card("exfat")
        stuck = self.other_client()
        stuck.ask("open", card.point)
        stuck.ask("enumerate")
        handle = stuck.ask("wait_for", "IMG_0001.MOV")["IMG_0001.MOV"]
        server = int(run("pgrep", "-f", f"mount.exfat-fuse {card.loop}").split()[0])
        os.kill(server, signal.SIGSTOP)
        self.addCleanup(os.kill, server, signal.SIGCONT)
        drop_caches()
        stuck.tell("read", handle, 0, 4)
        for number in range(3):
            path = self.folder_card(f"CARD{number}", {"100ABCDE/IMG_0001.JPG": b"picture"})
            device = self.device(self.service_manager, path)
            device.enumerate()
            found = device.wait_for("IMG_0001.JPG")
            self.assertEqual(device.read(found["IMG_0001.JPG"].handle)["OVReadData"], b"picture")
        os.kill(server, signal.SIGCONT)
        self.assertEqual(stuck.answer(), [0, "\0\0\0\0"])

    @needs_root
    def test_a_card_whose_medium_fails_under_the_mount(self):
        card = self.full_loop_card()
        device = self.device(self.service_manager, card.point)
        device.enumerate()
        handle = device.wait_for("IMG_0001.MOV")["IMG_0001.MOV"].handle
        os.truncate(card.image, 0)
        drop_caches()
        answer = device.read(handle, 0, 4_000_000)
        self.assertEqual(answer["errCode"], 0)
        self.assertEqual(answer["OVReadData"], bytes(len(answer["OVReadData"])), "what came is what was there")
        run("umount", "-l", card.point)
        self.check_that_nothing_is_left(card.point, device)

    def test_a_folder_card_moved_away_at_any_moment_of_the_walk(self):
        for batches in (0, 1, 10, 100, 1000):
            files = {f"{100 + i // 1000}ABCDE/IMG_{i % 1000:04}.JPG": b"x" for i in range(WHOLE_WALK)}
            path = self.folder_card(f"CARD{batches}", files)
            device = self.device(self.service_manager, path)
            device.enumerate()
            wait_until(lambda d=device, b=batches: len(d.named("notifyAddedItems")) >= b, "the walk")
            os.rename(path, f"{self.service.folder}/away{batches}")
            self.check_that_nothing_is_left(path, device)
            self.service_manager.signals.clear()

    def test_a_file_that_is_gone_or_shorter_than_it_was(self):
        path = self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": b"picture", "100ABCDE/IMG_0002.JPG": b"picture"})
        device = self.device(self.service_manager, path)
        device.enumerate()
        found = device.wait_for("IMG_0001.JPG", "IMG_0002.JPG")
        os.remove(f"{path}/DCIM/100ABCDE/IMG_0001.JPG")
        os.truncate(f"{path}/DCIM/100ABCDE/IMG_0002.JPG", 3)
        gone = device.read(found["IMG_0001.JPG"].handle, 0, 7)
        self.assertEqual((gone["errCode"], gone["OVReadData"]), (0, b""))
        self.assertEqual(device.read(found["IMG_0002.JPG"].handle, 0, 7)["OVReadData"], b"pic")
        self.assertEqual(device.read(found["IMG_0002.JPG"].handle, 5, 2)["OVReadData"], b"")


class StrangeCardTest(ServiceTest):
    def catalogue_of(self, path, *names):
        device = self.device(self.manager(), path)
        device.enumerate()
        return device, device.wait_for(*names)

    def test_a_directory_of_a_hundred_thousand_entries(self):
        path = self.folder_card("CARD", {})
        folder = f"{path}/DCIM/100ABCDE"
        os.mkdir(folder)
        # DCF numbers go to 9999 only; ten prefixes make a hundred thousand.
        for prefix in ("IMG_", "DSC_", "DSCF", "P101", "PICT", "MVI_", "SDC1", "DSCN", "_MG_", "IMGP"):
            for number in range(10_000):
                os.close(os.open(f"{folder}/{prefix}{number:04}.JPG", os.O_CREAT | os.O_WRONLY))
        device = self.device(self.manager(), path)
        device.enumerate()
        wait_until(lambda: len(device.signals) >= 100_002 + 2, "the whole catalogue, the count and a percentage", 240)
        self.assertEqual(device.ready_counts(), [100_002])
        handles = {dataset.handle for dataset in device.datasets()}
        self.assertEqual(len(handles), 100_002)
        self.assertEqual(device.read(max(handles), 0, 1)["errCode"], BAD_RANGE, "an empty file has no range")

    def test_names_of_255_bytes_are_no_dcf_names_and_hurt_nobody(self):
        path = self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": b"x", f"100ABCDE/{'N' * 251}.JPG": b"x"})
        os.mkdir(f"{path}/DCIM/{'9' * 255}")
        device, _ = self.catalogue_of(path, "IMG_0001.JPG")
        self.assertEqual(device.ready_counts(), [3])

    def test_names_with_newlines_and_invalid_utf_8(self):
        path = self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": b"x"})
        for name in (b"IMG_\n002.JPG", b"IMG_0003.JPG\n<3>forged | line", b"\xff\xfe_0004.JPG", b"IMG_0005.J\xc3"):
            with open(os.fsencode(f"{path}/DCIM/100ABCDE/") + name, "wb"):
                pass
        os.mkdir(os.fsencode(f"{path}/DCIM/") + b"100\xff\xfeABC")
        # The name rule looks at each line of a name.
        device, found = self.catalogue_of(path, "IMG_0001.JPG", "IMG_0003.JPG\n<3>forged | line")
        self.assertEqual(device.ready_counts(), [4])
        self.assertEqual(device.delete(found["IMG_0003.JPG\n<3>forged | line"].handle)["errCode"], 0)
        self.assertIn("IMG_0003.JPG\\x0a<3>forged | line", self.service.log())
        self.assertFalse([line for line in self.service.log().splitlines() if line.startswith("<3>forged")])

    def test_a_volume_whose_own_name_is_not_utf_8(self):
        path = os.fsencode(self.service.volumes) + b"/CARD\xff\n1"
        make_card(os.fsdecode(path), {"100ABCDE/IMG_0001.JPG": b"picture"})
        device, found = self.catalogue_of(f"{self.service.volumes}/CARD\ufffd\n1", "IMG_0001.JPG")
        self.assertEqual(device.properties["OVDeviceName"], "CARD\ufffd\n1")
        self.assertEqual(device.read(found["IMG_0001.JPG"].handle)["OVReadData"], b"picture")

    def test_symbolic_links_to_files_of_the_host_are_not_followed(self):
        secret = f"{self.service.folder}/secret"
        with open(secret, "wb") as file:
            file.write(b"secret of the host")
        path = self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": b"x"})
        os.symlink(secret, f"{path}/DCIM/100ABCDE/IMG_0002.JPG")
        os.symlink(self.service.folder, f"{path}/DCIM/101ABCDE")
        device, found = self.catalogue_of(path, "IMG_0001.JPG")
        # A file that becomes a link after it was listed.
        os.remove(f"{path}/DCIM/100ABCDE/IMG_0001.JPG")
        os.symlink(secret, f"{path}/DCIM/100ABCDE/IMG_0001.JPG")
        self.assertEqual(device.read(found["IMG_0001.JPG"].handle, 0, 1)["OVReadData"], b"")
        # A folder that becomes a link.
        os.rename(f"{path}/DCIM/100ABCDE", f"{path}/old")
        os.mkdir(f"{self.service.folder}/elsewhere")
        with open(f"{self.service.folder}/elsewhere/IMG_0001.JPG", "wb") as file:
            file.write(b"secret")
        os.symlink(f"{self.service.folder}/elsewhere", f"{path}/DCIM/100ABCDE")
        self.assertEqual(device.read(found["IMG_0001.JPG"].handle, 0, 1)["OVReadData"], b"")
        self.assertNotIn("IMG_0002.JPG", {dataset.filename for dataset in device.datasets()})

    def test_fifos_and_devices_named_like_pictures_do_not_hang_it(self):
        path = self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": b"picture"})
        os.mkfifo(f"{path}/DCIM/100ABCDE/IMG_0002.JPG")
        os.mkfifo(f"{path}/DCIM/101ABCDE")
        device, found = self.catalogue_of(path, "IMG_0001.JPG")
        self.assertNotIn("IMG_0002.JPG", found)
        os.remove(f"{path}/DCIM/100ABCDE/IMG_0001.JPG")
        os.mkfifo(f"{path}/DCIM/100ABCDE/IMG_0001.JPG")
        self.assertEqual(device.read(found["IMG_0001.JPG"].handle, 0, 7)["OVReadData"], b"")

    def test_a_dcim_that_is_a_file_is_no_camera(self):
        os.mkdir(f"{self.service.volumes}/CARD")
        with open(f"{self.service.volumes}/CARD/DCIM", "wb"):
            pass
        good = self.folder_card("GOOD", {"100ABCDE/IMG_0001.JPG": b"x"})
        manager = self.manager()
        manager.wait_for_device(good)
        self.assertEqual([d["OVDevicePrimaryIdentifier"] for d in manager.devices()], [good])

    def test_a_dcim_that_becomes_a_file_before_the_walk(self):
        path = self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": b"x"})
        device = self.device(self.manager(), path)
        os.rename(f"{path}/DCIM", f"{path}/old")
        with open(f"{path}/DCIM", "wb"):
            pass
        device.enumerate()
        wait_until(device.ready_counts, "the count")
        self.assertLessEqual(len(device.datasets()), 1)
