/*
 * amr_rtp_pcap: carries an .amr file over RTP and back, through a pcap file.
 *
 *   amr_rtp_pcap send [options] in.amr out.pcap
 *   amr_rtp_pcap receive [options] in.pcap out.amr
 *
 * Options:
 *   -o      octet-aligned payloads (default: bandwidth-efficient)
 *   -c      with frame CRCs (implies -o)
 *   -n N    frames per packet when sending, 1 to 12 (default 1)
 *   -p PT   RTP payload type (default 97)
 *
 * `send` writes one IPv4/UDP/RTP packet (port 5004 to 5004) per N frames of
 * the file (read with the library's stream reader), RTP timestamp in 8 kHz
 * samples.  `receive` keeps the UDP packets
 * to port 5004 with the payload type, parses their payloads and writes the
 * frames back as an .amr file, with NO_DATA frames where packets are missing
 * (packets of NO_DATA frames alone are not sent).
 * The output appears only when complete.
 */
#include <errno.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

#include "vamrnb_rtp.h"
#include "vamrnb_stream.h"

enum { PORT = 5004, SSRC = 0x5AFE0A3B, MAX_PER_PACKET = 12, SNAP = 65535 };

typedef struct options {
    vamrnb_rtp_params params;
    int per_packet;
    int pt;
} options;

static void put16(uint8_t *p, unsigned v) { p[0] = (uint8_t)(v >> 8); p[1] = (uint8_t)v; }
static void put32(uint8_t *p, uint32_t v) { put16(p, v >> 16); put16(p + 2, v & 0xFFFF); }
static unsigned get16(const uint8_t *p) { return (unsigned)p[0] << 8 | p[1]; }
static uint32_t get32(const uint8_t *p) { return (uint32_t)get16(p) << 16 | get16(p + 2); }
static void put32le(uint8_t *p, uint32_t v) {
    for (int i = 0; i < 4; ++i) p[i] = (uint8_t)(v >> (8 * i));
}

static uint8_t *read_file(const char *path, size_t *size) {
    FILE *f = fopen(path, "rb");
    if (!f) return NULL;
    size_t cap = 1 << 16, n = 0;
    uint8_t *buf = malloc(cap);
    while (buf) {
        n += fread(buf + n, 1, cap - n, f);
        if (n < cap) break;
        uint8_t *grown = realloc(buf, cap *= 2);
        if (!grown) free(buf);
        buf = grown;
    }
    int bad = ferror(f);
    fclose(f);
    if (bad) { free(buf); return NULL; }
    *size = n;
    return buf;
}

static int write_packet(FILE *out, const uint8_t *payload, size_t size, int pt, unsigned seq,
                        uint32_t ts, int marker) {
    uint8_t pkt[14 + 20 + 8 + 12 + 1500];
    uint8_t *eth = pkt, *ip = eth + 14, *udp = ip + 20, *rtp = udp + 8;
    const size_t len = 14 + 20 + 8 + 12 + size;
    memset(pkt, 0, 14 + 20 + 8 + 12);
    eth[0] = 0x02; eth[5] = 0x01;   /* locally administered addresses */
    eth[6] = 0x02; eth[11] = 0x02;
    put16(eth + 12, 0x0800);
    ip[0] = 0x45;
    put16(ip + 2, (unsigned)(len - 14));
    put16(ip + 4, seq);
    ip[8] = 64;
    ip[9] = 17;
    put32(ip + 12, 0x0A000001);
    put32(ip + 16, 0x0A000002);
    uint32_t sum = 0;
    for (int i = 0; i < 20; i += 2) sum += get16(ip + i);
    while (sum >> 16) sum = (sum & 0xFFFF) + (sum >> 16);
    put16(ip + 10, ~sum & 0xFFFF);
    put16(udp, PORT);
    put16(udp + 2, PORT);
    put16(udp + 4, (unsigned)(len - 34));  /* checksum 0: none, allowed over IPv4 */
    rtp[0] = 0x80;
    rtp[1] = (uint8_t)((marker ? 0x80 : 0) | pt);
    put16(rtp + 2, seq & 0xFFFF);
    put32(rtp + 4, ts);
    put32(rtp + 8, SSRC);
    memcpy(rtp + 12, payload, size);

    uint8_t rec[16];
    put32le(rec, ts / 8000);
    put32le(rec + 4, (ts % 8000) * 125);
    put32le(rec + 8, (uint32_t)len);
    put32le(rec + 12, (uint32_t)len);
    return fwrite(rec, 1, 16, out) == 16 && fwrite(pkt, 1, len, out) == len ? 0 : -1;
}

