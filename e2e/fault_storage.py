"""What storage holds of a device root when the power fails.

The model: a file's contents are those that were last forced, and empty before. A folder's names are those that it had
when it was last forced; a rename is one step, which either of its folders brings with it, and so is all that happened
before it in them. The calls come from the journal of fault_shim.c.
"""

import os
import shutil


class _Node:
    def __init__(self, contents=None, entries=None):
        self.contents = contents  # a file of the host; None is empty
        self.entries = entries  # of a folder: {name: node}


class Storage:
    """The root before the run; all of it is forced. `pristine` has the same files, which nobody changes."""

    def __init__(self, root, pristine):
        self.root, self.pristine = root, pristine
        self.nodes = {}  # by inode
        self.top = self._take(root, pristine)
        self.pending = []  # changes of folders that were not forced: (folders, apply)

    def _take(self, place, pristine):
        node = _Node(entries={}) if place.is_dir() else _Node(contents=pristine)
        self.nodes[place.stat().st_ino] = node
        if node.entries is not None:
            for entry in place.iterdir():
                node.entries[entry.name] = self._take(entry, pristine / entry.name)
        return node

    def cut_power(self, journal, names_survive):
        calls = journal / "calls"
        for line in calls.read_text().splitlines() if calls.exists() else []:
            call, *arguments = line.split("\t")
            getattr(self, "_" + call)(journal, *arguments)
            if names_survive:
                self._force(None)
        shutil.rmtree(self.root)
        self._put(self.top, self.root)

    def _put(self, node, place):
        if node.entries is not None:
            place.mkdir(mode=0o700)
            for name, entry in node.entries.items():
                self._put(entry, place / name)
        elif node.contents is None:
            place.touch(mode=0o600)
        elif "/System/" in str(node.contents):
            os.link(node.contents, place)
        else:
            shutil.copyfile(node.contents, place)
            place.chmod(0o600)

    # ---- The calls of the journal

    def _change(self, folders, apply):
        self.pending.append(([self.nodes[int(folder)] for folder in folders], apply))

    def _made(self, journal, folder, name, inode, kind):
        node = self.nodes[int(inode)] = _Node(entries={} if kind == "d" else None)
        self._change([folder], lambda where: where.entries.__setitem__(name, node))

    def _named(self, journal, folder, name, inode):
        node = self.nodes[int(inode)]
        self._change([folder], lambda where: where.entries.__setitem__(name, node))

    def _removed(self, journal, folder, name):
        self._change([folder], lambda where: where.entries.pop(name, None))

    def _renamed(self, journal, folder, name, to, new_name, inode):
        node = self.nodes[int(inode)]

        def apply(where, destination):
            where.entries.pop(name, None)
            destination.entries[new_name] = node
        self._change([folder, to], apply)

    def _forced(self, journal, inode, contents):
        self.nodes[int(inode)].contents = journal / contents

    def _forcedFolder(self, journal, inode):
        self._force(self.nodes[int(inode)])

    def _force(self, folder):
        """The changes of a folder and what came before them in the folders that they concern; None: all."""
        concerned, kept, due = [folder], [], []
        for folders, apply in reversed(self.pending):
            if folder is None or any(each is one for each in folders for one in concerned):
                concerned += folders
                due.append((folders, apply))
            else:
                kept.append((folders, apply))
        for folders, apply in reversed(due):
            apply(*folders)
        self.pending = kept[::-1]
