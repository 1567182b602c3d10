/* vamrnbenc: encodes 8 kHz mono S16 PCM into AMR-NB storage-format frames
 * (audio/AMR, one 20 ms frame per buffer) with the vamrnb encoder.  The codec
 * mode can change while playing and applies from the next frame; DTX and the
 * voice activity detector are fixed when the element starts.  At the end of
 * the stream a last partial frame is padded with silence. */
#include "vamrnbenc.h"

#include <string.h>

GST_DEBUG_CATEGORY_STATIC (vamrnbenc_debug);
#define GST_CAT_DEFAULT vamrnbenc_debug

#define FRAME_SAMPLES 160
#define FRAME_NS (20 * GST_MSECOND)
#define MAX_FRAME_BYTES 32
#define FILE_MAGIC "#!AMR\n"
#define FILE_MAGIC_SIZE 6

#define DEFAULT_BAND_MODE MR122
#define DEFAULT_DTX FALSE
#define DEFAULT_VAD 1
#define DEFAULT_FILE_HEADER FALSE
#define DEFAULT_SEND_NO_DATA TRUE
#define NO_DATA_TYPE 15

enum
{
  PROP_0,
  PROP_BAND_MODE,
  PROP_DTX,
  PROP_VAD,
  PROP_FILE_HEADER,
  PROP_SEND_NO_DATA
};

struct _GstVamrnbEnc
{
  GstAudioEncoder parent;

  vamrnb_encoder *enc;
  /* Properties, guarded by the object lock.  `mode_pending` is set when the
   * mode changes while the encoder runs and cleared when it is applied. */
  gint band_mode;
  gboolean mode_pending;
  gboolean dtx;
  guint vad;
  gboolean file_header;
  gboolean send_no_data;
  /* The storage-file magic is still to be written before the next frame. */
  gboolean header_due;
};

G_DEFINE_TYPE (GstVamrnbEnc, gst_vamrnb_enc, GST_TYPE_AUDIO_ENCODER);
GST_ELEMENT_REGISTER_DEFINE_WITH_CODE (vamrnbenc, "vamrnbenc",
    GST_RANK_SECONDARY, GST_TYPE_VAMRNB_ENC,
    GST_DEBUG_CATEGORY_INIT (vamrnbenc_debug, "vamrnbenc", 0,
        "vamrnb AMR-NB encoder"));

static GstStaticPadTemplate sink_template = GST_STATIC_PAD_TEMPLATE ("sink",
    GST_PAD_SINK, GST_PAD_ALWAYS,
    GST_STATIC_CAPS ("audio/x-raw, format = (string) " GST_AUDIO_NE (S16) ", "
        "layout = (string) interleaved, rate = (int) 8000, channels = (int) 1"));

static GstStaticPadTemplate src_template = GST_STATIC_PAD_TEMPLATE ("src",
    GST_PAD_SRC, GST_PAD_ALWAYS,
    GST_STATIC_CAPS ("audio/AMR, rate = (int) 8000, channels = (int) 1"));

GType
gst_vamrnb_band_mode_get_type (void)
{
  static GType type = 0;
  static const GEnumValue values[] = {
    {MR475, "MR475 (4.75 kbit/s)", "MR475"},
    {MR515, "MR515 (5.15 kbit/s)", "MR515"},
    {MR59, "MR59 (5.90 kbit/s)", "MR59"},
    {MR67, "MR67 (6.70 kbit/s)", "MR67"},
    {MR74, "MR74 (7.40 kbit/s)", "MR74"},
    {MR795, "MR795 (7.95 kbit/s)", "MR795"},
    {MR102, "MR102 (10.2 kbit/s)", "MR102"},
    {MR122, "MR122 (12.2 kbit/s)", "MR122"},
    {0, NULL, NULL}
  };

  if (g_once_init_enter (&type)) {
    GType t = g_enum_register_static ("GstVamrnbBandMode", values);
    g_once_init_leave (&type, t);
  }
  return type;
}

