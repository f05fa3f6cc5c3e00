// SPDX-License-Identifier: Apache-2.0
// One transport over any number of media elements: none (stills that advance by a clock), one, or several that stay
// together. The leading stream gives the time; the others follow it by a slightly changed speed, or by one seek when they
// are far off.
'use strict';

((Olive) => {
  const kTolerance = 0.04; // seconds that nobody notices
  const kSettled = 0.02; // correction ends here
  const kFar = 0.4; // beyond, speed would take too long
  const kStrongest = 0.1; // of the speed
  const kSeekPause = 2000; // ms between two corrections by seeking
  const kBeat = 100; // ms between two looks
  const kFreshFrame = 250; // ms for which a frame's time tells more than the element's clock

  // One media element on the common time line.
  class Stream {
    constructor(element, grades, offset) {
      this.element = element;
      this.grades = grades;
      this.offset = offset; // where its beginning lies
      this.isEnabled = true; // a follower that nobody sees rests
      this.hasFailed = false;
      this.isCorrecting = false;
      this.isClosed = false;
      this.lastSeek = Number.NEGATIVE_INFINITY;
      this.pending = null; // seconds to go to once the file is known
      this.frame = null;
      if (element.requestVideoFrameCallback) this.watchFrames();
    }

    watchFrames() {
      this.element.requestVideoFrameCallback((_now, data) => {
        this.frame = {media: data.mediaTime, at: data.expectedDisplayTime};
        if (!this.isClosed) this.watchFrames();
      });
    }

    get duration() {
      return Number.isFinite(this.element.duration) ? this.element.duration : this.grades.current?.duration || 0;
    }
    get end() {
      return this.offset + this.duration;
    }

    // Seconds of the stream itself, as seen on the screen.
    get position() {
      if (this.pending !== null) return this.pending;
      const element = this.element;
      const age = this.frame ? performance.now() - this.frame.at : Number.POSITIVE_INFINITY;
      if (element.paused || element.seeking || element.ended || age > kFreshFrame) return element.currentTime;
      return this.frame.media + (age / 1000) * element.playbackRate;
    }

    load(file, at) {
      this.pending = at;
      this.frame = null;
      this.element.src = file.address;
      this.element.load();
    }

    // The file is known now: go where it was asked to be.
    arrive() {
      if (this.pending === null) return;
      const target = this.pending;
      this.pending = null;
      if (Math.abs(this.element.currentTime - target) > 0.01) this.element.currentTime = target;
    }

    seek(seconds) {
      const target = Olive.clamp(seconds, 0, this.duration || seconds);
      this.frame = null;
      this.isCorrecting = false;
      if (this.element.readyState === 0) this.pending = target;
      else this.element.currentTime = target;
    }
  }

  // Events: "time", "state" (playing, waiting or rate changed), "duration", "ended", "blocked" (the browser wants a
  // gesture first), "failed" (no file of a stream is left; detail is the stream), "file" (another file is shown).
  class Player extends EventTarget {
    // parts: [{element, grades, offset, leads, speaksAgain}]: speaksAgain is heard when what leads is over. duration:
    // seconds as the package tells, until the files tell better. runsAlone: a clock goes on when every stream has failed.
    constructor(parts, duration, runsAlone = false) {
      super();
      this.streams = parts.map((part) => new Stream(part.element, part.grades, part.offset || 0));
      const first = Math.min(...this.streams.map((stream) => stream.offset));
      for (const stream of this.streams) stream.offset -= first;
      this.leader =
        this.streams[
          Math.max(
            0,
            parts.findIndex((part) => part.leads),
          )
        ] || null;
      this.told = duration;
      this.runsAlone = runsAlone;
      this.spare = this.streams[parts.findIndex((part) => part.speaksAgain)] || null;
      this.wanted = false;
      this.speed = 1;
      this.loudness = 1;
      this.isMuted = false;
      this.stalled = new Set();
      this.virtual = 0; // seconds, the clock without streams
      this.hasEnded = false;
      this.removals = [];
      for (const stream of this.streams) this.listen(stream);
      this.applySound();
    }

    emit(name, detail) {
      this.dispatchEvent(new CustomEvent(name, {detail}));
    }

    // Whether time runs by the clock, without any stream.
    get isFree() {
      return !this.streams.length || (this.runsAlone && this.streams.every((stream) => stream.hasFailed));
    }

    get isPlaying() {
      return this.wanted;
    }
    get isWaiting() {
      return this.wanted && this.stalled.size > 0;
    }
    get live() {
      return this.streams.filter((stream) => !stream.hasFailed && stream.isEnabled);
    }

    get duration() {
      const end = Math.max(0, ...this.streams.filter((stream) => !stream.hasFailed).map((stream) => stream.end));
      return end || this.told;
    }

    // The stream whose clock counts now: the leader while it runs, then whichever goes on.
    get clock() {
      const runs = (stream) =>
        stream && !stream.hasFailed && !(stream.element.ended && stream.end < this.duration - 0.05);
      if (runs(this.leader)) return this.leader;
      return this.live.find((stream) => runs(stream)) || this.leader;
    }

    get time() {
      const clock = this.clock;
      if (!clock || this.isFree) return this.virtual;
      const seconds = clock.pending === null ? clock.element.currentTime : clock.pending;
      return Olive.clamp(seconds + clock.offset, 0, this.duration);
    }

    listen(stream) {
      const element = stream.element;
      const on = (name, action) => {
        element.addEventListener(name, action);
        this.removals.push(() => element.removeEventListener(name, action));
      };
      on('loadedmetadata', () => {
        stream.arrive();
        element.playbackRate = this.speed;
        this.emit('duration');
        if (this.wanted) this.resume();
      });
      on('timeupdate', () => this.emit('time'));
      on('seeked', () => {
        stream.lastSeek = performance.now();
        this.emit('time');
      });
      on('waiting', () => this.hold(stream));
      for (const name of ['playing', 'canplay', 'canplaythrough']) on(name, () => this.release(stream));
      on('pause', () => {
        // Unplugged headphones, a media key, another window: whoever pauses the leader pauses all of it.
        if (
          this.wanted &&
          stream === this.leader &&
          !element.ended &&
          !element.seeking &&
          !this.stalled.size &&
          stream.pending === null
        )
          this.pause();
      });
      on('ended', () => this.finish());
      on('error', () => this.tryNext(stream));
    }

    open(width) {
      for (const stream of this.streams) {
        const file = stream.grades.pick(width);
        if (file) stream.load(file, 0);
        else this.giveUp(stream);
      }
      if (this.streams.length) this.emit('file');
    }

    // Another file of the stream at the same place, playing or not as before.
    reload(stream, width) {
      const at = stream.position;
      const file = stream.grades.pick(width);
      if (!file) return this.giveUp(stream);
      this.stalled.delete(stream);
      stream.load(file, at);
      this.emit('file');
    }

    tryNext(stream) {
      stream.grades.fail();
      this.reload(stream, Olive.pixelsAcross(stream.element));
    }

    giveUp(stream) {
      stream.hasFailed = true;
      this.stalled.delete(stream);
      if (stream === this.leader) {
        const isPlaying = this.wanted;
        this.pause();
        this.leader = this.live[0] || stream;
        this.applySound();
        if (isPlaying && this.isFree) this.play();
      }
      this.emit('failed', stream);
    }

    // Another grade for every stream that has one.
    choose(grade, width) {
      for (const stream of this.streams) {
        const before = stream.grades.current;
        stream.grades.wanted = grade;
        if (stream.grades.pick(width) !== before) this.reload(stream, width);
      }
    }

    play() {
      if (!this.isFree && !this.live.length) return;
      if (this.hasEnded || (this.duration && this.time >= this.duration - 0.05)) this.seek(0);
      this.wanted = true;
      this.started = performance.now();
      this.resume();
      if (!this.beat) this.beat = setInterval(() => this.look(), kBeat);
      this.emit('state');
    }

    pause() {
      this.wanted = false;
      clearInterval(this.beat);
      this.beat = 0;
      for (const stream of this.streams) {
        stream.element.pause();
        stream.element.playbackRate = this.speed;
        stream.isCorrecting = false;
      }
      this.emit('state');
      this.emit('time');
    }

    toggle() {
      this.wanted ? this.pause() : this.play();
    }

    seek(seconds) {
      const target = Olive.clamp(seconds, 0, this.duration);
      this.hasEnded = false;
      this.virtual = target;
      this.started = performance.now();
      for (const stream of this.streams) {
        if (!stream.hasFailed) stream.seek(target - stream.offset);
      }
      if (this.wanted) this.resume();
      this.emit('time');
    }

    resume() {
      if (this.stalled.size) return;
      const now = this.time;
      for (const stream of this.live) {
        if (now >= stream.offset && now < stream.end) this.run(stream);
      }
    }

    run(stream) {
      if (!stream.element.paused || stream.element.ended) return; // what has ended would begin again
      const promise = stream.element.play();
      if (!promise) return;
      promise.catch((error) => {
        if (error.name !== 'NotAllowedError' || stream !== this.leader) return;
        this.pause();
        this.emit('blocked');
      });
    }

    // A stream ran dry: the others wait for it.
    hold(stream) {
      if (!this.wanted || !stream.isEnabled || stream.hasFailed || stream.element.readyState >= 3) return;
      this.stalled.add(stream);
      for (const other of this.live) {
        if (other !== stream) other.element.pause();
      }
      this.emit('state');
    }

    release(stream) {
      if (!this.stalled.delete(stream)) return;
      if (this.wanted) this.resume();
      this.emit('state');
    }

    // The regular look while playing.
    look() {
      if (this.isFree) this.advance();
      if (this.stalled.size) return;
      this.applySound();
      const clock = this.clock;
      if (clock && clock.element.readyState > 0) {
        this.run(clock);
        const now = clock.position + clock.offset;
        for (const stream of this.live) {
          if (stream !== clock) this.align(stream, now);
        }
      }
      this.emit('time');
    }

    advance() {
      const now = performance.now();
      this.virtual += ((now - this.started) / 1000) * this.speed;
      this.started = now;
      if (this.virtual >= this.duration) this.finish();
    }

    align(stream, now) {
      const element = stream.element;
      if (element.readyState === 0) return;
      const target = now - stream.offset;
      if (target < 0 || target >= stream.duration - kTolerance) {
        // not begun, or over: its first or last picture stays
        if (!element.paused) element.pause();
        return;
      }
      const difference = stream.position - target;
      const distance = Math.abs(difference);
      if (distance > kFar) {
        element.playbackRate = this.speed;
        stream.isCorrecting = false;
        if (!element.seeking && performance.now() - stream.lastSeek >= kSeekPause) {
          stream.lastSeek = performance.now();
          stream.frame = null;
          element.currentTime = target;
        }
      } else if (distance > kTolerance || (stream.isCorrecting && distance > kSettled)) {
        stream.isCorrecting = true;
        element.playbackRate = this.speed * (1 - Math.sign(difference) * Math.min(kStrongest, distance));
      } else if (element.playbackRate !== this.speed) {
        stream.isCorrecting = false;
        element.playbackRate = this.speed;
      }
      if (element.paused) this.run(stream);
    }

    finish() {
      const clock = this.clock;
      if (clock && !this.isFree && !clock.element.ended && this.time < this.duration - 0.25) return; // another one goes on
      this.hasEnded = true;
      this.virtual = this.duration;
      this.pause();
      this.emit('ended');
    }

    setSpeed(speed) {
      this.speed = speed;
      for (const stream of this.streams) {
        stream.element.defaultPlaybackRate = speed;
        stream.element.playbackRate = speed;
        stream.isCorrecting = false;
      }
      this.emit('state');
    }

    setSound(loudness, isMuted) {
      this.loudness = loudness;
      this.isMuted = isMuted;
      this.applySound();
      this.emit('state');
    }

    // Who is heard: what leads, or after its end the one that speaks again.
    get speaker() {
      const {leader, spare} = this;
      const isOver = leader && spare && leader !== spare && (leader.hasFailed || this.time >= leader.end - kTolerance);
      return isOver && !spare.hasFailed ? spare : leader;
    }

    applySound() {
      const heard = this.speaker;
      for (const stream of this.streams) {
        if (stream.element.volume !== this.loudness) stream.element.volume = this.loudness;
        const isMuted = this.isMuted || stream !== heard;
        if (stream.element.muted !== isMuted) stream.element.muted = isMuted;
      }
    }

    // Another stream gives sound and time.
    lead(stream) {
      if (!stream || stream === this.leader) return;
      const now = this.time;
      this.leader = stream;
      stream.isEnabled = true;
      this.applySound();
      if (Math.abs(stream.position + stream.offset - now) > kTolerance) stream.seek(now - stream.offset);
      if (this.wanted) this.resume();
      this.emit('state');
    }

    // A follower that is not shown rests; shown again it is taken to the present time.
    enable(stream, isEnabled) {
      if (stream === this.leader || stream.isEnabled === isEnabled) return;
      stream.isEnabled = isEnabled;
      this.stalled.delete(stream);
      if (!isEnabled) {
        stream.element.pause();
        return;
      }
      stream.seek(this.time - stream.offset);
      if (this.wanted) this.resume();
    }

    close() {
      this.pause();
      for (const remove of this.removals) remove();
      for (const stream of this.streams) {
        stream.isClosed = true;
        stream.element.removeAttribute('src');
        stream.element.load();
      }
    }
  }

  Olive.Player = Player;
})(window.Olive);
