#!/usr/bin/env python3
"""Generates the codec's constant tables as C++ source from the plain-text
table files (one file per table: five '#' header lines, then the values).

    python3 scripts/gen_tables.py [TABLE_DIR]

TABLE_DIR defaults to ../shared/tables beside the project.  Writes
src/format/frame_tables.{h,cpp} (frame-format and homing tables) and
src/basic_op/op_tables.{h,cpp} (interpolation tables of the extended
operators) and src/lpc/tables.{h,cpp} (every other table).  The generated files are committed
so that a checkout builds without the table files.
"""
import os
import re
import sys

ROOT = os.path.dirname(os.path.dirname(os.path.abspath(__file__)))
SRC = sys.argv[1] if len(sys.argv) > 1 else os.path.join(ROOT, "..", "shared", "tables")

# file stem -> exported C name (tables the library exports); others stay
# internal in namespace vamrnb::tab under their file stem.
EXPORTED = {
    "toc_byte": "vamrnb_tbl_toc_byte",
    "unpacked_size": "vamrnb_tbl_unpacked_size",
    "bitno_packed_size": "vamrnb_tbl_packed_size",
    "unused_size": "vamrnb_tbl_unused_size",
    "lsp_lsf_table": "vamrnb_tbl_cos_lsp_lsf",
    "lsp_init_data": "vamrnb_tbl_lsp_init_data",
    "q_plsf_5_mean_lsf": "vamrnb_tbl_mean_lsf",
    "q_plsf_5_dico1_lsf": "vamrnb_tbl_dico1_lsf",
    "q_plsf_5_dico2_lsf": "vamrnb_tbl_dico2_lsf",
    "q_plsf_5_dico3_lsf": "vamrnb_tbl_dico3_lsf",
    "q_plsf_5_dico4_lsf": "vamrnb_tbl_dico4_lsf",
    "q_plsf_5_dico5_lsf": "vamrnb_tbl_dico5_lsf",
    "gamma1": "vamrnbe_tbl_gamma1",
    "gamma1_12k2": "vamrnbe_tbl_f_gamma1",
    "gamma2": "vamrnbe_tbl_gamma2",
    "pred_lt_inter_6": "vamrnb_tbl_pred_inter_6",
    "qua_gain_pitch": "vamrnb_tbl_qua_gain_pitch",
    "qua_gain_code": "vamrnb_tbl_qua_gain_code",
    "table_gain_highrates": "vamrnb_tbl_gain_highrates",
    "table_gain_lowrates": "vamrnb_tbl_gain_lowrates",
    "table_gain_MR475": "vamrnb_tb1_gain_mr475",
    "dtx_log_en_adjust": "vamrnb_tbl_dtx_log_en_adjust",
}
MODES = ["MR475", "MR515", "MR59", "MR67", "MR74", "MR795", "MR102", "MR122"]
SORT = ["475", "515", "59", "67", "74", "795", "102", "122", "SID"]
FORMAT_STEMS = (
    {"toc_byte", "unpacked_size", "bitno_packed_size", "unused_size", "prmno", "prmnofsf",
     "decoder_packed_size"}
    | {"bitno_" + m for m in MODES + ["MRDTX"]}
    | {"sort_" + s for s in SORT}
    | {"dhf_" + m for m in MODES}
)
# Interpolation tables of log2, pow2, 1/sqrt and sqrt: read by the extended
# operators only, so generated beside them (nothing in src/basic_op may
# include from the folders above it).
OP_STEMS = {"log2_table", "pow2_table", "inv_sqrt_table", "sqrt_l_table"}
# Values given only in the library's own format description (no table file).
IF2 = {
    "vamrnb_tbl_packed_size_IF2": [12, 13, 15, 17, 18, 20, 25, 30, 5, 0, 0, 0, 0, 0, 0, 0],
    "vamrnb_tbl_unused_size_IF2": [5, 5, 6, 6, 0, 5, 0, 0, 5, 1, 6, 7, 0, 0, 0, 4],
}


