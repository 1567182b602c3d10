#!/usr/bin/env python3
"""Generates the codec's constant tables as C++ source from the plain-text
table files (one file per table: five '#' header lines, then the values).

    python3 scripts/gen_tables.py [TABLE_DIR]

TABLE_DIR defaults to ../shared/tables beside the project.  Writes
src/format/frame_tables.{h,cpp} (frame-format and homing tables) and
src/lpc/tables.{h,cpp} (every other table).  The generated files are committed
so that a checkout builds without the table files.
"""
import os
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
    banner = ("// Generated by scripts/gen_tables.py from the plain-text constant tables of\n"
              "// the AMR-NB fixed-point reference; do not edit by hand, re-run the script.\n")

    def ctype(head):
        return "uint8_t" if head.get("type") == "uint8" else "int16_t"

    out = {"format": ([], [], [], []), "lpc": ([], [], [], [])}  # (c decls, c defs, cpp decls, cpp defs)
    exported = []  # (group, declaration) of every table the library exports
    for s in stems:
        head, vals = tables[s]
        group = "format" if s in FORMAT_STEMS else "lpc"
        cdecl, cdef, pdecl, pdef = out[group]
        t = ctype(head)
        n = len(vals)
        note = f"// {head.get('name', s)}: {head.get('shape', n)} — {head.get('used for', '')}"
        for ft, v in STORAGE_SIZES.get(s, {}).items():
            vals[ft] = v
        if s in ("prmno", "prmnofsf"):
            vals = vals + [0]
            n += 1
        if s in EXPORTED or s in ("prmno", "prmnofsf"):
            exported.append((group, f"extern const {t} {EXPORTED.get(s, 'vamrnb_tbl_' + s)}[{n}];"))
        if s in EXPORTED:
            name = EXPORTED[s]
            cdecl.append(f"extern const {t} {name}[{n}];")
            cdef.append(f"{note}\nconst {t} {name}[{n}] = {{\n{fmt_values(vals)}\n}};\n")
        elif s in ("prmno", "prmnofsf"):
            name = "vamrnb_tbl_" + s
            cdecl.append(f"extern const {t} {name}[{n}];")
            cdef.append(f"{note}\nconst {t} {name}[{n}] = {{\n{fmt_values(vals)}\n}};\n")
        else:
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
        guard_h = (f"{banner}// {purpose}\n#pragma once\n\n#include <cstdint>\n\n{pub}"
                   + ("\n" if pub else "") +
                   "extern \"C\" {\n" + "\n".join(cdecl) + "\n}\n\n"
                   "namespace vamrnb::tab {\n" + "\n".join(pdecl) + "\n}  // namespace vamrnb::tab\n")
        with open(os.path.join(ROOT, path_h), "w") as f:
            f.write(guard_h)
        inc = os.path.relpath(os.path.join(ROOT, path_h), os.path.join(ROOT, "src"))
        body = (f"{banner}// {purpose}\n#include \"{inc}\"\n\n"
                "namespace vamrnb::tab {\n\n" + "\n".join(pdef) + "\n}  // namespace vamrnb::tab\n\n"
                "extern \"C\" {\n\n" + "\n".join(cdef) + "\n}\n")
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
    write("lpc", "src/lpc/tables.h", "src/lpc/tables.cpp",
          "Codec constant tables: windows, codebooks, gains, filters, detector tables.",
          public_header="vamrnb_tables.h")


if __name__ == "__main__":
    main()
