// Reads numbers as the page's data has them: seven bits a byte, the lowest first.

// Beyond this a number is a BigInt.
const LARGEST = Number.MAX_SAFE_INTEGER;

export class Bytes {
  constructor(array) {
    this.array = array;
    this.at = 0;
  }

  isAtEnd() {
    return this.at >= this.array.length;
  }

  number() {
    let value = 0;
    let scale = 1;
    const start = this.at;
    for (;;) {
      const byte = this.array[this.at++];
      if (byte === undefined) throw new Error('the data ends early');
      value += (byte & 127) * scale;
      if (byte < 128) break;
      scale *= 128;
    }
    return value <= LARGEST ? value : this.large(start);
  }

  large(start) {
    let value = 0n;
    for (let at = this.at - 1; at >= start; --at) value = (value << 7n) | BigInt(this.array[at] & 127);
    return value;
  }

  // Eight bytes, the lowest first.
  whole() {
    let value = 0n;
    for (let i = 7; i >= 0; --i) value = (value << 8n) | BigInt(this.array[this.at + i]);
    this.at += 8;
    return value;
  }
}

// 0, 1, 2, 3, ... as 0, -1, 1, -2, ...
export function unfolded(number) {
  if (typeof number === 'bigint') return number & 1n ? -((number + 1n) >> 1n) : number >> 1n;
  return number % 2 === 1 ? -(number + 1) / 2 : number / 2;
}

// The sum, without loss.
export function plus(a, b) {
  const areNumbers = typeof a === 'number' && typeof b === 'number';
  return areNumbers && Number.isSafeInteger(a + b) ? a + b : narrow(BigInt(a) + BigInt(b));
}

// A number as a Number, if it can be one without loss.
export function narrow(number) {
  return number >= -LARGEST && number <= LARGEST ? Number(number) : number;
}