# What each exported table holds, for its declaration in the public header.
# Frame-type tables are indexed by the 4-bit frame type of the
# table-of-contents byte (0-7 speech modes, 8 SID, 9-14 other, 15 no data).
DOCS = {
    "vamrnb_tbl_packed_size":
        "Bytes of a whole storage-format frame, table-of-contents byte included, per frame\n"
        "type 0..15 (13 for MR475 up to 32 for MR122, 6 for SID, 1 for no data; 0 for\n"
        "types 12 to 14).  Read by the packer and by callers that walk a stream frame\n"
        "by frame: the frame type is (toc >> 3) & 15.",
    "vamrnb_tbl_prmno":
        "Number of codec parameters per mode: rows MR475..MR122, MRDTX (SID) and a last\n"
        "row 0 for no data.  Read by the parameter converters and the homing tests.",
    "vamrnb_tbl_prmnofsf":
        "Number of codec parameters up to and including the first subframe per mode\n"
        "(MR475..MR122; the MRDTX row is 0).  Read by the first-subframe homing test.",
    "vamrnb_tbl_toc_byte":
        "Table-of-contents byte the encoder writes per frame type 0..15: the type in bits\n"
        "6..3 and the quality bit Q (bit 2) set, i.e. (type << 3) | 4.",
    "vamrnb_tbl_unpacked_size":
        "Class bits (speech or SID parameter bits, without the SID type and mode bits) per\n"
        "frame type 0..15: 95 for MR475 up to 244 for MR122, 35 for SID, 43/38/37 for\n"
        "types 9 to 11, 0 for the rest.  Read by the packer and the unpacker.",
    "vamrnb_tbl_unused_size":
        "Zero padding bits that complete the last byte of a storage-format frame, per\n"
        "frame type 0..15.  Read by the packer.",
    "vamrnb_tbl_packed_size_IF2":
        "Interface format 2: bytes of a frame after its first byte, per frame type 0..15.\n"
        "Exported for callers; the library neither reads nor writes that format.",
    "vamrnb_tbl_unused_size_IF2":
        "Interface format 2: padding bits in the last byte, per frame type 0..15.\n"
        "Exported for callers; the library neither reads nor writes that format.",
    "vamrnb_tbl_bitno":
        "Per mode (MR475..MR122, MRDTX) a table of the width in bits of each codec\n"
        "parameter, vamrnb_tbl_prmno[mode] entries in parameter order; the tenth pointer\n"
        "is null.  Read by the parameter/bit converters.",
    "vamrnb_tbl_sort_ptr":
        "Per frame type 0..8 the order in which the class bits travel: entry i is the\n"
        "position, in the per-bit parameter vector, of the i-th bit of the frame\n"
        "(vamrnb_tbl_unpacked_size[type] entries); null for types 9 to 15.  Read by the\n"
        "packer and the unpacker.",
    "vamrnb_tbl_dtx_log_en_adjust":
        "Comfort-noise decoder: log-energy correction, Q11, per codec mode in which the\n"
        "comfort noise is decoded (MR475..MR122, MRDTX).",
    "vamrnbe_tbl_gamma1":
        "Encoder perceptual weighting, numerator factors 0.94^(i+1), i = 0..9, Q15, for\n"
        "every mode except MR102 and MR122.  Read by the open-loop pitch analysis and the\n"
        "subframe weighting filters.",
    "vamrnbe_tbl_f_gamma1":
        "Encoder perceptual weighting, numerator factors 0.9^(i+1), i = 0..9, Q15, used\n"
        "instead of vamrnbe_tbl_gamma1 for MR102 and MR122.",
    "vamrnbe_tbl_gamma2":
        "Encoder perceptual weighting, denominator factors 0.6^(i+1), i = 0..9, Q15, all\n"
        "modes.",
    "vamrnb_tbl_lsp_init_data":
        "Line spectral pairs that encoder, decoder and the DTX histories start from after\n"
        "creation or a reset, Q15 cosine domain, 10 entries.",
    "vamrnb_tbl_cos_lsp_lsf":
        "Cosine table cos(pi * i / 64), i = 0..64, Q15, for the conversions between line\n"
        "spectral frequencies and pairs (vamrnb_sf_sp(), vamrnb_lsp_lsf()).",
    "vamrnb_tbl_pred_inter_6":
        "Interpolation filter of 1/6-sample resolution for the past excitation, 61 taps,\n"
        "Q15.  Read by vamrnb_pred_lt_3or6() (adaptive codebook of both directions).",
    "vamrnb_tbl_dico1_lsf":
        "MR122 LSF split-matrix quantiser, split 1 (LSFs 1-2 of both half-frame vectors):\n"
        "128 rows of 4, normalised frequency (Q15 of half the sampling rate).  Read by the\n"
        "MR122 LSF quantiser and dequantiser.",
    "vamrnb_tbl_dico2_lsf":
        "MR122 LSF split-matrix quantiser, split 2 (LSFs 3-4): 256 rows of 4, same scale\n"
        "as vamrnb_tbl_dico1_lsf.",
    "vamrnb_tbl_dico3_lsf":
        "MR122 LSF split-matrix quantiser, split 3 (LSFs 5-6): 256 rows of 4, same scale\n"
        "as vamrnb_tbl_dico1_lsf.",
    "vamrnb_tbl_dico4_lsf":
        "MR122 LSF split-matrix quantiser, split 4 (LSFs 7-8): 256 rows of 4, same scale\n"
        "as vamrnb_tbl_dico1_lsf.",
    "vamrnb_tbl_dico5_lsf":
        "MR122 LSF split-matrix quantiser, split 5 (LSFs 9-10): 64 rows of 4, same scale\n"
        "as vamrnb_tbl_dico1_lsf.",
    "vamrnb_tbl_mean_lsf":
        "Mean LSF vector (10 entries, same scale as the LSF codebooks) removed before the\n"
        "MR122 quantiser; also the start value of the decoder's LSF histories and of the\n"
        "running LSF average.",
    "vamrnb_tbl_qua_gain_code":
        "Scalar code-gain quantiser of MR122 and MR795: 32 rows of (gain correction factor\n"
        "Q11, quantised energy for the MR122 predictor Q10, for the other modes' predictor\n"
        "Q10).",
    "vamrnb_tbl_qua_gain_pitch":
        "Scalar pitch-gain quantiser of MR122 and MR795 (and the decoder's pitch-gain\n"
        "lookup of those modes): 16 gains, Q14.",
    "vamrnb_tb1_gain_mr475":
        "MR475 joint gain quantiser over a pair of subframes: 256 rows of (pitch gain Q14,\n"
        "code-gain correction Q12) for the first and then the second subframe.",
    "vamrnb_tbl_gain_highrates":
        "Joint pitch and code gain quantiser of MR67, MR74 and MR102: 128 rows of (pitch\n"
        "gain Q14, code-gain correction Q12, quantised energy for the MR122 predictor Q10,\n"
        "for the other modes' predictor Q10).",
    "vamrnb_tbl_gain_lowrates":
        "Joint pitch and code gain quantiser of MR515 and MR59: 64 rows laid out like\n"
        "vamrnb_tbl_gain_highrates.",
}


