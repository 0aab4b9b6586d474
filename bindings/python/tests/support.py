"""A data directory of its own for every test: the PUBLIC group laid out, the
shipped language data copied in, home, registry and lock folders pointed at it
through the environment, and an SQLite database in the group's DataStore."""

import os
import shutil
import sqlite3
import tempfile
import unittest

import quillmere

SOURCE_DATA = os.environ.get(
    "QM_SOURCE_DATA_DIR",
    os.path.join(os.path.dirname(os.path.abspath(__file__)), "..", "..", "..", "data"))

GROUP_FOLDERS = ("Indexes", "Orders", "Config", "WorkData", "DataStore", "Definitions")
ENVIRONMENT = ("MORVIL_HOME", "MORVIL_PATH", "MORVIL_REGISTRY", "MORVIL_LOCKDIR")


class DataDirectoryTest(unittest.TestCase):
    def setUp(self):
        root = tempfile.mkdtemp(prefix="qm-python-", dir=os.environ.get("QM_TEST_SCRATCH"))
        self.addCleanup(shutil.rmtree, root, ignore_errors=True)
        self.home = os.path.join(root, "home") + "/"
        self.data = os.path.join(root, "data") + "/"
        for sub in ("Log", "Config", "System", "Tasks"):
            os.makedirs(self.home + sub)
        for folder in GROUP_FOLDERS:
            os.makedirs(self.group_folder() + folder)
        shutil.copytree(os.path.join(SOURCE_DATA, "Language"), self.data + "Language")
        saved = {name: os.environ.get(name) for name in ENVIRONMENT}
        self.addCleanup(self._restore, saved)
        os.environ.update(MORVIL_HOME=self.home, MORVIL_PATH=self.data,
                          MORVIL_REGISTRY=os.path.join(root, "no-registry.conf"),
                          MORVIL_LOCKDIR=os.path.join(root, "locks") + "/")
        self.database = self.group_folder() + "DataStore/test.db"

    @staticmethod
    def _restore(saved):
        for name, value in saved.items():
            if value is None:
                os.environ.pop(name, None)
            else:
                os.environ[name] = value

    def group_folder(self, group="PUBLIC"):
        return f"{self.data}Groups/{group}/"

    def connection_string(self):
        return f"Driver=SQLite3;Database={self.database};StepAPI=1;"

    def create_table(self, name, columns, rows):
        with sqlite3.connect(self.database) as db:
            db.execute(f"create table {name} ({columns})")
            marks = ",".join("?" * len(rows[0]))
            db.executemany(f"insert into {name} values ({marks})", rows)
        db.close()

    def command(self):
        """An APICommand on the test's data directory and database, released
        when the test ends."""
        command = quillmere.APICommand()
        self.addCleanup(command.release)
        command.SetDataPath(self.data)
        command.SetDBConnectionStringEx(self.connection_string(), "test")
        return command

    def search(self):
        search = quillmere.APISearch()
        self.addCleanup(search.release)
        search.SetDataPath(self.data)
        return search
