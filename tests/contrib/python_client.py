"""The client for Python on a real host.

usage: python_client.py SOCKET FILES

FILES is the directory of the test, with home/list.txt and a depot that holds notes.
"""

import os
import socket
import sys
import tempfile
import unittest

from zavhost import Host, HostError, UntrustedHost

SOCKET, FILES = sys.argv[1:]


class Requests(unittest.TestCase):
    def setUp(self):
        self.host = Host(SOCKET)

    def test_tell_what_the_host_answers(self):
        self.assertEqual(self.host.get_health()["home"], os.path.join(FILES, "home"))
        self.assertEqual(self.host.get_ready(), {"ready": True, "reasons": []})

    def test_give_text_where_the_answer_is_text(self):
        self.assertIn("# TYPE zavhost_queue_length gauge", self.host.get_metrics())

    def test_have_lists_and_numbers_as_parameters(self):
        sums = self.host.get_depot_sum(path=["notes", "a b&c"])["files"]
        self.assertEqual(sums[0]["bytes"], 3)
        self.assertEqual(sums[1]["path"], "a b&c")
        self.assertIn("error", sums[1])
        self.assertEqual(len(self.host.get_tasks(limit=0)["tasks"]), 0)

    def test_have_names_that_are_no_text(self):
        name = b"od\xffd"
        with open(os.path.join(FILES.encode(), b"depot", name), "wb"):
            pass
        removed = self.host.delete_depot(os.fsdecode(name))
        self.assertEqual(removed["escaped"], "od%FFd")

    def test_have_identifiers_that_need_escapes(self):
        transid = "a/b ?c"
        self.host.post_tasks(command="START", product="ux", transid=transid, once=True)
        self.assertEqual(self.host.get_task(transid, wait=60)["state"], "done")

    def test_raise_what_the_host_refuses(self):
        with self.assertRaises(HostError) as caught:
            self.host.get_task("none")
        self.assertEqual(caught.exception.status, 404)
        self.assertEqual(str(caught.exception), 'there is no task "none"')
        self.assertIsNone(caught.exception.guard)

    def test_raise_what_a_guard_refuses_with_the_way_out(self):
        with self.assertRaises(HostError) as caught:
            self.host.post_tasks(command="START", product="zz")
        self.assertEqual(caught.exception.status, 409)
        self.assertEqual(caught.exception.guard, "product")
        self.assertTrue(caught.exception.hint)

    def test_fail_where_there_is_no_host(self):
        with self.assertRaises(FileNotFoundError):
            Host(SOCKET + ".none").get_health()


class Streams(unittest.TestCase):
    def setUp(self):
        self.host = Host(SOCKET)

    def test_end_with_the_task(self):
        task = self.host.post_tasks(command="START", product="ux")
        events = list(self.host.get_task_output(task["id"], follow=1))
        self.assertEqual([event.name for event in events], ["message", "end"])
        self.assertEqual(events[0].data, {"stream": "stdout", "text": "said\n"})
        self.assertEqual(events[1].data, {"state": "done"})

    def test_have_what_comes_after_their_begin_and_continue(self):
        stream = self.host.get_events("KAGDYST", columns={"TRANSID": "streamed"})
        self.host.post_tasks(command="START", product="ux", transid="streamed")
        event = next(stream)
        stream.close()
        self.assertEqual(event.data["RETVAL"], 0)
        journal, number = event.id.split("-")
        self.assertEqual(journal, self.host.get_health()["journal"])
        again = self.host.get_events("KAGDYST", after=f"{journal}-{int(number) - 1}")
        self.assertEqual(next(again), event)
        again.close()

    def test_raise_what_the_host_refuses(self):
        with self.assertRaises(HostError) as caught:
            self.host.get_events("NONE")
        self.assertEqual(caught.exception.status, 404)


@unittest.skipIf(os.geteuid() != 0, "only root can be another user")
class Trust(unittest.TestCase):
    """In a host that somebody else runs, who hears what it is asked and answers nothing."""

    SOMEBODY = 65534

    def setUp(self):
        self.directory = tempfile.TemporaryDirectory()
        self.addCleanup(self.directory.cleanup)
        os.chmod(self.directory.name, 0o777)
        self.path = os.path.join(self.directory.name, "strange.sock")
        reading, writing = os.pipe()
        self.child = os.fork()
        if self.child == 0:
            self.listen(writing)
        os.close(writing)
        self.assertEqual(os.read(reading, 1), b"!")
        os.close(reading)

    def listen(self, ready):
        """Ends with status 0 if the client has sent nothing, else with 1."""
        os.setuid(self.SOMEBODY)
        listener = socket.socket(socket.AF_UNIX)
        listener.bind(self.path)
        listener.listen()
        os.write(ready, b"!")
        received = listener.accept()[0].recv(1)
        os._exit(1 if received else 0)

    def ending(self):
        return os.waitstatus_to_exitcode(os.waitpid(self.child, 0)[1])

    def test_goes_to_root_and_the_caller_only(self):
        with self.assertRaises(UntrustedHost):
            Host(self.path).get_health()
        self.assertEqual(self.ending(), 0)

    def test_goes_to_a_user_who_is_named(self):
        with self.assertRaises(ConnectionError):
            Host(self.path, host_user=self.SOMEBODY).get_health()
        self.assertEqual(self.ending(), 1)


if __name__ == "__main__":
    unittest.main(argv=sys.argv[:1])
