#!/usr/bin/env bash
# Rebuilds tests/data, the small set of reference vectors bundled with the
# sources, from the full set in $VAMRNB_SHARED (default ../shared).  The
# choice is explained in tests/data/README.md.
set -euo pipefail
cd "$(dirname "$0")/.."
shared=${VAMRNB_SHARED:-../shared}
out=tests/data
v=$shared/vectors

items=(sig_dtmf_1-9_0_star_hash_ABCD_100ms sig_white_-20dBov_odd-length)
err_streams=(
    speech_cs_m_fillets-bigfish/bfi05pct_MR475
    speech_cs_m_fillets-bigfish/ber1e-2_MR122
    speech_cs_m_fillets-bigfish/lost05_MR795
    speech_cs_m_fillets-bigfish/modecycle
    speech_cs_m_fillets-bigfish/homing_MR475
    speech_cs_m_fillets-bigfish/homing_MR122
    speech_cs_m_fillets-bigfish/ft9-14_MR122
    dtx_it-IT_m_carlo_talkspurts_noise-bed/vad1_MR795_ft9-14
    dtx_it-IT_m_carlo_talkspurts_noise-bed/vad1_MR122_sidupdate-lost
    dtx_it-IT_m_carlo_talkspurts_noise-bed/vad2_MR475_sid-bad
)
dec_pcm=(sig_dtmf_1-9_0_star_hash_ABCD_100ms/MR122_nodtx sig_dtmf_1-9_0_star_hash_ABCD_100ms/MR475_vad1)

rm -rf "$out/vectors" "$out/corpus"
mkdir -p "$out/corpus" "$out/vectors/3gpp"
for item in "${items[@]}"; do
    cp "$shared/corpus/$item.pcm" "$out/corpus/"
    mkdir -p "$out/vectors/enc/$item" "$out/vectors/dec/$item"
    cp "$v/enc/$item/"*.amr "$out/vectors/enc/$item/"
    cp "$v/dec/$item/"*.crc "$out/vectors/dec/$item/"
done
for s in "${dec_pcm[@]}"; do cp "$v/dec/$s.pcm" "$out/vectors/dec/$s.pcm"; done
for s in "${err_streams[@]}"; do
    mkdir -p "$out/vectors/err/$(dirname "$s")"
    cp "$v/err/$s.amr" "$v/err/$s.crc" "$out/vectors/err/$(dirname "$s")/"
done
cp "$v/3gpp/modes.txt" "$v/3gpp/spch_dos_input.pcm" "$v/3gpp/"spch_do?.amr \
   "$v/3gpp/"spch_do?.crc "$out/vectors/3gpp/"
chmod -R u+w "$out"
du -sh "$out"
