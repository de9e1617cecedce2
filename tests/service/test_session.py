# SPDX-License-Identifier: MIT
"""A whole session, from the list of devices to the removal of the card, on real volumes."""
import os
import stat
import unittest

from gi.repository import GLib
from harness import LoopCard, ServiceTest, make_card, needs, needs_root, wait_until

NO_SUCH_OBJECT = -21450
BAD_RANGE = -21449
TOO_LONG = -21446
NO_DOWNLOAD = -9934
NOT_DELETED = -9941
TOP_LEVEL = 0xFFFFFFFE


class SessionTest(ServiceTest):
    def session(self, path, keeps_birth_time):
        """Drives one session on the mounted card at `path`."""
        big = os.urandom(5_000_000)
        make_card(path, {
            "100ABCDE/IMG_0001.JPG": b"first picture",
            "100ABCDE/IMG_0001.CR2": b"its raw twin",
            "100ABCDE/IMG_0002.JPG": b"second picture",
            "100ABCDE/IMG_0003.MOV": big,
            "100ABCDE/notes.txt": b"not a camera file",
            "README.TXT": b"neither",
        })
        os.utime(f"{path}/DCIM/100ABCDE/IMG_0001.JPG", (1_600_000_000, 1_600_000_000))
        manager = self.manager()
        context = manager.wait_for_device(path)
        self.assertEqual(set(context), {"OVDevicePrimaryIdentifier", "OVDeviceHandle"})
        self.assertEqual(len(context["OVDeviceHandle"]), 36)

        # Opening, starting, interests.
        opened = manager.open(context["OVDeviceHandle"])
        self.assertEqual(set(opened), {"OVDeviceEndpoint", "OVInternalDeviceUUID"})
        self.assertEqual(opened["OVInternalDeviceUUID"], context["OVDeviceHandle"])
        device = self.device(manager, path)
        self.assertEqual(device.properties["OVDeviceName"], os.path.basename(path))
        self.assertEqual(device.properties["OVDeviceVolumePath"], path)
        self.assertEqual(device.properties["OVDeviceLocked"], 0)
        self.assertIs(device.properties["OVDeviceStarted"], True)
        self.assertEqual(device.start_using(), device.properties)
        device.register("OVDeviceIsReady")

        # The catalogue, byte by byte.
        device.enumerate()
        names = ["DCIM", "100ABCDE", "IMG_0001.JPG", "IMG_0001.CR2", "IMG_0002.JPG", "IMG_0003.MOV"]
        found = device.wait_for(*names)
        self.assertEqual(sorted(found), sorted(names))
        self.assertEqual(device.ready_counts(), [1 + 1 + 4])
        self.assertEqual(device.signals[0][0], "postNotification", "the count comes first")
        self.assertEqual(device.notes()[0]["OVInternalDeviceUUID"], context["OVDeviceHandle"])
        wait_until(lambda: device.named("notifyContentCatalogPercentCompleted"), "the percentage")
        self.assertEqual(device.named("notifyContentCatalogPercentCompleted")[0].unpack(), (0,))
        shots = [sorted(d.filename for d in batch) for batch in device.batches() if len(batch) > 1]
        self.assertEqual(shots, [["IMG_0001.CR2", "IMG_0001.JPG"]], "the files of one shot travel together")
        for name, dataset in found.items():
            self.check_dataset(dataset, name, path, found, keeps_birth_time)

        # A second client gets the same catalogue, group by group.
        late = self.other_client()
        late.ask("open", path)
        late.ask("enumerate")
        handles = late.ask("wait_for", *names)
        self.assertEqual(handles, {name: dataset.handle for name, dataset in found.items()})
        self.assertEqual(late.ask("ready_counts"), [6])
        self.assertIn(["IMG_0001.JPG", "IMG_0001.CR2"], [sorted(b, reverse=True) for b in late.ask("batch_names")])

        # Ranges and their errors.
        picture, movie = found["IMG_0001.JPG"].handle, found["IMG_0003.MOV"].handle
        unknown = 4_000_000_000
        self.assertEqual(device.read(picture)["OVReadData"], b"first picture")
        self.assertEqual(device.read(picture, 6, 3)["OVReadData"], b"pic")
        echoed = device.read(picture, 0, 13, mine="kept")
        self.assertEqual((echoed["errCode"], echoed["mine"], echoed["OVReadLength"]), (0, "kept", 13))
        self.assertEqual(device.read(picture, 13, 1)["errCode"], BAD_RANGE)
        self.assertEqual(device.read(picture, 0, 0)["errCode"], BAD_RANGE)
        self.assertEqual(device.read(picture, 1)["errCode"], BAD_RANGE)
        self.assertEqual(device.read(picture, 2**64 - 5, 10)["errCode"], BAD_RANGE)
        self.assertEqual(device.read(movie)["errCode"], TOO_LONG)
        self.assertEqual(device.read(movie, 0, 4_194_305)["errCode"], TOO_LONG)
        self.assertEqual(device.read(movie, 0, 4_194_304)["OVReadData"], big[:4_194_304])
        self.assertEqual(device.read(movie, 4_194_304, 805_696)["OVReadData"], big[4_194_304:])
        self.assertEqual(device.read(unknown, 0, 1)["errCode"], BAD_RANGE)
        self.assertEqual(device.request("requestMetadataForObjectHandle", unknown), {"errCode": NO_SUCH_OBJECT})
        self.assertEqual(device.request("requestThumbnailDataForObjectHandle", unknown), {"errCode": NO_SUCH_OBJECT})
        self.assertEqual(device.request("requestDownloadObjectHandle", picture, {"mine": "kept"}),
                         {"mine": "kept", "errCode": NO_DOWNLOAD})

        # Deleting.
        second = found["IMG_0002.JPG"].handle
        self.assertEqual(device.delete(second), {"errCode": 0})
        self.assertFalse(os.path.exists(f"{path}/DCIM/100ABCDE/IMG_0002.JPG"))
        self.assertEqual(device.delete(second), {"errCode": 0}, "the second time, too")
        self.assertEqual(device.delete(found["100ABCDE"].handle)["errCode"], NOT_DELETED)
        self.assertEqual(device.read(second, 0, 1)["errCode"], BAD_RANGE)
        return manager, device, late

    def check_dataset(self, dataset, name, path, found, keeps_birth_time):
        folder = name in ("DCIM", "100ABCDE")
        places = {"DCIM": "DCIM", "100ABCDE": "DCIM/100ABCDE"}
        status = os.stat(f"{path}/{places.get(name, 'DCIM/100ABCDE/' + name)}")
        self.assertEqual(len(dataset.data), 2 * len(name) + 86)
        self.assertEqual(dataset.content_length, 2 * len(name) + 78)
        self.assertEqual(dataset.data[74], len(name) + 1)
        self.assertEqual(dataset.filename, name)
        self.assertEqual(dataset.padding, bytes(9))
        self.assertEqual(dataset.size, status.st_size)
        self.assertEqual(dataset.protection, 0 if os.access(path, os.W_OK) else 1)
        self.assertEqual(dataset.modified, int(status.st_mtime))
        if not keeps_birth_time:
            self.assertEqual(dataset.captured, int(status.st_mtime))
        elif name == "IMG_0001.JPG":
            self.assertGreater(dataset.captured, 1_600_000_000, "the time of its making, not of its change")
        parents = {"DCIM": TOP_LEVEL, "100ABCDE": found["DCIM"].handle}
        self.assertEqual(dataset.parent, parents.get(name, found["100ABCDE"].handle))
        self.assertEqual(dataset.association, 1 if folder else 0)
        never_set = (dataset.format, dataset.thumb_format, dataset.bit_depth)
        self.assertEqual(never_set, (0, 0, 0))
        self.assertEqual(dataset.thumb_size, 0 if folder else 1, "a thumbnail of unknown size")
        unknown = (dataset.thumb_offset, dataset.thumb_width, dataset.thumb_height, dataset.width, dataset.height)
        self.assertEqual(unknown, (0, 0, 0, 0, 0))


