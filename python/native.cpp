// The module that the package is made on: the calls, each with its root, and what they send.
#include <pybind11/pybind11.h>
#include <pybind11/stl.h>

#include <optional>
#include <string>
#include <vector>

#include "below_root.h"
#include "calls.h"
#include "host/linux/common/host_error.h"

namespace py = pybind11;

namespace SecPolicyPython {
namespace {

using Root = std::optional<std::string>;
using Words = std::vector<std::string>;

void CheckSignals() {
  const py::gil_scoped_acquire interpreter;
  if (PyErr_CheckSignals() != 0) throw py::error_already_set();
}

py::tuple Run(const Root& root, const std::function<void(const Send&)>& work) {
  Reply reply;
  try {
    const py::gil_scoped_release others;
    reply = RunBelow(root, work, CheckSignals);
  } catch (const LinuxHost::HostError& failure) {
    reply = ToReply("host", failure);
  }
  return py::make_tuple(reply.kind, reply.document, py::bytes(reply.messages));
}

PYBIND11_MODULE(_native, module) {
  module.attr("version") = SECPOLICY_VERSION;
  module.def("check", [](const Root& root, const std::string& path, bool fresh) {
    return Run(root, [&](const Send& send) { Check(path, fresh, send); });
  });
  module.def("plan", [](const Root& root, const std::string& dir, bool keep) {
    return Run(root, [&](const Send& send) { Plan(dir, keep, send); });
  });
  module.def("load", [](const Root& root, const std::string& dir, bool keep, bool allOrNothing) {
    return Run(root, [&](const Send& send) { Load(dir, keep, allOrNothing, send); });
  });
  module.def("why", [](const Root& root, const std::string& domain, const Words& words) {
    return Run(root, [&](const Send& send) { Why(domain, words, send); });
  });
  module.def("who_can", [](const Root& root, const Words& words) {
    return Run(root, [&](const Send& send) { WhoCan(words, send); });
  });
  module.def("diff", [](const Root& root, const std::string& before, const std::string& after) {
    return Run(root, [&](const Send& send) { Diff(before, after, send); });
  });
}

}  // namespace
}  // namespace SecPolicyPython
