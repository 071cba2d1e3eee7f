"""Running a program of which the Nth call of a kind fails."""
import json
import os
import subprocess


class FaultyRun:
    def __init__(self, program, preload, config):
        self.program, self.preload, self.config = program, preload, config

    def __call__(self, command, kind="", number=0, error=0):
        """Status, document (None: no valid one), text on standard error, whether the call was reached."""
        read_end, write_end = os.pipe()
        environment = dict(os.environ, VESK_FAIL_CALL=kind, VESK_FAIL_NUMBER=str(number), VESK_FAIL_ERRNO=str(error),
                           LD_PRELOAD=self.preload, VESKPIN_CONFIG=self.config)
        child = subprocess.Popen([self.program, "--json"] + command, env=environment, stdout=subprocess.PIPE,
                                 stderr=subprocess.PIPE, close_fds=False, preexec_fn=lambda: os.dup2(write_end, 9))
        os.close(write_end)
        output, errors = child.communicate()
        report = os.read(read_end, 1000)
        os.close(read_end)
        try:
            document = json.loads(output)
        except ValueError:
            document = None
        return child.returncode, document, errors.decode(errors="replace"), b"x" in report