static gboolean
gst_vamrnb_enc_start (GstAudioEncoder * benc)
{
  GstVamrnbEnc *self = GST_VAMRNB_ENC (benc);
  codec_config config;
  int32_t err = AMRNB_OK;

  memset (&config, 0, sizeof config);
  GST_OBJECT_LOCK (self);
  config.enc.dtx = self->dtx ? 1 : 0;
  /* Detector 2 is selected by exactly 1 in the configuration word. */
  config.enc.vad_option = self->vad == 2 ? 1 : 0;
  config.enc.mode = self->band_mode;
  self->mode_pending = FALSE;
  self->header_due = self->file_header;
  GST_OBJECT_UNLOCK (self);

  self->enc = vamrnbe_create (&config, &err);
  if (!self->enc) {
    GST_ELEMENT_ERROR (self, LIBRARY, INIT, (NULL),
        ("encoder creation failed (%d)", (int) err));
    return FALSE;
  }
  return TRUE;
}

static gboolean
gst_vamrnb_enc_stop (GstAudioEncoder * benc)
{
  GstVamrnbEnc *self = GST_VAMRNB_ENC (benc);

  if (self->enc) {
    vamrnbe_delete (self->enc);
    self->enc = NULL;
  }
  return TRUE;
}

static gboolean
gst_vamrnb_enc_set_format (GstAudioEncoder * benc, GstAudioInfo * info)
{
  GstCaps *caps;
  gboolean ok;

  (void) info;                  /* fixed by the sink template */
  gst_audio_encoder_set_frame_samples_min (benc, FRAME_SAMPLES);
  gst_audio_encoder_set_frame_samples_max (benc, FRAME_SAMPLES);
  gst_audio_encoder_set_frame_max (benc, 1);
  /* A frame is coded as soon as its 160 samples are in. */
  gst_audio_encoder_set_latency (benc, 0, 0);

  caps = gst_static_pad_template_get_caps (&src_template);
  ok = gst_audio_encoder_set_output_format (benc, caps);
  gst_caps_unref (caps);
  return ok;
}

static GstFlowReturn
gst_vamrnb_enc_handle_frame (GstAudioEncoder * benc, GstBuffer * buffer)
{
  GstVamrnbEnc *self = GST_VAMRNB_ENC (benc);
  int16_t samples[FRAME_SAMPLES];
  guint8 frame[FILE_MAGIC_SIZE + MAX_FRAME_BYTES];
  pcm_buffer pcm;
  bitstream_buffer out;
  frame_info info;
  GstMapInfo map;
  gsize taken, header;
  gint mode = -1;
  gboolean send_no_data;
  GstBuffer *outbuf;

  if (!buffer)                  /* drain: nothing is held back */
    return GST_FLOW_OK;
  if (!gst_buffer_map (buffer, &map, GST_MAP_READ))
    return GST_FLOW_ERROR;
  /* The last buffer of a stream may be short: pad it with silence. */
  taken = MIN (map.size, sizeof samples);
  memcpy (samples, map.data, taken);
  memset ((guint8 *) samples + taken, 0, sizeof samples - taken);
  gst_buffer_unmap (buffer, &map);

  GST_OBJECT_LOCK (self);
  if (self->mode_pending) {
    mode = self->band_mode;
    self->mode_pending = FALSE;
  }
  GST_OBJECT_UNLOCK (self);
  if (mode >= 0)
    vamrnbe_set_mode (self->enc, mode);

  header = self->header_due ? FILE_MAGIC_SIZE : 0;
  memcpy (frame, FILE_MAGIC, header);
  self->header_due = FALSE;

  memset (&pcm, 0, sizeof pcm);
  memset (&info, 0, sizeof info);
  pcm.data[0] = samples;
  out.data = frame + header;
  out.reserved = 0;
  out.size = MAX_FRAME_BYTES;
  vamrnbe_encode (self->enc, &pcm, &out, &info);

  GST_OBJECT_LOCK (self);
  send_no_data = self->send_no_data;
  GST_OBJECT_UNLOCK (self);
  if (info.frame_type == NO_DATA_TYPE && !send_no_data && header == 0) {
    /* Left out: the hole in the timestamps tells the receiver. */
    return gst_audio_encoder_finish_frame (benc, NULL,
        (gint) (taken / sizeof (int16_t)));
  }

  outbuf = gst_audio_encoder_allocate_output_buffer (benc, header + info.bytes);
  if (!outbuf)
    return GST_FLOW_ERROR;
  gst_buffer_fill (outbuf, 0, frame, header + info.bytes);
  /* Sample count of the input actually consumed, so that the base class
   * timestamps stay true to the input; pre_push gives the frame its whole
   * 20 ms. */
  return gst_audio_encoder_finish_frame (benc, outbuf,
      (gint) (taken / sizeof (int16_t)));
}

