/* vamrnbdec: decodes AMR-NB storage-format frames (audio/AMR, as amrparse,
 * qtdemux and rtpamrdepay hand them out) into 8 kHz PCM with the vamrnb
 * decoder.  One input buffer may hold any number of whole frames.  Frames that
 * never arrived -- GAP events, buffers flagged GAP, and holes in the
 * timestamps after a discontinuity -- are decoded as no-data frames, so the
 * decoder's concealment (or comfort noise) fills them instead of silence.
 * The output format (S16, S8 or S24LE) and one or two channels are picked by
 * caps negotiation and map onto the decoder's own output stage. */
#include "vamrnbdec.h"

#include <string.h>

#include "vamrnb_tables.h"

GST_DEBUG_CATEGORY_STATIC (vamrnbdec_debug);
#define GST_CAT_DEFAULT vamrnbdec_debug

#define FRAME_SAMPLES 160
#define FRAME_NS (20 * GST_MSECOND)
/* A lost frame is handed to the decoder as a no-data frame: its
 * table-of-contents byte alone. */
#define NO_DATA_TOC 0x7C
/* Concealment fades to silence well within this; a longer hole (a stream
 * paused for minutes) is not filled, only its last frames are. */
#define MAX_CONCEALED 250

struct _GstVamrnbDec
{
  GstAudioDecoder parent;

  vamrnb_decoder *dec;
  codec_config config;
  guint channels;
  guint bytes_per_sample;
  /* Where the next input frame should start; NONE until the first timestamped
   * buffer and after a flush.  A later timestamp means frames were lost. */
  GstClockTime next_pts;
  gboolean warned_truncated;
};

G_DEFINE_TYPE (GstVamrnbDec, gst_vamrnb_dec, GST_TYPE_AUDIO_DECODER);
GST_ELEMENT_REGISTER_DEFINE_WITH_CODE (vamrnbdec, "vamrnbdec",
    GST_RANK_PRIMARY, GST_TYPE_VAMRNB_DEC,
    GST_DEBUG_CATEGORY_INIT (vamrnbdec_debug, "vamrnbdec", 0,
        "vamrnb AMR-NB decoder"));

static GstStaticPadTemplate sink_template = GST_STATIC_PAD_TEMPLATE ("sink",
    GST_PAD_SINK, GST_PAD_ALWAYS,
    GST_STATIC_CAPS ("audio/AMR, rate = (int) 8000, channels = (int) 1"));

/* S16 first: it is what the decoder produces natively and what fixation picks
 * when downstream accepts anything. */
static GstStaticPadTemplate src_template = GST_STATIC_PAD_TEMPLATE ("src",
    GST_PAD_SRC, GST_PAD_ALWAYS,
    GST_STATIC_CAPS ("audio/x-raw, format = (string) { " GST_AUDIO_NE (S16)
        ", S8, S24LE }, layout = (string) interleaved, rate = (int) 8000, "
        "channels = (int) [ 1, 2 ]"));

static void
free_decoder (GstVamrnbDec * self)
{
  if (self->dec) {
    vamrnbd_delete (self->dec);
    self->dec = NULL;
  }
}

static gboolean
gst_vamrnb_dec_stop (GstAudioDecoder * dec)
{
  free_decoder (GST_VAMRNB_DEC (dec));
  return TRUE;
}

/* Output sample format code of the decoder's configuration for a raw audio
 * format, or -1 when the decoder has none. */
static int
format_code (GstAudioFormat format, guint * bytes)
{
  switch (format) {
    case GST_AUDIO_FORMAT_S8:
      *bytes = 1;
      return 1;
    case GST_AUDIO_FORMAT_S24LE:
      *bytes = 3;
      return 3;
    default:
      if (format == GST_AUDIO_FORMAT_S16) {
        *bytes = 2;
        return 0;
      }
      return -1;
  }
}