class MountedCardTest(SessionTest):
    def mounted_session(self, kind, keeps_birth_time):
        card = LoopCard(self.service, "EOS DIGITAL", kind)
        self.addCleanup(card.close)
        manager, device, late = self.session(card.point, keeps_birth_time)
        self.assertEqual(self.service.descriptors_below(card.point), [], "nothing is open on an idle volume")
        card.unmount()
        wait_until(lambda: manager.named("notifyRemovedDevice"), "the removal")
        removed = manager.named("notifyRemovedDevice")[0].unpack()[0]
        self.assertEqual(removed["OVDevicePrimaryIdentifier"], card.point)
        wait_until(device.closed.is_set, "the end of the device's connection")
        late.ask("wait_until_closed")
        self.assertEqual(manager.devices(), [])
        # The card comes back as a new device with new handles.
        card.mount()
        again = manager.wait_for_device(card.point)
        self.assertNotEqual(again["OVDeviceHandle"], device.handle)

    @needs_root
    def test_a_session_on_ext4(self):
        self.mounted_session("ext4", keeps_birth_time=True)

    @needs_root
    @needs("mkfs.exfat", "mount.exfat-fuse")
    @unittest.skipUnless(os.path.exists("/dev/fuse"), "no /dev/fuse")
    def test_a_session_on_exfat(self):
        self.mounted_session("exfat", keeps_birth_time=False)

    @needs_root
    def test_a_card_mounted_read_only_is_locked_and_deletes_nothing(self):
        content = f"{self.service.folder}/content"
        make_card(content, {"100ABCDE/IMG_0001.JPG": b"x"})
        card = LoopCard(self.service, "LOCKED", content=content, options="ro")
        self.addCleanup(card.close)
        device = self.device(self.manager(), card.point)
        self.assertEqual(device.properties["OVDeviceLocked"], 1)
        device.enumerate()
        dataset = device.wait_for("IMG_0001.JPG")["IMG_0001.JPG"]
        self.assertEqual(dataset.protection, 1)
        self.assertEqual(device.delete(dataset.handle)["errCode"], NOT_DELETED)
        self.assertTrue(os.path.exists(f"{card.point}/DCIM/100ABCDE/IMG_0001.JPG"))