# Frame types 9 to 11 (the other systems' comfort-noise frames) have sizes in
# the storage format although this codec reads none of their bits; the table
# files leave them 0, which would stall a reader that walks a stream by size.
STORAGE_SIZES = {
    "unpacked_size": {9: 43, 10: 38, 11: 37},
    "bitno_packed_size": {9: 7, 10: 6, 11: 6},
    "unused_size": {9: 5},
}


# Own-words description of every table: what it holds, units or Q format.
# Families (bitno_*, sort_*, dhf_*) are described once, by pattern.
DESCRIBE = {
    "bitno_packed_size": "storage-format frame size in bytes, header byte included, per frame type 0..15",
    "decoder_packed_size": "bytes after the header byte of a storage-format frame, per frame type 0..15",
    "unpacked_size": "class bits (speech or comfort-noise payload) per frame type 0..15",
    "unused_size": "zero bits that pad the last byte of a storage-format frame, per frame type 0..15",
    "toc_byte": "storage-format header byte per frame type 0..15 (follow-on flag clear, quality flag set)",
    "prmno": "number of codec parameters per mode, MR475..MR122 then MRDTX (one spare entry)",
    "prmnofsf": "number of parameters up to the end of the first subframe, per speech mode (one spare entry)",
    "burstcount_table": "option-2 detector: speech-burst length needed before hangover, per 3 dB step of peak SNR",
    "hangover_table": "option-2 detector: hangover length in frames, per 3 dB step of peak SNR",
    "vm_threshold_table": "option-2 detector: voice-metric threshold, per 3 dB step of peak SNR",
    "vm_tbl": "option-2 detector: voice-metric contribution of one channel, by quantised channel SNR",
    "ch_tbl": "option-2 detector: first and last FFT bin of each of the 16 channels",
    "ch_tbl_sh": "option-2 detector: 1 / (bins in the channel) per channel, Q15",
    "enrg_norm_shift": "option-2 detector: energy normalisation shift per scaling state",
    "fbits": "option-2 detector: fractional bits of the channel energies per scaling state",
    "ine_noise": "option-2 detector: starting noise estimate per scaling state",
    "min_chan_enrg": "option-2 detector: lowest channel energy per scaling state",
    "noise_floor_chan": "option-2 detector: channel noise floor per scaling state (Q9 in state 0, Q4 in state 1)",
    "state_change_shift_r": "option-2 detector: right shift of the channel energies on entering scaling state 0 or 1",
    "ii_table": "option-2 detector FFT: twiddle index step of each of the six complex stages",
    "phs_tbl": "option-2 detector FFT: 64 twiddle pairs (cos, -sin) of 2·pi·k/128, Q15, stored flat",
    "cdown": "bad-frame concealment: attenuation of the code gain by concealment state 0..6, Q15",
    "pdown": "bad-frame concealment: attenuation of the pitch gain by concealment state 0..6, Q15",
    "corrweight": "weighting of the open-loop correlation by lag, for the MR102 weighted pitch search",
    "dgray": "decoder: 3-bit pulse position index back from its Gray code",
    "gray": "encoder: Gray code of a 3-bit pulse position index",
    "dtx_log_en_adjust": "comfort-noise decoder: log-energy offset per mode MR475..MR122, MRDTX, Q11",
    "lsf_hist_mean_scale": "comfort-noise decoder: how far each LSF may vary around its mean, per LSF",
    "gamma1": "weighting-filter numerator factors 0.94^(i+1), Q15, all modes but MR102 and MR122",
    "gamma1_12k2": "weighting-filter numerator factors 0.9^(i+1), Q15, MR102 and MR122",
    "gamma2": "weighting-filter denominator factors 0.6^(i+1), Q15, every mode",
    "gamma3": "post-filter numerator factors 0.55^(i+1), Q15, modes below MR102",
    "gamma3_MR122": "post-filter numerator factors 0.7^(i+1), Q15, MR102 and MR122",
    "gamma4": "post-filter denominator factors 0.7^(i+1), Q15, modes below MR102",
    "gamma4_MR122": "post-filter denominator factors 0.75^(i+1), Q15, MR102 and MR122",
    "grid": "the 61 cosine points (Q15) on which the LP-to-LSP conversion looks for sign changes",
    "inter_36_inter_6": "1/6-sample interpolation filter of the normalised correlation in the fractional "
                        "pitch search, Q15; every second tap gives the 1/3-sample filter",
    "pred_lt_inter_6": "1/6-sample interpolation filter of the past excitation (adaptive codebook), Q15",
    "inv_sqrt_table": "1/sqrt(x) at 49 points, interpolated between neighbours",
    "log2_table": "log2(x) at 33 points, Q15, interpolated between neighbours",
    "pow2_table": "2^x at 33 points, interpolated between neighbours",
    "sqrt_l_table": "sqrt(x) at 49 points, interpolated between neighbours",
    "lag_h": "autocorrelation lag window for lags 1..10: high halves of the double-precision values",
    "lag_l": "autocorrelation lag window for lags 1..10: low halves of the double-precision values",
    "lsp_init_data": "LSP vector that every encoder, decoder and DTX reset starts from, Q15",
    "lsp_lsf_table": "cos(pi·i/64) for i = 0..64, Q15: the LSF/LSP conversions interpolate in it",
    "slope": "slope between neighbouring entries of the cosine table, for the LSP-to-LSF conversion",
    "mode_dep_parm": "fractional pitch search settings per mode (rows MR475..MR122, MRDTX; the MRDTX row is zero)",
    "startPos": "MR475/MR515: start position of each pulse, index 8·track + 2·subframe + pulse",
    "startPos1": "MR59: start positions of the first pulse per track index",
    "startPos2": "MR59: start positions of the second pulse per track index",
    "trackTable": "MR475/MR515 encoder: track code per subframe (row) and pulse position mod 5 (column)",
    "mr515_3_lsf": "three-split LSF codebook, split 3 (LSFs 7-10), MR475 and MR515: 128 rows of 4, Hz-scaled",
    "mr795_1_lsf": "three-split LSF codebook, split 1 (LSFs 1-3), MR795: 512 rows of 3",
    "past_rq_init": "comfort-noise LSF quantiser: 8 starting vectors of the predictor memory, by index",
    "pred": "code-gain energy predictor coefficients, Q13, all modes but MR122",
    "pred_MR122": "code-gain energy predictor coefficients for MR122, Q6",
    "pred_fac": "three-split LSF quantiser: prediction factor per LSF, Q15",
    "q_plsf_3_dico1_lsf": "three-split LSF codebook, split 1 (LSFs 1-3), all three-split modes but MR795: 256 rows of 3",
    "q_plsf_3_dico2_lsf": "three-split LSF codebook, split 2 (LSFs 4-6): 512 rows of 3; MR475/MR515 take the even rows",
    "q_plsf_3_dico3_lsf": "three-split LSF codebook, split 3 (LSFs 7-10), modes MR59 and up: 512 rows of 4",
    "q_plsf_3_mean_lsf": "mean LSF vector of the three-split quantiser (every mode but MR122, and SID)",
    "q_plsf_5_dico1_lsf": "MR122 split-matrix LSF codebook, split 1: LSFs 1-2 of both vectors per row",
    "q_plsf_5_dico2_lsf": "MR122 split-matrix LSF codebook, split 2: LSFs 3-4 of both vectors per row",
    "q_plsf_5_dico3_lsf": "MR122 split-matrix LSF codebook, split 3: LSFs 5-6 of both vectors per row "
                          "(searched with sign, 9-bit index)",
    "q_plsf_5_dico4_lsf": "MR122 split-matrix LSF codebook, split 4: LSFs 7-8 of both vectors per row",
    "q_plsf_5_dico5_lsf": "MR122 split-matrix LSF codebook, split 5: LSFs 9-10 of both vectors per row",
    "q_plsf_5_mean_lsf": "mean LSF vector of MR122, also the DTX and LSP-average reference",
    "qua_gain_code": "scalar code-gain codebook (MR122, MR795): rows of gain factor Q11 and the "
                     "two quantised energies Q10",
    "qua_gain_pitch": "scalar pitch-gain codebook (MR122, MR795), Q14",
    "table_gain_MR475": "MR475 joint gain codebook for two subframes: rows of pitch gain Q14 and "
                        "code-gain factor Q12, twice",
    "table_gain_highrates": "joint gain codebook for MR67, MR74 and MR102: pitch gain Q14, "
                            "code-gain factor Q12, two quantised energies Q10",
    "table_gain_lowrates": "joint gain codebook for MR515 and MR59: pitch gain Q14, "
                           "code-gain factor Q12, two quantised energies Q10",
    "ph_imp_low": "anti-sparseness impulse response, strongest setting, MR475..MR74, Q15",
    "ph_imp_low_MR795": "anti-sparseness impulse response, strongest setting, MR795, Q15",
    "ph_imp_mid": "anti-sparseness impulse response, medium setting, MR475..MR74, Q15",
    "ph_imp_mid_MR795": "anti-sparseness impulse response, medium setting, MR795, Q15",
    "post_pro_a": "decoder output high-pass (about 60 Hz), feedback coefficients, Q13 (the first is not used)",
    "post_pro_b": "decoder output high-pass (about 60 Hz), feed-forward coefficients, Q13; "
                  "the filter's gain of 2 is applied as a shift",
    "pre_proc_a": "encoder input high-pass (about 80 Hz), feedback coefficients, Q12 (the first is not used)",
    "pre_proc_b": "encoder input high-pass (about 80 Hz), feed-forward coefficients, Q12, input halving included",
    "window_160_80": "LP analysis window of 160 + 80 samples, MR122 first analysis, Q15",
    "window_200_40": "LP analysis window of 200 + 40 samples, every mode but MR122, Q15; "
                     "the comfort-noise encoder also draws pseudo-random values from it",
    "window_232_8": "LP analysis window of 232 + 8 samples, MR122 second analysis, Q15",
}