static gboolean
gst_vamrnb_dec_set_format (GstAudioDecoder * dec, GstCaps * caps)
{
  GstVamrnbDec *self = GST_VAMRNB_DEC (dec);
  GstCaps *allowed = gst_pad_get_allowed_caps (GST_AUDIO_DECODER_SRC_PAD (dec));
  GstAudioInfo info;
  GstAudioFormat format;
  gint channels = 1;
  guint bytes = 2;
  int code;
  int32_t err = AMRNB_OK;
  GstAudioChannelPosition stereo[2] = { GST_AUDIO_CHANNEL_POSITION_FRONT_LEFT,
    GST_AUDIO_CHANNEL_POSITION_FRONT_RIGHT
  };

  (void) caps;
  if (!allowed)
    allowed = gst_pad_get_pad_template_caps (GST_AUDIO_DECODER_SRC_PAD (dec));
  if (gst_caps_is_empty (allowed)) {
    gst_caps_unref (allowed);
    return FALSE;
  }
  allowed = gst_caps_fixate (allowed);
  {
    GstStructure *s = gst_caps_get_structure (allowed, 0);
    const gchar *name = gst_structure_get_string (s, "format");

    format = name ? gst_audio_format_from_string (name) : GST_AUDIO_FORMAT_S16;
    if (!gst_structure_get_int (s, "channels", &channels))
      channels = 1;
  }
  gst_caps_unref (allowed);

  code = format_code (format, &bytes);
  if (code < 0 || channels < 1 || channels > 2) {
    GST_ERROR_OBJECT (self, "no decoder output for format %s, %d channels",
        gst_audio_format_to_string (format), channels);
    return FALSE;
  }

  /* The caps may change mid-stream (a new demuxer stream): start afresh. */
  free_decoder (self);
  memset (&self->config, 0, sizeof self->config);
  self->config.dec.layout = 1;  /* interleaved */
  self->config.dec.channels = channels;
  self->config.dec.sample_format = code;
  self->dec = vamrnbd_create (&self->config, &err);
  if (!self->dec) {
    GST_ERROR_OBJECT (self, "decoder creation failed (%d)", (int) err);
    return FALSE;
  }
  self->channels = (guint) channels;
  self->bytes_per_sample = bytes;
  self->next_pts = GST_CLOCK_TIME_NONE;
  self->warned_truncated = FALSE;

  gst_audio_info_init (&info);
  gst_audio_info_set_format (&info, format, 8000, channels,
      channels == 2 ? stereo : NULL);
  return gst_audio_decoder_set_output_format (dec, &info);
}

/* Decodes one frame of `size` bytes into `out`; returns the bytes of output
 * written (0 when the frame type is refused and gives no audio). */
static gsize
decode_one (GstVamrnbDec * self, const guint8 * frame, gsize size, guint8 * out)
{
  bitstream_buffer in = { (uint8_t *) frame, 0, (uint32_t) size };
  pcm_buffer pcm;
  frame_info info;
  int32_t status;

  memset (&pcm, 0, sizeof pcm);
  memset (&info, 0, sizeof info);
  pcm.data[0] = out;
  status = vamrnbd_decode (self->dec, &in, &pcm, &info);
  if (status != AMRNB_OK) {
    /* Frame types 10 and 11: the decoder refuses them and produces nothing,
     * as the library's own file decoding does. */
    GST_DEBUG_OBJECT (self, "frame type %d refused (%d)", (frame[0] >> 3) & 15,
        (int) status);
    return 0;
  }
  return pcm.bytes[0];
}

/* Storage-format bytes of the frame that starts with this table-of-contents
 * byte (types 12 to 15 are the byte alone). */
static gsize
frame_bytes (guint8 toc)
{
  gint size = vamrnb_tbl_packed_size[(toc >> 3) & 15];
  return size > 0 ? (gsize) size : 1;
}

static GstFlowReturn
gst_vamrnb_dec_handle_frame (GstAudioDecoder * dec, GstBuffer * buffer)
{
  GstVamrnbDec *self = GST_VAMRNB_DEC (dec);
  const gsize frame_out = FRAME_SAMPLES * self->channels * self->bytes_per_sample;
  const guint8 no_data = NO_DATA_TOC;
  GstMapInfo in, out;
  GstBuffer *outbuf;
  GstClockTime pts, duration;
  guint lost = 0, frames = 0;
  gsize pos, written = 0;
  gboolean gap;

  if (!buffer)                  /* drain: the decoder holds nothing back */
    return GST_FLOW_OK;
  if (!self->dec) {
    GST_ELEMENT_ERROR (self, CORE, NEGOTIATION, (NULL), ("no input format"));
    return GST_FLOW_NOT_NEGOTIATED;
  }
  if (!gst_buffer_map (buffer, &in, GST_MAP_READ))
    return GST_FLOW_ERROR;

  pts = GST_BUFFER_PTS (buffer);
  duration = GST_BUFFER_DURATION (buffer);
  gap = in.size == 0 || GST_BUFFER_FLAG_IS_SET (buffer, GST_BUFFER_FLAG_GAP);

  for (pos = 0; !gap && pos < in.size; pos += frame_bytes (in.data[pos]))
    frames++;

  if (GST_CLOCK_TIME_IS_VALID (pts) && GST_CLOCK_TIME_IS_VALID (self->next_pts)
      && pts >= self->next_pts + FRAME_NS / 2) {
    /* Frames are missing before this buffer (an RTP packet was dropped, say):
     * conceal them first and move the buffer's timestamp back to where the
     * hole starts, so that the output stays continuous. */
    lost = (guint) MIN ((pts - self->next_pts + FRAME_NS / 2) / FRAME_NS,
        MAX_CONCEALED);
    GST_DEBUG_OBJECT (self, "%u frames lost before %" GST_TIME_FORMAT, lost,
        GST_TIME_ARGS (pts));
    pts -= MIN (pts, lost * FRAME_NS);
    GST_BUFFER_PTS (buffer) = pts;
  }
  if (gap) {
    /* A stretch of lost audio: as many frames as it lasts, at least one. */
    guint n = GST_CLOCK_TIME_IS_VALID (duration)
        ? (guint) MIN ((duration + FRAME_NS / 2) / FRAME_NS, MAX_CONCEALED) : 0;
    lost += n > 0 ? n : 1;
  }

  outbuf = gst_audio_decoder_allocate_output_buffer (dec,
      (lost + frames) * frame_out);
  if (!outbuf || !gst_buffer_map (outbuf, &out, GST_MAP_WRITE)) {
    if (outbuf)
      gst_buffer_unref (outbuf);
    gst_buffer_unmap (buffer, &in);
    return GST_FLOW_ERROR;
  }

  for (guint i = 0; i < lost; i++)
    written += decode_one (self, &no_data, 1, out.data + written);

  for (pos = 0; !gap && pos < in.size;) {
    gsize size = frame_bytes (in.data[pos]);

    if (pos + size > in.size) {
      /* A frame cut short by its container: treat it as lost. */
      if (!self->warned_truncated) {
        GST_ELEMENT_WARNING (self, STREAM, DECODE, (NULL),
            ("truncated frame (%u of %u bytes) concealed",
                (guint) (in.size - pos), (guint) size));
        self->warned_truncated = TRUE;
      }
      written += decode_one (self, &no_data, 1, out.data + written);
    } else {
      written += decode_one (self, in.data + pos, size, out.data + written);
    }
    pos += size;
  }

  gst_buffer_unmap (outbuf, &out);
  gst_buffer_unmap (buffer, &in);

  if (GST_CLOCK_TIME_IS_VALID (pts))
    self->next_pts = pts + (lost + frames) * FRAME_NS;

  if (written == 0) {
    gst_buffer_unref (outbuf);
    return gst_audio_decoder_finish_frame (dec, NULL, 1);
  }
  gst_buffer_set_size (outbuf, written);
  return gst_audio_decoder_finish_frame (dec, outbuf, 1);
}

