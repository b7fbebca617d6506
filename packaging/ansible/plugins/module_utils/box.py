"""What the modules share: the connection to a box, and changes that are rehearsed before they are made."""

from ansible.module_utils.basic import AnsibleModule

from .vorn_cli.api import Api
from .vorn_cli.failure import Failure

_CONNECTION = {
    "socket": {"type": "path", "default": "/run/vorn/vornd.sock"},
    "url": {"type": "str"},
    "token": {"type": "str", "no_log": True},
    "fingerprint": {"type": "str"},
}


class Box:
    """A box, and what this run of a module has changed on it.

    Whether a change would change anything is not computed here: the box says so when it rehearses the change.
    """

    def __init__(self, arguments, **settings):
        self.module = AnsibleModule(argument_spec={**_CONNECTION, **arguments}, supports_check_mode=True,
                                    required_by={"token": "url", "fingerprint": "url"}, **settings)
        self.options = self.module.params
        self._api = Api(self.options["url"] or self.options["socket"], self.options["token"], self.options["fingerprint"])
        self._result = {"changed": False, "diff": [], "actions": [], "rules": []}

    def given(self, **names):
        """The options that the task gives, by the name of their parameter."""
        return {parameter: self.options[option] for parameter, option in names.items()
                if self.options[option] is not None}

    def read(self, method, parameters=None):
        """The data of a method that reads, and its revision."""
        answer = self._guarded(lambda: self._api.call(method, parameters))
        return answer.data, answer.revision

    def change(self, method, parameters, revision=None):
        """Calls a method that changes something if the data of `revision` is still there and the call has an effect."""
        self._carry_out(lambda rehearse: self._api.call(method, parameters, revision=revision, rehearse=rehearse))

    def upload(self, method, field, name, content):
        """Calls a method that takes a file, if the call has an effect."""
        self._carry_out(lambda rehearse: self._api.upload(method, field, name, content, rehearse=rehearse))

    def fail(self, message):
        """Ends the module."""
        self.module.fail_json(msg=message, **self._result)

    def succeed(self):
        """Ends the module."""
        self.module.exit_json(**self._result)

    def _carry_out(self, call):
        answer = self._guarded(lambda: call(True))
        rehearsal = answer.rehearsal
        if rehearsal is None:
            self.fail("This box cannot rehearse changes.")
        # Reading unchanged files once more changes nothing.
        actions = [action for action in rehearsal["actions"] if rehearsal["files"] or action["clients"] != "reload"]
        if not rehearsal["files"] and not actions:
            return
        if not self.module.check_mode:
            answer = self._guarded(lambda: call(False))
        self._result["changed"] = True
        self._result["diff"] += [{"prepared": file["difference"]} for file in rehearsal["files"]]
        self._result["actions"] += actions
        self._result["rules"] += rehearsal["rules"]
        for warning in answer.warnings:
            self.module.warn(warning)

    def _guarded(self, call):
        try:
            return call()
        except Failure as failure:
            self.module.fail_json(msg=str(failure), reasons=list(failure.details), **self._result)
