# SPDX-License-Identifier: MIT
"""What all subjects of the open interface have in common: codes, sentences, options records."""
import ctypes
import threading
import unittest

import numpy as np
import open as lumra


class Frame(lumra.Test):
    def test_every_code_has_its_name_and_a_text(self):
        codes = {name: code for name, code in lumra.constants.items() if code < 0 or name == "LUMRA_SUCCESS"}
        self.assertGreater(len(codes), 100)
        unknown = lumra.run("status_text", -1234567)
        for name, code in codes.items():
            with self.subTest(name):
                self.assertEqual(name, lumra.run("status_name", code).decode())
                self.assertRegex(lumra.run("status_text", code).decode(), r"\w{3}")
                self.assertNotEqual(unknown, lumra.run("status_text", code))
        self.assertEqual(b"", lumra.run("status_name", -1234567))

    def test_latest_failure_is_the_threads_own(self):
        self.refused("LUMRA_NULL_ARGUMENT", "window_by_name", None, None, None, says="name is null")
        mine, others = lumra.last_error(), []

        def work():
            others.append(lumra.last_error())
            lumra.run("window_by_name", b"no such window", ctypes.c_int32(), None)
            others.append(lumra.last_error())

        thread = threading.Thread(target=work)
        thread.start()
        thread.join()
        self.assertEqual("", others[0])
        self.assertIn("no such window", others[1])
        lumra.call("window_make_f32", 1, 0.0, 0, None, 0)
        self.assertEqual(mine, lumra.last_error(), "a success leaves it")

    def test_options_records_have_no_holes_and_a_size_that_is_checked(self):
        kinds = [name[:-7] for name in lumra.functions if name.endswith("_create")]
        for kind in kinds:
            with self.subTest(kind):
                options = lumra.record(kind)
                between = lumra.functions[f"{kind}_create"].argtypes[1:-1]
                data = [np.full(16, 0.25) if t is ctypes.c_void_p else 1 for t in between]
                size = ctypes.sizeof(options)
                self.assertEqual(size, sum(ctypes.sizeof(t) for _, t in options._fields_))
                initialiser = lumra.initialisers[f"lumra_{kind}_options"]
                self.assertEqual(len(options._fields_), initialiser.count(",") + 1)
                self.refused("LUMRA_NULL_ARGUMENT", f"{kind}_create", options, *data, None, says="null")
                handle = ctypes.c_void_p(1)
                for bad in (0, 7, 4097, 2**32 - 1):
                    options.size = bad
                    self.refused("LUMRA_BAD_SIZE_FIELD", f"{kind}_create", options, *data, handle, says=f"size is {bad}")
                longer = (ctypes.c_uint8 * (size + 8))(*bytes(lumra.record(kind)))
                ctypes.c_uint32.from_buffer(longer).value = size + 8
                lumra.call(f"{kind}_create", longer, *data, handle)
                for address in (handle.value, handle.value, None, 64):  # freed again, or never one: no matter
                    lumra.run(f"{kind}_free", address)
                longer[size + 7] = 1
                self.refused("LUMRA_BAD_SIZE_FIELD", f"{kind}_create", longer, *data, handle, says="does not know")


if __name__ == "__main__":
    unittest.main()
