// Runs in the audio thread of a page: collects what a microphone gives as one channel, and hands it
// over in blocks, each with its level. microphone.js loads it.

const BLOCK_FRAMES = 4096; // 85 ms at 48000 Hz: few messages, and a meter that still moves

/** The mean of all channels, added to `target` from `position` on. */
function mixDown(channels, target, position) {
  const share = 1 / channels.length;
  for (const channel of channels) {
    for (let i = 0; i < channel.length; i += 1) target[position + i] += channel[i] * share;
  }
}

function levelOf(samples) {
  let sum = 0;
  for (const sample of samples) sum += sample * sample;
  return samples.length === 0 ? 0 : Math.sqrt(sum / samples.length);
}

class Capture extends AudioWorkletProcessor {
  constructor() {
    super();
    this.block = new Float32Array(BLOCK_FRAMES);
    this.filled = 0;
    this.stopped = false;
    this.port.onmessage = () => this.stop();
  }

  process([channels]) {
    if (this.stopped) return false;
    // Without a channel the microphone gives nothing at the moment, not even silence.
    if (channels.length > 0) this.take(channels);
    return true;
  }

  take(channels) {
    const frames = channels[0].length;
    if (this.filled + frames > this.block.length) this.send();
    mixDown(channels, this.block, this.filled);
    this.filled += frames;
  }

  send() {
    const samples = this.block.slice(0, this.filled);
    const level = levelOf(samples);
    this.block.fill(0);
    this.filled = 0;
    this.port.postMessage({ samples, level }, [samples.buffer]);
  }

  stop() {
    this.stopped = true;
    if (this.filled > 0) this.send();
    this.port.postMessage({ last: true });
  }
}

registerProcessor("kzsdk-capture", Capture);
