#include "reply.h"

#include "json.h"
#include "query/question.h"
#include "refusal.h"

namespace SecPolicyPython {
namespace {

using SecPolicyCli::Json;

Reply ToReply(const std::string& kind, const std::exception& failure) {
  return {kind, Json({{"message", failure.what()}}).Text()};
}

}  // namespace

Reply ToReply(const std::string& kind, const LinuxHost::HostError& failure) {
  return {kind, Json({{"message", failure.what()}, {"errno", failure.Code()}}).Text()};
}

void SendFailureOf(const std::function<void()>& step, const Send& send) {
  try {
    step();
  } catch (const SecPolicyCli::QuestionError& failure) {
    send(ToReply("question", failure));
  } catch (const SecPolicyCli::NothingInstalled& failure) {
    send(ToReply("not-installed", failure));
  } catch (const SecPolicyCli::NoSuchPolicy& failure) {
    send(ToReply("missing", failure));
  } catch (const LinuxHost::HostError& failure) {
    send(ToReply("host", failure));
  } catch (const std::exception& failure) {
    send(ToReply("error", failure));
  }
}

}  // namespace SecPolicyPython
