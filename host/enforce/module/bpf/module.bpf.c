// The programs that the kernel runs at its hooks, by what they are about.
#include "refusal.bpf.h"

// What the others use.
#include "calls.bpf.h"
#include "checks.bpf.h"

#include "capabilities.bpf.h"
#include "execution.bpf.h"
#include "files.bpf.h"
#include "identities.bpf.h"
#include "labels.bpf.h"
#include "paths.bpf.h"
#include "self_protection.bpf.h"
#include "sockets.bpf.h"
#include "tasks.bpf.h"
#include "unix_sockets.bpf.h"

#include "shared.bpf.h"

// What the helpers take.
char taken_license[] SEC("license") = "Dual MIT/GPL";