static void
gst_vamrnb_dec_flush (GstAudioDecoder * dec, gboolean hard)
{
  GstVamrnbDec *self = GST_VAMRNB_DEC (dec);

  /* A soft flush is a discontinuity: keep the decoder's state so that the
   * frames after it are concealed and decoded from where the stream was.
   * A hard flush (a seek) starts a new stream. */
  if (hard) {
    if (self->dec)
      vamrnbd_reset (self->dec);
    self->next_pts = GST_CLOCK_TIME_NONE;
  }
}

static void
gst_vamrnb_dec_finalize (GObject * object)
{
  free_decoder (GST_VAMRNB_DEC (object));
  G_OBJECT_CLASS (gst_vamrnb_dec_parent_class)->finalize (object);
}

static void
gst_vamrnb_dec_class_init (GstVamrnbDecClass * klass)
{
  GObjectClass *gobject_class = G_OBJECT_CLASS (klass);
  GstElementClass *element_class = GST_ELEMENT_CLASS (klass);
  GstAudioDecoderClass *base_class = GST_AUDIO_DECODER_CLASS (klass);

  gobject_class->finalize = gst_vamrnb_dec_finalize;
  gst_element_class_add_static_pad_template (element_class, &sink_template);
  gst_element_class_add_static_pad_template (element_class, &src_template);
  gst_element_class_set_static_metadata (element_class,
      "vamrnb AMR-NB audio decoder", "Codec/Decoder/Audio",
      "Decodes AMR narrowband speech with the vamrnb library, concealing "
      "lost frames", "vamrnb developers");

  base_class->stop = GST_DEBUG_FUNCPTR (gst_vamrnb_dec_stop);
  base_class->set_format = GST_DEBUG_FUNCPTR (gst_vamrnb_dec_set_format);
  base_class->handle_frame = GST_DEBUG_FUNCPTR (gst_vamrnb_dec_handle_frame);
  base_class->flush = GST_DEBUG_FUNCPTR (gst_vamrnb_dec_flush);
}

static void
gst_vamrnb_dec_init (GstVamrnbDec * self)
{
  GstAudioDecoder *dec = GST_AUDIO_DECODER (self);

  self->dec = NULL;
  self->channels = 1;
  self->bytes_per_sample = 2;
  self->next_pts = GST_CLOCK_TIME_NONE;
  /* GAP events reach handle_frame as empty buffers and are concealed. */
  gst_audio_decoder_set_plc_aware (dec, TRUE);
  gst_audio_decoder_set_plc (dec, TRUE);
  gst_audio_decoder_set_drainable (dec, FALSE);
  gst_audio_decoder_set_needs_format (dec, TRUE);
  gst_audio_decoder_set_use_default_pad_acceptcaps (dec, TRUE);
  GST_PAD_SET_ACCEPT_TEMPLATE (GST_AUDIO_DECODER_SINK_PAD (dec));
}