def describe(stem, count):
    if stem in DESCRIBE:
        return DESCRIBE[stem]
    if stem.startswith("bitno_"):
        return f"width in bits of each of the {count} parameters of {stem[6:]}, in parameter order"
    if stem.startswith("sort_"):
        return (f"storage-format bit order of {stem[5:]}: entry i is the parameter-stream index "
                f"of the i-th bit written ({count} bits)")
    if stem.startswith("dhf_"):
        return f"the {count} parameters of the {stem[4:]} decoder homing frame"
    raise KeyError(f"no description for table {stem}: add one to DESCRIBE")


def readers(name, internal):
    """Source files (under src/, tables excepted) that use a table."""
    pat = re.compile((r"\btab::" if internal else r"\b") + re.escape(name) + r"\b")
    found = []
    for d, _, files in os.walk(os.path.join(ROOT, "src")):
        for f in files:
            path = os.path.join(d, f)
            rel = os.path.relpath(path, os.path.join(ROOT, "src"))
            if rel in ("lpc/tables.cpp", "lpc/tables.h", "format/frame_tables.cpp", "format/frame_tables.h",
                       "basic_op/op_tables.cpp", "basic_op/op_tables.h"):
                continue
            with open(path) as fh:
                if pat.search(fh.read()):
                    found.append(rel)
    return sorted(found)


