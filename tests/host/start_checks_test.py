"""What the host refuses to start on, with a reason, and without changing a byte."""
import os
import pathlib
import shutil
import sqlite3
import subprocess

import hosttest
from hosttest import account, card, record

BUNDLE = hosttest.BUNDLES / "LogsAndSucceeds.migrator"


class ImageChecks(hosttest.HostTestCase):
    def check_refusal(self, *words, arguments=(), prefix=()):
        with self.unchanged_image():
            run = self.run_host("--json", "--quiet", *arguments, prefix=prefix)
        self.assert_refused(run, *words)

    def test_a_missing_settings_file_is_nothing_to_do(self):
        (self.image / hosttest.SETTINGS).unlink(missing_ok=True)
        run = self.run_host("--json", "--quiet")
        self.assertEqual((0, "done", []), (run.code, run.report["outcome"], run.report["accounts"]))

    def test_a_damaged_settings_file(self):
        (self.image / hosttest.SETTINGS).write_bytes(b"bplist00 and no more")
        self.check_refusal(hosttest.SETTINGS, "cannot be read", "bring back a readable copy")

    def test_settings_that_are_no_dictionary(self):
        self.write_plist(hosttest.SETTINGS, ["Accounts"])
        self.check_refusal(hosttest.SETTINGS, "it holds no dictionary")

    def test_settings_that_are_a_link(self):
        elsewhere = self.directory / "elsewhere.plist"
        (self.image / hosttest.SETTINGS).unlink(missing_ok=True)
        elsewhere.write_bytes(hosttest.plistlib.dumps({"Accounts": []}))
        (self.image / hosttest.SETTINGS).symlink_to(elsewhere)
        self.check_refusal(hosttest.SETTINGS, "cannot be read")

    def test_an_entry_that_is_no_dictionary(self):
        self.write_settings("no account", account("A", "Mail"))
        self.check_refusal(hosttest.SETTINGS, "1 entries", "take them out")

    def test_an_account_of_an_unknown_type(self):
        self.write_settings(account("A", "Mail"), account("B", "Telegraph"))
        self.check_refusal(hosttest.SETTINGS, "account B", '"Telegraph"', "take the account out")

    def test_a_missing_temporary_directory(self):
        (self.image / "tmp").rmdir()
        self.check_refusal(f"{self.image}/tmp", "is no directory", "make it")

    def test_a_temporary_directory_in_which_everybody_may_replace_files(self):
        (self.image / "tmp").chmod(0o777)
        self.check_refusal("Everybody may replace the files", f"{self.image}/tmp", "chmod o-w")
        (self.image / "tmp").chmod(0o1777)
        self.assertEqual(0, self.run_host("--quiet").code)

    def test_a_temporary_directory_that_is_a_file(self):
        (self.image / "tmp").rmdir()
        (self.image / "tmp").write_text("")
        self.check_refusal(f"{self.image}/tmp", "is no directory")

    def test_a_temporary_directory_that_is_a_link(self):
        (self.image / "tmp").rmdir()
        (self.image / "tmp").symlink_to(self.directory)
        self.check_refusal(f"{self.image}/tmp", "is no directory")

    @hosttest.skip_unless_root
    def test_a_temporary_directory_on_another_file_system(self):
        self.check_refusal(f"{self.image}/tmp", "is not on the file system", "unmount it",
                           prefix=("unshare", "-m", "sh", "-c",
                                   f'mount -t tmpfs none "{self.image}/tmp" && exec "$@"', "sh"))

    @hosttest.skip_unless_root
    def test_a_temporary_directory_that_is_another_mount_of_the_same_file_system(self):
        other = self.directory / "other"
        other.mkdir()
        self.check_refusal(f"{self.image}/tmp", "is not on the file system",
                           prefix=("unshare", "-m", "sh", "-c",
                                   f'mount --bind "{other}" "{self.image}/tmp" && exec "$@"', "sh"))

    @hosttest.skip_unless_root
    def test_a_read_only_image(self):
        self.check_refusal(self.image, "Read-only file system",
                           prefix=("unshare", "-m", "sh", "-c",
                                   f'mount --bind "{self.image}" "{self.image}" && '
                                   f'mount -o remount,bind,ro "{self.image}" && exec "$@"', "sh"))

    def test_a_user_database_without_mobile(self):
        (self.image / "etc/passwd").write_text("root:x:0:0::/:/bin/sh\n")
        self.check_refusal("etc/passwd", 'no user "mobile"', "add the line")

    def test_a_group_database_without_mobile(self):
        (self.image / "etc/group").write_text("wheel:x:0:\n")
        self.check_refusal("etc/group", 'no group "mobile"', "add the line")

    OTHER_USER = 12345  # any number that nobody has

    def run_as_other_user(self, user, group, *identity):
        """Runs as somebody who owns the image, whose "mobile" has these numbers."""
        (self.image / "etc/passwd").write_text(f"mobile:x:{user}:{group}::/var/mobile:/bin/sh\n")
        (self.image / "etc/group").write_text(f"mobile:x:{group}:\n")
        for path in [self.directory, *self.directory.rglob("*")]:
            os.chown(path, self.OTHER_USER, self.OTHER_USER)
        return ("setpriv", f"--reuid={self.OTHER_USER}", f"--regid={self.OTHER_USER}", *identity)

    @hosttest.skip_unless_root
    def test_a_caller_who_is_neither_root_nor_mobile(self):
        self.check_refusal("user 501 and group 501", "run the host as that user or as root",
                           prefix=self.run_as_other_user(501, 501, "--clear-groups"))

    @hosttest.skip_unless_root
    def test_a_caller_who_is_not_of_the_group_of_mobile(self):
        prefix = self.run_as_other_user(self.OTHER_USER, 501, "--clear-groups")
        self.check_refusal("group 501", "run the host as that user", prefix=prefix)

    @hosttest.skip_unless_root
    def test_a_caller_who_is_mobile_runs(self):
        self.write_settings(account("Q", "Quillnet", status=1))
        prefix = self.run_as_other_user(self.OTHER_USER, 501, "--groups=501")
        self.assertEqual(0, self.run_host("--quiet", prefix=prefix).code)

    def test_a_directory_that_is_not_there(self):
        self.image = self.directory / "nowhere"
        run = self.run_host("--json")
        self.assert_refused(run, "nowhere")

    def test_a_directory_that_is_no_image(self):
        self.image = self.directory / "empty"
        self.image.mkdir()
        self.check_refusal("empty")

    def test_all_reasons_are_given_at_once(self):
        (self.image / hosttest.SETTINGS).write_bytes(b"nonsense")
        (self.image / "tmp").rmdir()
        run = self.run_host("--json", "--quiet")
        self.assertEqual((7, 2), (run.code, len(run.report["reasons"])))