static GstFlowReturn
gst_vamrnb_enc_pre_push (GstAudioEncoder * benc, GstBuffer ** buffer)
{
  (void) benc;
  *buffer = gst_buffer_make_writable (*buffer);
  GST_BUFFER_DURATION (*buffer) = FRAME_NS;
  return GST_FLOW_OK;
}

static void
gst_vamrnb_enc_set_property (GObject * object, guint prop_id,
    const GValue * value, GParamSpec * pspec)
{
  GstVamrnbEnc *self = GST_VAMRNB_ENC (object);

  GST_OBJECT_LOCK (self);
  switch (prop_id) {
    case PROP_BAND_MODE:
      self->band_mode = g_value_get_enum (value);
      self->mode_pending = TRUE;
      break;
    case PROP_DTX:
      self->dtx = g_value_get_boolean (value);
      break;
    case PROP_VAD:
      self->vad = g_value_get_uint (value);
      break;
    case PROP_FILE_HEADER:
      self->file_header = g_value_get_boolean (value);
      break;
    case PROP_SEND_NO_DATA:
      self->send_no_data = g_value_get_boolean (value);
      break;
    default:
      G_OBJECT_WARN_INVALID_PROPERTY_ID (object, prop_id, pspec);
      break;
  }
  GST_OBJECT_UNLOCK (self);
}

static void
gst_vamrnb_enc_get_property (GObject * object, guint prop_id, GValue * value,
    GParamSpec * pspec)
{
  GstVamrnbEnc *self = GST_VAMRNB_ENC (object);

  GST_OBJECT_LOCK (self);
  switch (prop_id) {
    case PROP_BAND_MODE:
      g_value_set_enum (value, self->band_mode);
      break;
    case PROP_DTX:
      g_value_set_boolean (value, self->dtx);
      break;
    case PROP_VAD:
      g_value_set_uint (value, self->vad);
      break;
    case PROP_FILE_HEADER:
      g_value_set_boolean (value, self->file_header);
      break;
    case PROP_SEND_NO_DATA:
      g_value_set_boolean (value, self->send_no_data);
      break;
    default:
      G_OBJECT_WARN_INVALID_PROPERTY_ID (object, prop_id, pspec);
      break;
  }
  GST_OBJECT_UNLOCK (self);
}

static void
gst_vamrnb_enc_finalize (GObject * object)
{
  gst_vamrnb_enc_stop (GST_AUDIO_ENCODER (object));
  G_OBJECT_CLASS (gst_vamrnb_enc_parent_class)->finalize (object);
}