def note_for(stem, name, shape, count, internal):
    text = f"// {name} [{shape}]: {describe(stem, count)}."
    users = readers(name, internal)
    lines, line = [], ""
    for word in text.split(" "):
        if len(line) + len(word) + 1 > 96 and line:
            lines.append(line)
            line = "//" + " " + word
        else:
            line = f"{line} {word}" if line else word
    lines.append(line)
    if users:
        lines.append("// Read by " + ", ".join(users) + ".")
    return "\n".join(lines)


def read_table(path):
    head, vals = {}, []
    with open(path) as f:
        for line in f:
            line = line.strip()
            if line.startswith("#"):
                k, _, v = line[1:].partition(":")
                head[k.strip()] = v.strip()
            elif line:
                vals.extend(int(x) for x in line.split())
    return head, vals


def fmt_values(vals, per_line=12):
    rows = []
    for i in range(0, len(vals), per_line):
        rows.append("    " + ", ".join(str(v) for v in vals[i:i + per_line]) + ",")
    return "\n".join(rows)


def main():
    stems = sorted(f[:-4] for f in os.listdir(SRC) if f.endswith(".txt"))
    tables = {s: read_table(os.path.join(SRC, s + ".txt")) for s in stems}
    banner = ("// Generated by scripts/gen_tables.py from the table files in ../shared/tables\n"
              "// (one file per table); change those or the script and re-run it, not this file.\n")

    def ctype(head):
        return "uint8_t" if head.get("type") == "uint8" else "int16_t"

    out = {"format": ([], [], [], []), "op": ([], [], [], []), "lpc": ([], [], [], [])}  # (c decls, c defs, cpp decls, cpp defs)
    exported = []  # (group, declaration) of every table the library exports
    for s in stems:
        head, vals = tables[s]
        group = "format" if s in FORMAT_STEMS else "op" if s in OP_STEMS else "lpc"
        cdecl, cdef, pdecl, pdef = out[group]
        t = ctype(head)
        n = len(vals)
        shape = head.get("shape", str(n)).replace(" x ", "x")
        for ft, v in STORAGE_SIZES.get(s, {}).items():
            vals[ft] = v
        if s in ("prmno", "prmnofsf"):
            vals = vals + [0]
            n += 1
        if s in EXPORTED or s in ("prmno", "prmnofsf"):
            exported.append((group, f"extern const {t} {EXPORTED.get(s, 'vamrnb_tbl_' + s)}[{n}];"))
        if s in EXPORTED:
            name = EXPORTED[s]
            note = note_for(s, name, shape, n, False)
            cdecl.append(f"extern const {t} {name}[{n}];")
            cdef.append(f"{note}\nconst {t} {name}[{n}] = {{\n{fmt_values(vals)}\n}};\n")
        elif s in ("prmno", "prmnofsf"):
            name = "vamrnb_tbl_" + s
            note = note_for(s, name, shape, n, False)
            cdecl.append(f"extern const {t} {name}[{n}];")
            cdef.append(f"{note}\nconst {t} {name}[{n}] = {{\n{fmt_values(vals)}\n}};\n")
        else:
            note = note_for(s, s, shape, n, True)
            pdecl.append(f"extern const {t} {s}[{n}];")
            pdef.append(f"{note}\nconst {t} {s}[{n}] = {{\n{fmt_values(vals)}\n}};\n")

    fdecl, fdef, fpdecl, fpdef = out["format"]
    public = []  # every exported table, declared once in the public header
    for name, vals in IF2.items():
        fdecl.append(f"extern const int16_t {name}[16];")
        fdef.append(f"const int16_t {name}[16] = {{\n{fmt_values(vals)}\n}};\n")
    fdecl.append("extern const int16_t *const vamrnb_tbl_bitno[10];")
    fdef.append("const int16_t *const vamrnb_tbl_bitno[10] = {\n    "
                + ", ".join(f"vamrnb::tab::bitno_{m}" for m in MODES + ["MRDTX"]) + ", nullptr,\n};\n")
    fdecl.append("extern const int16_t *const vamrnb_tbl_sort_ptr[16];")
    fdef.append("const int16_t *const vamrnb_tbl_sort_ptr[16] = {\n    "
                + ", ".join(f"vamrnb::tab::sort_{s}" for s in SORT)
                + ",\n    nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr,\n};\n")
    exported += [("format", d) for d in fdecl if "_IF2" in d or "*const" in d]
    fpdecl.append("extern const int16_t *const homing_frame_params[8];")
    fpdef.append("const int16_t *const homing_frame_params[8] = {\n    "
                 + ", ".join(f"dhf_{m}" for m in MODES) + ",\n};\n")

    def write(group, path_h, path_cpp, purpose, public_header=None):
        cdecl, cdef, pdecl, pdef = out[group]
        # The public header declares the exported tables with default
        # visibility; including it here gives the definitions that visibility.
        pub = f"#include \"{public_header}\"\n" if public_header else ""
        cblock = ("extern \"C\" {\n" + "\n".join(cdecl) + "\n}\n\n") if cdecl else ""
        guard_h = (f"{banner}// {purpose}\n#pragma once\n\n#include <cstdint>\n\n{pub}"
                   + ("\n" if pub else "") + cblock +
                   "namespace vamrnb::tab {\n" + "\n".join(pdecl) + "\n}  // namespace vamrnb::tab\n")
        with open(os.path.join(ROOT, path_h), "w") as f:
            f.write(guard_h)
        inc = os.path.relpath(os.path.join(ROOT, path_h), os.path.join(ROOT, "src"))
        body = (f"{banner}// {purpose}\n#include \"{inc}\"\n\n"
                "namespace vamrnb::tab {\n\n" + "\n".join(pdef) + "\n}  // namespace vamrnb::tab\n"
                + (("\nextern \"C\" {\n\n" + "\n".join(cdef) + "\n}\n") if cdef else ""))
        with open(os.path.join(ROOT, path_cpp), "w") as f:
            f.write(body)

    # The public header declares the exported tables with default visibility.
    groups = (("format", "frame formats"), ("lpc", "LPC, gain and weighting tables"))
    def doc(decl):
        name = decl.split("[")[0].split()[-1]
        text = DOCS[name].replace("\n", "\n *  ")
        return f"/** {text} */\n"

    body = "".join(f"\n/* {title} */\n"
                   + "".join(f"{doc(d)}VAMRNB_API {d}\n" for g, d in exported if g == key)
                   for key, title in groups)
    with open(os.path.join(ROOT, "include/vamrnb_tables.h"), "w") as f:
        f.write("/**\n * @file vamrnb_tables.h\n"
                " * @brief vamrnb: constant tables exported with the library (read-only).\n *\n"
                " * Frame-format tables that describe every storage-format frame, and the\n"
                " * LPC, gain and weighting tables the codec stages share.  Generated by\n"
                " * scripts/gen_tables.py; do not edit by hand.  Compiles as C11 and as\n"
                " * C++17 on its own.\n */\n"
                "#ifndef VAMRNB_TABLES_H\n#define VAMRNB_TABLES_H\n\n#include <stdint.h>\n\n"
                "#include \"vamrnb.h\"\n\n#ifdef __cplusplus\nextern \"C\" {\n#endif\n" + body
                + "\n#ifdef __cplusplus\n}\n#endif\n\n#endif /* VAMRNB_TABLES_H */\n")

    write("format", "src/format/frame_tables.h", "src/format/frame_tables.cpp",
          "Frame-format tables: sizes, parameter widths, bit order, homing frames.",
          public_header="vamrnb_tables.h")
    write("op", "src/basic_op/op_tables.h", "src/basic_op/op_tables.cpp",
          "Interpolation tables of the extended operators: log2, pow2, 1/sqrt, sqrt.")
    write("lpc", "src/lpc/tables.h", "src/lpc/tables.cpp",
          "Codec constant tables: windows, codebooks, gains, filters, detector tables.",
          public_header="vamrnb_tables.h")


if __name__ == "__main__":
    main()
