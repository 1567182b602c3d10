/*
 * Instruction counter for qemu user-mode emulation (qemu-arm, qemu-aarch64),
 * loaded with "-plugin". Every translated block adds its instruction count to
 * one total each time it runs; the total is printed on stderr at exit as
 * "guest_insns N". Used by bench/insn_count.sh.
 *
 * Debian ships no qemu-plugin.h, so the few entry points used here are
 * declared below, as the plugin interface of qemu 7.x defines them
 * (interface version 1).
 */
#include <stdbool.h>
#include <stddef.h>
#include <stdint.h>
#include <stdio.h>

typedef uint64_t qemu_plugin_id_t;
struct qemu_plugin_tb;
typedef struct {
    const char *target_name;
    struct {
        int min, cur;
    } version;
    bool system_emulation;
    /* system-emulation fields follow; not read here */
} qemu_info_t;

enum { INLINE_ADD_U64 = 0 };

void qemu_plugin_register_vcpu_tb_trans_cb(qemu_plugin_id_t id,
                                           void (*cb)(qemu_plugin_id_t, struct qemu_plugin_tb *));
size_t qemu_plugin_tb_n_insns(const struct qemu_plugin_tb *tb);
void qemu_plugin_register_vcpu_tb_exec_inline(struct qemu_plugin_tb *tb, int op, void *ptr,
                                              uint64_t imm);
void qemu_plugin_register_atexit_cb(qemu_plugin_id_t id, void (*cb)(qemu_plugin_id_t, void *),
                                    void *userdata);

#define EXPORTED __attribute__((visibility("default")))

EXPORTED int qemu_plugin_version = 1;

static uint64_t executed;

static void on_translate(qemu_plugin_id_t id, struct qemu_plugin_tb *tb)
{
    (void)id;
    qemu_plugin_register_vcpu_tb_exec_inline(tb, INLINE_ADD_U64, &executed,
                                             qemu_plugin_tb_n_insns(tb));
}

static void on_exit_report(qemu_plugin_id_t id, void *userdata)
{
    (void)id;
    (void)userdata;
    fprintf(stderr, "guest_insns %llu\n", (unsigned long long)executed);
}

EXPORTED int qemu_plugin_install(qemu_plugin_id_t id, const qemu_info_t *info, int argc,
                                 char **argv)
{
    (void)info;
    (void)argc;
    (void)argv;
    qemu_plugin_register_vcpu_tb_trans_cb(id, on_translate);
    qemu_plugin_register_atexit_cb(id, on_exit_report, NULL);
    return 0;
}