class FolderVolumeTest(SessionTest):
    def test_a_session_on_a_folder_volume(self):
        path = self.folder_card("CARD", {})
        manager, device, late = self.session(path, keeps_birth_time=True)
        os.rename(path, f"{self.service.folder}/away")
        wait_until(lambda: manager.named("notifyRemovedDevice"), "the removal")
        wait_until(device.closed.is_set, "the end of the device's connection")
        late.ask("wait_until_closed")

    def test_a_device_that_comes_later_is_announced_to_connected_clients(self):
        manager = self.manager()
        self.assertEqual(manager.devices(), [])
        path = self.folder_card("LATER", {"100ABCDE/IMG_0001.JPG": b"x"})
        wait_until(lambda: manager.named("notifyAddedDevice"), "the announcement")
        self.assertEqual(manager.named("notifyAddedDevice")[0].unpack()[0], manager.wait_for_device(path))

    def test_opening_twice_gives_the_same_endpoint_and_an_unknown_device_nothing(self):
        path = self.folder_card("CARD", {})
        manager = self.manager()
        handle = manager.wait_for_device(path)["OVDeviceHandle"]
        first, second = manager.open(handle), manager.open(handle)
        self.assertEqual(first["OVDeviceEndpoint"], second["OVDeviceEndpoint"])
        self.assertEqual(set(second), {"OVDeviceEndpoint", "OVInternalDeviceUUID"})
        self.assertEqual(manager.open("no such device"), {})
        self.assertTrue(stat.S_ISSOCK(os.stat(first["OVDeviceEndpoint"].removeprefix("unix:path=")).st_mode))

    def test_an_empty_card_has_a_media_folder_and_nothing_else(self):
        device = self.device(self.manager(), self.folder_card("EMPTY", {}))
        device.enumerate()
        device.wait_for("DCIM")
        self.assertEqual(device.ready_counts(), [1])
        self.assertEqual(len(device.datasets()), 1)

    def test_without_a_matching_list_the_volume_is_served_with_its_dcim(self):
        self.service.stop()
        self.service.environment["XDG_DATA_DIRS"] = f"{self.service.folder}/nothing"
        self.service.start()
        device = self.device(self.manager(), self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": b"x"}))
        self.assertIn("matchPlist ! ⚠️⚠️⚠️⚠️⚠️⚠️ - Missing", self.service.log())
        self.assertIn("Failed -- force continuing", self.service.log())
        device.enumerate()
        device.wait_for("IMG_0001.JPG")

    def test_a_corrupt_matching_list_is_as_good_as_none(self):
        self.service.stop()
        share = f"{self.service.folder}/share"
        os.makedirs(f"{share}/OrvidCore")
        with open(f"{share}/OrvidCore/DeviceMatchingInfo.plist", "wb") as file:
            file.write(b"\x00<plist><dict><key>")
        self.service.environment["XDG_DATA_DIRS"] = share
        self.service.start()
        device = self.device(self.manager(), self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": b"x"}))
        self.assertIn("matchPlist !", self.service.log())
        device.enumerate()
        device.wait_for("IMG_0001.JPG")

    def test_both_media_folders_of_the_matching_list_are_served(self):
        path = self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": b"x"})
        make_card(path, {"101MNV01/MAH00001.MP4": b"y"}, root="MP_ROOT")
        device = self.device(self.manager(), path)
        device.enumerate()
        found = device.wait_for("DCIM", "MP_ROOT", "IMG_0001.JPG", "101MNV01")
        self.assertEqual(found["MP_ROOT"].parent, TOP_LEVEL)

    def test_the_order_option_is_taken_in_any_number_type(self):
        path = self.folder_card("CARD", {f"100ABCDE/IMG_000{i}.JPG": b"x" for i in range(1, 6)})
        for i in range(1, 6):
            os.utime(f"{path}/DCIM/100ABCDE/IMG_000{i}.JPG", (1_000_000 + i, 1_000_000 + i))
        device = self.device(self.manager(), path)
        device.enumerate(OVEnumerationChronologicalOrder=GLib.Variant("d", 1.0))
        device.wait_for(*[f"IMG_000{i}.JPG" for i in range(1, 6)])
        names = [d.filename for d in device.datasets() if d.filename.startswith("IMG")]
        self.assertEqual(names, [f"IMG_000{i}.JPG" for i in (5, 4, 3, 2, 1)])


if __name__ == "__main__":
    unittest.main()