/* The .amr input, read in pieces through the library's stream reader. */
typedef struct source {
    FILE *file;
    const char *path;
    vamrnb_stream_reader *reader;
    uint8_t buf[4096];
    size_t pos, len;
} source;

/* The next stored frame into *f: 1, or 0 at a clean end, or -1 (reported). */
static int next_frame(source *s, vamrnb_stream_frame *f) {
    int32_t st = AMRNB_OK;
    for (;;) {
        if (s->pos < s->len) {
            size_t used = 0;
            st = vamrnb_stream_read(s->reader, s->buf + s->pos, s->len - s->pos, &used, f);
            s->pos += used;
            if (st == VAMRNB_STREAM_FRAME) return 1;
            if (st != AMRNB_OK) break;
            continue;
        }
        s->pos = 0;
        s->len = fread(s->buf, 1, sizeof s->buf, s->file);
        if (s->len == 0) {
            if (ferror(s->file)) { fprintf(stderr, "%s: %s\n", s->path, strerror(errno)); return -1; }
            st = vamrnb_stream_finish(s->reader, NULL);
            if (st == AMRNB_OK) return 0;
            break;
        }
    }
    if (st == VAMRNB_STREAM_ERR_TOC)
        fprintf(stderr, "%s: %s (byte %llu)\n", s->path, vamrnb_strerror(st),
                (unsigned long long)vamrnb_stream_reader_offset(s->reader));
    else
        fprintf(stderr, "%s: %s\n", s->path, vamrnb_strerror(st));
    return -1;
}

static int send_stream(const options *o, source *src, FILE *out) {
    uint8_t head[24];
    put32le(head, 0xA1B2C3D4);
    head[4] = 2; head[5] = 0; head[6] = 4; head[7] = 0;   /* version 2.4 */
    memset(head + 8, 0, 8);
    put32le(head + 16, SNAP);
    put32le(head + 20, 1);                                 /* Ethernet */
    if (fwrite(head, 1, 24, out) != 24) return -1;

    unsigned seq = 0;
    uint32_t ts = 0;
    vamrnb_stream_frame f;
    int more = next_frame(src, &f);
    while (more > 0) {
        /* The next N frames; the reserved types cannot be sent and go as NO_DATA. */
        uint8_t frames[MAX_PER_PACKET * VAMRNB_STREAM_MAX_FRAME];
        size_t used = 0;
        int n = 0;
        for (; n < o->per_packet && more > 0; ++n) {
            if (f.type >= 12 && f.type <= 14) frames[used++] = 0x7C;
            else { memcpy(frames + used, f.data, f.size); used += f.size; }
            more = next_frame(src, &f);
        }
        if (more < 0) return -1;
        /* A packet of nothing but NO_DATA frames (all one byte) is not sent;
         * the receiver sees the timestamps skip.  The last one always goes,
         * so that the stream keeps its length. */
        if (used == (size_t)n && more > 0) {
            ts += 160u * (uint32_t)n;
            continue;
        }
        uint8_t payload[1500];
        vamrnb_rtp_info info;
        int32_t st = vamrnb_rtp_pack(&o->params, VAMRNB_RTP_CMR_NONE, frames, used, payload,
                                     sizeof payload, &info);
        if (st != AMRNB_OK) { fprintf(stderr, "packing failed: %s\n", vamrnb_strerror(st)); return -1; }
        if (write_packet(out, payload, info.bytes, o->pt, seq, ts, seq == 0) != 0) return -1;
        ++seq;
        ts += 160u * info.frames;
    }
    return more;
}

static int send_file(const options *o, const char *in_path, FILE *out) {
    source src = {.file = fopen(in_path, "rb"), .path = in_path};
    if (!src.file) { fprintf(stderr, "%s: %s\n", in_path, strerror(errno)); return -1; }
    int32_t error = AMRNB_OK;
    src.reader = vamrnb_stream_reader_create(&error);
    int rc = -1;
    if (!src.reader) fprintf(stderr, "stream reader: %s\n", vamrnb_strerror(error));
    else rc = send_stream(o, &src, out);
    vamrnb_stream_reader_delete(src.reader);
    fclose(src.file);
    return rc;
}

