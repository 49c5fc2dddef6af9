// SPDX-License-Identifier: Apache-2.0
//
// Measures the sound of a page.

/** Takes sound where it leaves the page: its loudest sample is window.sound.peak. Runs in the page, before its scripts. */
export function observeSound() {
  const sound = (window.sound = { peak: 0 });
  const connect = AudioNode.prototype.connect;
  AudioNode.prototype.connect = function (target, ...rest) {
    if (this instanceof AudioWorkletNode && target === this.context.destination) {
      const ear = new AnalyserNode(this.context, { fftSize: 4096 });
      connect.call(this, ear);
      const samples = new Float32Array(ear.fftSize);
      setInterval(() => {
        ear.getFloatTimeDomainData(samples);
        for (const sample of samples) sound.peak = Math.max(sound.peak, Math.abs(sample));
      }, 40);
    }
    return connect.call(this, target, ...rest);
  };
}
