// Numbers, lengths of time and moments as text, as the command line tells them.

const kMinuteSeconds = 60;
const kHourSeconds = 3600;
const kDaySeconds = 86400;

const kUnits = [
    [kDaySeconds, 'd'],
    [kHourSeconds, 'h'],
    [kMinuteSeconds, 'min'],
    [1, 's'],
];

// "45 s", "3 min 30 s", "3 d 4 h": never more than two units.
function spantext(seconds) {
    const whole = Math.max(0, Math.round(seconds));
    const largest = kUnits.findIndex(([length]) => whole >= length);
    if (largest < 0) {
        return '0 s';
    }
    const [length, unit] = kUnits[largest];
    const rest = kUnits[largest + 1];
    const more = rest ? Math.floor((whole % length) / rest[0]) : 0;
    return `${Math.floor(whole / length)} ${unit}` + (more > 0 ? ` ${more} ${rest[1]}` : '');
}

const counttext = d3.format(',');

function counted(count, one, many) {
    return `${counttext(count)} ${count === 1 ? one : many}`;
}

// Rounded down: what is not quite all is not "100 %".
function sharetext(share) {
    const percent = Math.floor(share * 10000) / 100;
    return `${percent === 100 ? '100' : percent.toFixed(2)}\u00a0%`;
}

const datetext = d3.utcFormat('%Y-%m-%d %H:%M:%S');

// Seconds of the log's local time, which is shown as if it were UTC.
function clocktext(clock) {
    return datetext(new Date(clock * 1000));
}

// An element with a class and a text. Texts of the log get into the page this way only.
function element(tag, className, text) {
    const made = document.createElement(tag);
    if (className) {
        made.className = className;
    }
    if (text !== undefined) {
        made.textContent = text;
    }
    return made;
}