static void
gst_vamrnb_enc_class_init (GstVamrnbEncClass * klass)
{
  GObjectClass *gobject_class = G_OBJECT_CLASS (klass);
  GstElementClass *element_class = GST_ELEMENT_CLASS (klass);
  GstAudioEncoderClass *base_class = GST_AUDIO_ENCODER_CLASS (klass);

  gobject_class->set_property = gst_vamrnb_enc_set_property;
  gobject_class->get_property = gst_vamrnb_enc_get_property;
  gobject_class->finalize = gst_vamrnb_enc_finalize;

  g_object_class_install_property (gobject_class, PROP_BAND_MODE,
      g_param_spec_enum ("band-mode", "Band mode",
          "Codec mode (bit rate); a change applies from the next frame",
          GST_TYPE_VAMRNB_BAND_MODE, DEFAULT_BAND_MODE,
          G_PARAM_READWRITE | G_PARAM_STATIC_STRINGS |
          GST_PARAM_MUTABLE_PLAYING));
  g_object_class_install_property (gobject_class, PROP_DTX,
      g_param_spec_boolean ("dtx", "DTX",
          "Discontinuous transmission: silence is sent as comfort-noise (SID) "
          "and no-data frames (applies when the element starts)",
          DEFAULT_DTX, G_PARAM_READWRITE | G_PARAM_STATIC_STRINGS |
          GST_PARAM_MUTABLE_READY));
  g_object_class_install_property (gobject_class, PROP_VAD,
      g_param_spec_uint ("vad", "VAD",
          "Voice activity detector used with DTX, 1 or 2 (applies when the "
          "element starts)", 1, 2, DEFAULT_VAD,
          G_PARAM_READWRITE | G_PARAM_STATIC_STRINGS |
          GST_PARAM_MUTABLE_READY));
  g_object_class_install_property (gobject_class, PROP_FILE_HEADER,
      g_param_spec_boolean ("file-header", "File header",
          "Write the AMR storage-file magic \"#!AMR\\n\" before the first "
          "frame, so that a filesink writes a playable .amr file",
          DEFAULT_FILE_HEADER, G_PARAM_READWRITE | G_PARAM_STATIC_STRINGS |
          GST_PARAM_MUTABLE_READY));
  g_object_class_install_property (gobject_class, PROP_SEND_NO_DATA,
      g_param_spec_boolean ("send-no-data", "Send no-data frames",
          "Output the one-byte no-data frames of DTX; when off they are left "
          "out and the gap in the timestamps stands for them (rtpamrpay "
          "refuses no-data frames)", DEFAULT_SEND_NO_DATA,
          G_PARAM_READWRITE | G_PARAM_STATIC_STRINGS |
          GST_PARAM_MUTABLE_PLAYING));

  gst_element_class_add_static_pad_template (element_class, &sink_template);
  gst_element_class_add_static_pad_template (element_class, &src_template);
  gst_element_class_set_static_metadata (element_class,
      "vamrnb AMR-NB audio encoder", "Codec/Encoder/Audio",
      "Encodes AMR narrowband speech with the vamrnb library",
      "vamrnb developers");

  base_class->start = GST_DEBUG_FUNCPTR (gst_vamrnb_enc_start);
  base_class->stop = GST_DEBUG_FUNCPTR (gst_vamrnb_enc_stop);
  base_class->set_format = GST_DEBUG_FUNCPTR (gst_vamrnb_enc_set_format);
  base_class->handle_frame = GST_DEBUG_FUNCPTR (gst_vamrnb_enc_handle_frame);
  base_class->pre_push = GST_DEBUG_FUNCPTR (gst_vamrnb_enc_pre_push);

  gst_type_mark_as_plugin_api (GST_TYPE_VAMRNB_BAND_MODE, 0);
}

static void
gst_vamrnb_enc_init (GstVamrnbEnc * self)
{
  self->enc = NULL;
  self->band_mode = DEFAULT_BAND_MODE;
  self->mode_pending = FALSE;
  self->dtx = DEFAULT_DTX;
  self->vad = DEFAULT_VAD;
  self->file_header = DEFAULT_FILE_HEADER;
  self->send_no_data = DEFAULT_SEND_NO_DATA;
  self->header_due = FALSE;
  GST_PAD_SET_ACCEPT_TEMPLATE (GST_AUDIO_ENCODER_SINK_PAD (self));
}