static int receive_file(const options *o, const char *in_path, FILE *out) {
    size_t size = 0;
    uint8_t *in = read_file(in_path, &size);
    if (!in) { fprintf(stderr, "%s: %s\n", in_path, strerror(errno)); return -1; }
    if (size < 24 || (get32(in) != 0xD4C3B2A1u) || in[20] != 1) {
        fprintf(stderr, "%s: not a little-endian Ethernet pcap file\n", in_path);
        free(in);
        return -1;
    }
    int rc = fputs(VAMRNB_STREAM_MAGIC, out) == EOF ? -1 : 0;
    int have_ts = 0;
    uint32_t next_ts = 0;
    for (size_t pos = 24; rc == 0 && pos + 16 <= size;) {
        const uint8_t *rec = in + pos;
        const size_t caplen = (size_t)rec[8] | (size_t)rec[9] << 8 | (size_t)rec[10] << 16
                              | (size_t)rec[11] << 24;
        if (caplen > size - pos - 16) { fprintf(stderr, "%s: last packet cut short\n", in_path); rc = -1; break; }
        const uint8_t *eth = rec + 16;
        pos += 16 + caplen;
        /* IPv4 (options skipped by the header length), UDP to PORT. */
        if (caplen < 14 + 20 || get16(eth + 12) != 0x0800 || (eth[14] >> 4) != 4) continue;
        const uint8_t *ip = eth + 14;
        const size_t ihl = (size_t)(ip[0] & 15) * 4;
        if (ip[9] != 17 || caplen < 14 + ihl + 8 + 12) continue;
        const uint8_t *udp = ip + ihl;
        if (get16(udp + 2) != PORT) continue;
        size_t left = caplen - 14 - ihl - 8;
        const uint8_t *rtp = udp + 8;
        if ((rtp[0] >> 6) != 2 || (rtp[1] & 0x7F) != o->pt) continue;
        size_t head = 12 + 4 * (size_t)(rtp[0] & 15);
        if ((rtp[0] & 0x10) && left >= head + 4) head += 4 + 4 * (size_t)get16(rtp + head + 2);
        if (left < head) continue;
        size_t pad = (rtp[0] & 0x20) ? rtp[left - 1] : 0;
        if (pad > left - head) continue;
        const uint32_t ts = get32(rtp + 4);

        uint8_t frames[4096];
        vamrnb_rtp_info info;
        int32_t st = vamrnb_rtp_parse(&o->params, rtp + head, left - head - pad, frames,
                                      sizeof frames, &info);
        if (st != AMRNB_OK) { fprintf(stderr, "packet at %u refused: %d\n", ts, (int)st); continue; }
        /* Lost packets: NO_DATA for every 20 ms the timestamps skip. */
        while (have_ts && (int32_t)(ts - next_ts) > 0 && rc == 0) {
            rc = fputc(0x7C, out) == EOF ? -1 : 0;
            next_ts += 160;
        }
        if (rc == 0 && fwrite(frames, 1, info.bytes, out) != info.bytes) rc = -1;
        have_ts = 1;
        next_ts = ts + 160u * info.frames;
    }
    free(in);
    return rc;
}

static int usage(void) {
    fprintf(stderr, "usage: amr_rtp_pcap send|receive [-o] [-c] [-n frames] [-p pt] in out\n");
    return 2;
}

int main(int argc, char **argv) {
    if (argc < 2) return usage();
    const int sending = strcmp(argv[1], "send") == 0;
    if (!sending && strcmp(argv[1], "receive") != 0) return usage();
    options o;
    vamrnb_rtp_params_default(&o.params);
    o.per_packet = 1;
    o.pt = 97;
    int i = 2;
    for (; i < argc && argv[i][0] == '-'; ++i) {
        if (strcmp(argv[i], "-o") == 0) o.params.octet_align = 1;
        else if (strcmp(argv[i], "-c") == 0) o.params.octet_align = o.params.crc = 1;
        else if (strcmp(argv[i], "-n") == 0 && i + 1 < argc) o.per_packet = atoi(argv[++i]);
        else if (strcmp(argv[i], "-p") == 0 && i + 1 < argc) o.pt = atoi(argv[++i]);
        else return usage();
    }
    if (argc - i != 2 || o.per_packet < 1 || o.per_packet > MAX_PER_PACKET || o.pt < 96 || o.pt > 127)
        return usage();

    /* Written beside the destination and renamed into place only when whole. */
    const char *dest = argv[i + 1];
    char *part = malloc(strlen(dest) + 6);
    if (!part) return 1;
    sprintf(part, "%s.part", dest);
    FILE *out = fopen(part, "wb");
    if (!out) { fprintf(stderr, "%s: %s\n", part, strerror(errno)); free(part); return 1; }
    int rc = sending ? send_file(&o, argv[i], out) : receive_file(&o, argv[i], out);
    if (fclose(out) != 0) rc = -1;
    if (rc == 0 && rename(part, dest) != 0) {
        fprintf(stderr, "%s: %s\n", dest, strerror(errno));
        rc = -1;
    }
    if (rc != 0) remove(part);
    free(part);
    return rc == 0 ? 0 : 1;
}