class BundleChecks(hosttest.HostTestCase):
    def setUp(self):
        super().setUp()
        self.bundle = self.directory / "Copy.migrator"
        shutil.copytree(BUNDLE, self.bundle)

    def check_refusal(self, *words):
        with self.unchanged_image():
            run = self.run_host("--json", "--quiet", "--bundle", self.bundle)
        self.assert_refused(run, *words)
        self.assertEqual([], run.report["migrators"])

    def change_information(self, **changes):
        path = self.bundle / "Info.plist"
        information = hosttest.plistlib.loads(path.read_bytes())
        information.update(changes)
        path.write_bytes(hosttest.plistlib.dumps(
            {key: value for key, value in information.items() if value is not None}))

    def test_a_good_copy_runs(self):
        run = self.run_host("--json", "--quiet", "--bundle", self.bundle)
        self.assertEqual(0, run.code)

    def test_a_bundle_that_is_not_there(self):
        self.bundle = self.directory / "Nowhere.migrator"
        self.check_refusal("Nowhere.migrator", "name the folder of a migrator")

    def test_a_bundle_that_is_a_file(self):
        self.bundle = self.directory / "File.migrator"
        self.bundle.write_text("")
        self.check_refusal("File.migrator", "is no folder")

    def test_a_bundle_without_information(self):
        (self.bundle / "Info.plist").unlink()
        self.check_refusal("Copy.migrator/Info.plist", "install the migrator again")

    def test_a_bundle_with_damaged_information(self):
        (self.bundle / "Info.plist").write_text("<plist>")
        self.check_refusal("Copy.migrator/Info.plist", "is no dictionary")

    def test_a_bundle_of_another_kind(self):
        self.change_information(Kind="Importer")
        self.check_refusal("Copy.migrator/Info.plist", "does not name a data-class migrator")

    def test_a_bundle_for_another_version_of_the_interfaces(self):
        self.bundle = hosttest.BUNDLES / "OtherVersion.migrator"
        self.check_refusal("OtherVersion.migrator/Info.plist", "names version 2",
                           "this host offers 1")

    def test_a_bundle_without_a_version(self):
        self.change_information(PlatformInterfaceVersion=None)
        self.check_refusal("Copy.migrator/Info.plist", "names version (none)")

    def test_a_bundle_without_a_principal_class(self):
        self.change_information(PrincipalClass=None)
        self.check_refusal("Copy.migrator/Info.plist", "names no principal class")

    def test_a_bundle_whose_executable_lies_outside(self):
        self.change_information(Executable="../LogsAndSucceeds.so")
        self.check_refusal("Copy.migrator/Info.plist", "names no executable in the bundle")

    def test_a_bundle_without_its_executable(self):
        (self.bundle / "LogsAndSucceeds.so").unlink()
        self.check_refusal("Copy.migrator/LogsAndSucceeds.so", "install the migrator again")

    def test_an_executable_that_is_a_link(self):
        (self.bundle / "LogsAndSucceeds.so").rename(self.directory / "elsewhere.so")
        (self.bundle / "LogsAndSucceeds.so").symlink_to(self.directory / "elsewhere.so")
        self.check_refusal("Copy.migrator/LogsAndSucceeds.so", "neither a file nor a folder")

    def test_an_executable_that_others_may_write(self):
        (self.bundle / "LogsAndSucceeds.so").chmod(0o757)
        self.check_refusal("Copy.migrator/LogsAndSucceeds.so", "may be written by others", "chmod")

    def test_a_folder_that_others_may_write(self):
        self.bundle.chmod(0o777)
        self.check_refusal("Copy.migrator may be written by others", "chmod")

    def test_information_that_others_may_write(self):
        (self.bundle / "Info.plist").chmod(0o646)
        self.check_refusal("Copy.migrator/Info.plist", "may be written by others")

    def test_a_folder_above_that_others_may_write(self):
        self.directory.chmod(0o777)
        self.check_refusal(f"{self.directory} may be written by others", "chmod")

    @hosttest.skip_unless_root
    def test_an_executable_of_another_user(self):
        os.chown(self.bundle / "LogsAndSucceeds.so", 12345, 12345)
        self.check_refusal("Copy.migrator/LogsAndSucceeds.so", "belongs to another user")

    def test_a_missing_resource(self):
        self.change_information(RequiredResources=["Texts.plist"])
        self.check_refusal("Copy.migrator/Texts.plist", "install the migrator again")

    def test_a_damaged_resource(self):
        self.change_information(RequiredResources=["Texts.plist"])
        (self.bundle / "Texts.plist").write_text("<plist>")
        self.check_refusal("Copy.migrator/Texts.plist", "is no dictionary")

    def test_a_resource_outside_the_bundle(self):
        self.change_information(RequiredResources=["../../etc/passwd"])
        self.check_refusal("Copy.migrator/Info.plist", "names a resource outside the bundle")

    def test_types_to_retire_without_a_status(self):
        self.change_information(RetiredServiceStatus=None)
        self.check_refusal("Copy.migrator/Info.plist", "no service status")

    def test_the_installed_migrator_without_one_of_its_resources(self):
        installed = next(hosttest.MIGRATORS.glob("*.migrator"))
        for name in ("AccountTypesProperties.plist", "DataclassesProperties.plist",
                     "en.lproj/DeviceLocalAccount.strings"):
            with self.subTest(name):
                self.bundle = self.directory / installed.name
                shutil.copytree(installed, self.bundle)
                (self.bundle / name).unlink()
                self.check_refusal(f"{installed.name}/{name}", "install the migrator again")
                shutil.rmtree(self.bundle)
